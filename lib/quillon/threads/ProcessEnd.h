#pragma once

namespace Quillon::System {

/** What happens when the process ends, in this order. */
enum class EndStage
{
    EXCHANGES, ///< releases whoever waits for an HTTP exchange
    WORK       ///< waits for the work of the thread pool
};

/**
 * Has `action` run once when the process ends, by `exit` or a return from `main`, after the
 * actions of the stages before it. It runs before everything that was registered with `atexit`,
 * and before the destructors of all static objects that were made, up to now. An action checks
 * itself whether it runs in a forked child.
 *
 * Each stage has one action.
 *
 * @return false if the stage is over: the action will not run.
 * @throws std::bad_alloc
 *
 * Thread safety: any thread. Takes no lock.
 */
bool RunAtProcessEnd(EndStage stage, void (*action)());

} // namespace Quillon::System
