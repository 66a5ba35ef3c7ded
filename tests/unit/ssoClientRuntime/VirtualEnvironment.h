#pragma once

#include "ssoClientRuntime/Moment.h"
#include "ssoClientRuntime/RuntimeEnvironment.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <deque>
#include <limits>
#include <map>
#include <mutex>
#include <optional>
#include <random>
#include <string_view>

namespace Testing {

/** The largest number that chance gives. */
inline constexpr double AlmostOne = 1 - std::numeric_limits<double>::epsilon();

/**
 * Clocks that stand still until they are moved, and work that runs when the test says so, on its
 * own thread. Numbers come from a seed.
 */
class VirtualEnvironment final : public SsoClient::RuntimeEnvironment
{
public:
    using Span = SsoClient::Span;
    using TimePoint = std::chrono::steady_clock::time_point;

    static constexpr std::string_view Start = "2011-07-05T09:00:00Z";

    Quillon::System::DateTime GetWallTime() const override
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return Quillon::System::DateTimeFromUtc(_wall.count(), false);
    }
    TimePoint GetSteadyTime() const override
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return TimePoint(_steady);
    }
    double DrawNumber() override
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return _number ? *_number : std::generate_canonical<double, 32>(_engine);
    }
    void Run(const Work& work) override
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        if (_isEnded) {
            throw Quillon::InvalidStateException("the environment has ended");
        }
        _work.push_back(work);
    }
    void RunAt(TimePoint time, const Work& work) override
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _timers.emplace(std::chrono::duration_cast<Span>(time.time_since_epoch()), work);
    }

    void Seed(unsigned seed) { _engine.seed(seed); }

    /** Has that number drawn each time. */
    void Fix(double number) { _number = number; }

    /** From now on nothing more can be run. */
    void End()
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _isEnded = true;
    }

    TimePoint In(Span span) const { return GetSteadyTime() + span; }

    /** Runs what is due, and what that leads to. */
    void Settle()
    {
        while (const Work work = TakeDue()) {
            work();
        }
    }

    /** Lets time go by on both clocks, and everything happen that is due meanwhile. */
    void Pass(Span span)
    {
        const Span end = _steady + span;
        Settle();
        while (!_timers.empty() && _timers.begin()->first <= end) {
            Move(std::max(_timers.begin()->first - _steady, Span(0)));
            Settle();
        }
        Move(end - _steady);
        Settle();
    }

    /** Work under way takes that long: timers wait for it. */
    void Move(Span span)
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _wall += span;
        _steady += span;
    }

    /** Sets the wall clock, or lets the machine sleep. */
    void StepWall(Span span)
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _wall += span;
    }

    std::size_t CountTimers() const
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return _timers.size();
    }

private:
    Work TakeDue()
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        Work work;
        if (!_work.empty()) {
            work = std::move(_work.front());
            _work.pop_front();
        } else if (!_timers.empty() && _timers.begin()->first <= _steady) {
            work = std::move(_timers.begin()->second);
            _timers.erase(_timers.begin());
        }
        return work;
    }

    mutable std::mutex _mutex;
    Span _wall{Quillon::System::DateTime(Start).GetUtcTime()};
    Span _steady{1'000'000'000};
    std::mt19937_64 _engine{1};
    std::optional<double> _number;
    std::deque<Work> _work;
    std::multimap<Span, Work> _timers;
    bool _isEnded = false;
};

} // namespace Testing
