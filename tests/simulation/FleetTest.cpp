#include "Fleet.h"

#include <gtest/gtest.h>

#include <chrono>

using namespace Simulation;
using namespace std::chrono_literals;

namespace {

Scenario WithOutageFrom(Span time)
{
    Scenario scenario;
    scenario.outageFrom = time;
    scenario.outageFor = 10min;
    return scenario;
}

/** As multiples of the steady load. */
struct Loads
{
    std::size_t lapses;
    double peakAfterFirstHour;
    double aLifetimeLater;
};

Loads Measure(const Scenario& scenario)
{
    const Course course = Simulate(scenario);
    const double steady = GetSteadyLoad(scenario);
    const Span later = scenario.outageFrom + scenario.outageFor + scenario.lifetime;
    return {
        course.lapses,
        course.GetPeak(1h, scenario.duration) / steady,
        course.GetPeakOfFive(later, scenario.duration) / steady};
}

TEST(Fleet, SpreadsBySoonAfterItHasStarted)
{
    const Scenario scenario;
    const Course course = Simulate(scenario);
    const double steady = GetSteadyLoad(scenario);
    EXPECT_EQ(0U, course.lapses);
    EXPECT_LT(course.allStarted, Span(10min));
    EXPECT_LT(course.GetPeak(10min, scenario.duration) / steady, 1.4);
    EXPECT_NEAR(1, course.GetMean(3h, 6h) / steady, 0.05);
}

// The last but one is the worst of all.
TEST(Fleet, BridgesAnOutageWheneverItComes)
{
    for (const Span from : {5min, 95min, 145min, 180min}) {
        SCOPED_TRACE(from / 1min);
        const Loads loads = Measure(WithOutageFrom(from));
        EXPECT_EQ(0U, loads.lapses);
        EXPECT_LE(loads.peakAfterFirstHour, 3);
        EXPECT_LE(loads.aLifetimeLater, 1.5);
    }
}

TEST(Fleet, IsTheSameEveryTime)
{
    Scenario scenario = WithOutageFrom(145min);
    scenario.processes = 1'000;
    EXPECT_EQ(Simulate(scenario).requests, Simulate(scenario).requests);
}

// What the patience and the spreading are for.
TEST(Fleet, WouldBeAStormWithJitterAlone)
{
    Scenario scenario = WithOutageFrom(120min);
    scenario.policy.patience = Span();
    scenario.policy.spreadsFirst = false;
    EXPECT_GT(Measure(scenario).peakAfterFirstHour, 10);
}

TEST(Fleet, LosesItsTokensInAnOutageThatIsTooLong)
{
    Scenario scenario = WithOutageFrom(145min);
    scenario.outageFor = 1h;
    scenario.processes = 1'000;
    EXPECT_LT(500U, Measure(scenario).lapses);
}

} // namespace
