#include "Fleet.h"

#include <algorithm>
#include <functional>
#include <queue>
#include <random>

namespace Simulation {

namespace {

using SsoClient::Attempt;
using SsoClient::FailureKind;
using SsoClient::Moment;
using SsoClient::RefreshMachine;

constexpr Span Minute = std::chrono::minutes(1);
constexpr Span Never = Span::max();

struct Process
{
    RefreshMachine machine;
    Moment asked;
    Span answerAt = Never;  // of the request that is under way
    bool isRefused = false; // what the answer will be
    bool hadToken = false;
};

/** The fleet in one world with one clock, which both clocks of all machines show. */
class World
{
public:
    explicit World(const Scenario& scenario)
        : _scenario(scenario)
        , _engine(scenario.seed)
    {
        _processes.reserve(scenario.processes);
        for (std::size_t index = 0; index < scenario.processes; ++index) {
            _processes.push_back({RefreshMachine(scenario.policy, [this] { return Draw(); }), {}});
            _processes.back().machine.Want();
            Schedule(
                index,
                Span(static_cast<Span::rep>(
                    Draw() * static_cast<double>(scenario.startWithin.count()))));
        }
    }

    Course Run()
    {
        while (!_events.empty() && _events.top().time < _scenario.duration) {
            const Event event = _events.top();
            _events.pop();
            CloseMinutes(event.time);
            Visit(event.process, event.time);
        }
        CloseMinutes(_scenario.duration);
        return _course;
    }

private:
    struct Event
    {
        Span time;
        std::size_t process;

        bool operator>(const Event& other) const { return time > other.time; }
    };

    static Moment At(Span time) { return {time, time}; }

    double Draw() { return std::generate_canonical<double, 32>(_engine); }

    void Schedule(std::size_t process, Span time) { _events.push({time, process}); }

    bool IsDown(Span time) const
    {
        return _scenario.outageFrom <= time && time < _scenario.outageFrom + _scenario.outageFor;
    }

    void CloseMinutes(Span time)
    {
        while (Minute * static_cast<Span::rep>(_course.without.size() + 1) <= time) {
            const Span end = Minute * static_cast<Span::rep>(_course.without.size() + 1);
            _course.without.push_back(static_cast<int>(
                std::count_if(_processes.begin(), _processes.end(), [&](const Process& process) {
                    return !process.machine.IsGood(At(end));
                })));
            _course.requests.resize(_course.without.size());
        }
    }

    /** Something may have become due for the process. */
    void Visit(std::size_t index, Span now)
    {
        Process& process = _processes[index];
        if (process.answerAt <= now) {
            Answer(process, now);
        }
        if (process.machine.Begin(At(now)) != Attempt::NONE) {
            Ask(process, now);
        }
        const auto wakeUp = process.machine.GetWakeUp(At(now));
        Schedule(index, wakeUp ? *wakeUp : process.answerAt);
    }

    void Ask(Process& process, Span now)
    {
        const auto minute = static_cast<std::size_t>(now / Minute);
        _course.requests.resize(std::max(_course.requests.size(), minute + 1));
        ++_course.requests[minute];
        const Span begins = std::max(now, _serviceFreeAt);
        process.asked = At(now);
        process.isRefused = IsDown(now) || begins - now > _scenario.longestQueue;
        process.answerAt = now;
        if (!process.isRefused) {
            _serviceFreeAt = begins + Span(std::chrono::seconds(1)) / _scenario.requestsPerSecond;
            process.answerAt = _serviceFreeAt;
        }
    }

    void Answer(Process& process, Span now)
    {
        process.answerAt = Never;
        if (process.isRefused || IsDown(now)) {
            process.machine.Fail(At(now), FailureKind::TRANSIENT);
            return;
        }
        if (!process.hadToken) {
            _course.allStarted = now;
        } else if (!process.machine.IsGood(At(now))) {
            ++_course.lapses;
        }
        process.hadToken = true;
        process.machine.Accept(process.asked, At(now), {{now, now + _scenario.lifetime}, false});
    }

    const Scenario& _scenario;
    std::mt19937_64 _engine;
    std::vector<Process> _processes;
    std::priority_queue<Event, std::vector<Event>, std::greater<>> _events;
    Span _serviceFreeAt{};
    Course _course;
};

double GetHighest(const std::vector<int>& requests, Span from, Span to, int minutes)
{
    double highest = 0;
    const auto last = std::min<std::size_t>(requests.size(), to / Minute);
    for (auto begin = static_cast<std::size_t>(from / Minute); begin + minutes <= last; ++begin) {
        int sum = 0;
        for (int minute = 0; minute < minutes; ++minute) {
            sum += requests[begin + minute];
        }
        highest = std::max(highest, sum / (60.0 * minutes));
    }
    return highest;
}

} // namespace

double Course::GetPeak(Span from, Span to) const
{
    return GetHighest(requests, from, to, 1);
}

double Course::GetPeakOfFive(Span from, Span to) const
{
    return GetHighest(requests, from, to, 5);
}

double Course::GetMean(Span from, Span to) const
{
    return GetHighest(requests, from, to, static_cast<int>((to - from) / Minute));
}

Course Simulate(const Scenario& scenario)
{
    return World(scenario).Run();
}

double GetSteadyLoad(const Scenario& scenario)
{
    const auto lifetime = static_cast<double>(scenario.lifetime.count()) / 1e6;
    return static_cast<double>(scenario.processes) / (scenario.policy.refreshAt * lifetime);
}

} // namespace Simulation
