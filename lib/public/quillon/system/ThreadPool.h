#pragma once

#include "quillon/Export.h"
#include "quillon/Functor.h"

#include <cstddef>

namespace Quillon::System {

/**
 * Runs work on threads of its own. It starts with as many threads as the machine has cores, adds
 * one whenever work would have to wait, up to its limit, and lets those beyond the first go again
 * when they have been idle for a while. Its threads take no signals but those of their own faults,
 * such as SIGSEGV. Work is handed to threads in the order in which it was queued; two threads may
 * begin theirs in another.
 *
 * An exception that leaves a piece of work is logged at level 8 with its class and text; the
 * thread goes on.
 *
 * When the process ends (`exit`, or a return from `main`), work that has not begun is dropped and
 * never runs. Work that has begun gets a moment to finish: HTTP exchanges that it waits for fail
 * at once, and after two seconds the process ends without it. Nothing else is interrupted: work
 * that is still inside another library by then, such as one that waits for a Kerberos KDC, may
 * meet that library's clean-up. `exit` may be called by a piece of work itself.
 *
 * All this happens at the place in the order of `atexit` where the first work was queued. Static
 * objects that work uses should be made before that: those made later are destroyed earlier, while
 * work may still run.
 *
 * Thread safety: any thread, including those of the pool.
 */
class QUILLON_API ThreadPool
{
public:
    static constexpr std::size_t DefaultLimit = 64;

    /** How long a thread beyond the first ones stays idle before it goes. */
    static constexpr int IdleTimeSec = 10;

    /** How long work that has begun may take to finish when the process ends. */
    static constexpr int PatienceSec = 2;

    /**
     * Runs `work` later, on a thread of the pool, and then releases it there.
     *
     * @throws InvalidArgumentException  `work` is empty.
     * @throws InvalidStateException     the process is about to end, has forked since the first
     *                                   work, or has no thread and cannot start one. Nothing is
     *                                   queued.
     */
    virtual void Queue(const Functor& work) = 0;

    /** How many threads there are now: none before the first work, and in a forked child. */
    virtual std::size_t GetThreadCount() const = 0;

protected:
    ~ThreadPool() = default;
};

/** The pool of the process; never null, and usable as long as any code runs. */
QUILLON_API ThreadPool* GetThreadPool() noexcept;

/**
 * Sets how many threads the pool may have at most; a limit below the number of cores also lowers
 * the number it starts with. To be called before the first work is queued.
 *
 * @throws InvalidArgumentException  `limit` is 0.
 * @throws InvalidStateException     the pool has started.
 */
QUILLON_API void SetThreadPoolLimit(std::size_t limit);

} // namespace Quillon::System
