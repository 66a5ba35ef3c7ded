// Prints the course of a fleet minute by minute, or what outages at any time do to it.

#include "Fleet.h"

#include <cstdio>
#include <cstring>
#include <string>

using namespace Simulation;
using namespace std::chrono_literals;

namespace {

/** What sources would do if they knew no patience and drew their first refresh like any other. */
RefreshPolicy GetPlainPolicy()
{
    RefreshPolicy policy;
    policy.patience = Span();
    policy.spreadsFirst = false;
    return policy;
}

Scenario MakeScenario(bool isPlain, int outageMinute)
{
    Scenario scenario;
    scenario.policy = isPlain ? GetPlainPolicy() : RefreshPolicy();
    if (outageMinute >= 0) {
        scenario.outageFrom = std::chrono::minutes(outageMinute);
        scenario.outageFor = 10min;
    }
    return scenario;
}

void PrintCourse(const Scenario& scenario)
{
    const Course course = Simulate(scenario);
    std::puts("minute,requests_per_second,without_token");
    for (std::size_t minute = 0; minute < course.without.size(); ++minute) {
        std::printf(
            "%zu,%.3f,%d\n", minute, course.requests[minute] / 60.0, course.without[minute]);
    }
}

void PrintOutages(bool isPlain)
{
    std::puts("outage_from,lapses,peak_after_first_hour,peak_outside_outage,five_minutes_after_a_"
              "lifetime");
    for (int minute = 0; minute <= 240; minute += 5) {
        const Scenario scenario = MakeScenario(isPlain, minute);
        const Course course = Simulate(scenario);
        const double steady = GetSteadyLoad(scenario);
        const Span end = scenario.outageFrom + scenario.outageFor;
        const double before = course.GetPeak(1h, scenario.outageFrom);
        const double after = course.GetPeak(std::max<Span>(1h, end), scenario.duration);
        std::printf(
            "%d,%zu,%.2f,%.2f,%.2f\n",
            minute,
            course.lapses,
            course.GetPeak(1h, scenario.duration) / steady,
            std::max(before, after) / steady,
            course.GetPeakOfFive(end + scenario.lifetime, scenario.duration) / steady);
    }
}

} // namespace

int main(int count, char** words)
{
    const bool isPlain = count > 1 && std::strcmp(words[1], "--plain") == 0;
    const int last = count - 1;
    if (count > (isPlain ? 2 : 1)) {
        PrintCourse(MakeScenario(isPlain, std::stoi(words[last])));
    } else {
        PrintOutages(isPlain);
    }
}
