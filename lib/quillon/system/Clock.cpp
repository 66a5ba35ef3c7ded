#include "quillon/system/Clock.h"

#include <atomic>
#include <chrono>

namespace Quillon::System {

namespace {

std::atomic<const Clock*> replacement{nullptr};

} // namespace

DateTime GetUtcDateTime()
{
    if (const Clock* clock = replacement.load(std::memory_order_acquire)) {
        return clock->Now();
    }
    const auto sinceEpoch = std::chrono::system_clock::now().time_since_epoch();
    return DateTimeFromUtc(
        std::chrono::duration_cast<std::chrono::microseconds>(sinceEpoch).count(), false);
}

const Clock* ReplaceClock(const Clock* clock) noexcept
{
    return replacement.exchange(clock, std::memory_order_acq_rel);
}

} // namespace Quillon::System
