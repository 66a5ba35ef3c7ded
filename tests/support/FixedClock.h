#pragma once

#include "quillon/system/Clock.h"

#include <string_view>

/** Makes the whole process read one fixed time as long as it lives. */
class FixedClock final : public Quillon::System::Clock
{
public:
    explicit FixedClock(std::string_view now)
        : FixedClock(Quillon::System::DateTime(now))
    {}
    explicit FixedClock(const Quillon::System::DateTime& now)
        : _now(now)
        , _before(Quillon::System::ReplaceClock(this))
    {}
    FixedClock(const FixedClock&) = delete;
    FixedClock& operator=(const FixedClock&) = delete;
    ~FixedClock() { Quillon::System::ReplaceClock(_before); }

    Quillon::System::DateTime Now() const override { return _now; }

private:
    Quillon::System::DateTime _now;
    const Quillon::System::Clock* _before;
};
