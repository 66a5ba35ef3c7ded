#pragma once

#include "quillon/system/Clock.h"

#include <atomic>
#include <string_view>

/** Makes the whole process read a clock that is a minute further at each reading. */
class RunningClock final : public Quillon::System::Clock
{
public:
    explicit RunningClock(std::string_view start)
        : _next(Quillon::System::DateTime(start).GetUtcTime())
        , _before(Quillon::System::ReplaceClock(this))
    {}
    RunningClock(const RunningClock&) = delete;
    RunningClock& operator=(const RunningClock&) = delete;
    ~RunningClock() { Quillon::System::ReplaceClock(_before); }

    Quillon::System::DateTime Now() const override
    {
        return Quillon::System::DateTimeFromUtc(_next.fetch_add(60'000'000), false);
    }

private:
    mutable std::atomic<long long> _next;
    const Quillon::System::Clock* _before;
};
