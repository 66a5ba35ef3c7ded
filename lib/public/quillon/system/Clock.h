#pragma once

#include "quillon/system/DateTime.h"

namespace Quillon::System {

/** A source of the current time that can stand in for the system's. */
class QUILLON_API Clock
{
public:
    /** Called from any thread. */
    virtual DateTime Now() const = 0;

protected:
    ~Clock() = default;
};

/** The current UTC time, from the system's clock or the one that `ReplaceClock` put in. */
QUILLON_API DateTime GetUtcDateTime();

/**
 * Makes the whole process read the time from `clock`, for tests and simulations; null brings the
 * system's clock back. The clock is not owned and must outlive its use.
 *
 * @return what was in force before, null for the system's clock.
 *
 * Thread safety: any thread.
 */
QUILLON_API const Clock* ReplaceClock(const Clock* clock) noexcept;

} // namespace Quillon::System
