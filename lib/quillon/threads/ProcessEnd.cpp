#include "threads/ProcessEnd.h"

#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <new>

namespace Quillon::System {

namespace {

using Action = void (*)();

/** Stands in the place of the action of a stage that is over. */
void DoNothing() {}

constinit std::atomic<Action> actions[] = {nullptr, nullptr};

/**
 * Whichever stage registered last comes first in the order of `atexit`, so each handler brings
 * the stages before its own to their end as well.
 */
template <EndStage Last>
void EndThrough()
{
    for (std::size_t stage = 0; stage <= static_cast<std::size_t>(Last); ++stage) {
        const Action action = actions[stage].exchange(&DoNothing);
        if (action != nullptr) {
            action();
        }
    }
}

} // namespace

bool RunAtProcessEnd(EndStage stage, Action action)
{
    const Action handler = stage == EndStage::EXCHANGES ? &EndThrough<EndStage::EXCHANGES>
                                                        : &EndThrough<EndStage::WORK>;
    if (std::atexit(handler) != 0) {
        throw std::bad_alloc();
    }
    Action none = nullptr;
    return actions[static_cast<std::size_t>(stage)].compare_exchange_strong(none, action);
}

} // namespace Quillon::System
