#pragma once

#include "quillon/Functor.h"

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <list>
#include <mutex>
#include <thread>

namespace Quillon::System {

struct ElasticPoolOptions
{
    std::size_t initial; ///< threads that start with the first work, as far as the limit allows
    std::size_t limit;   ///< threads at most
    std::chrono::milliseconds idleTime; ///< after which a thread beyond the initial ones goes
    bool (*prepare)() = nullptr; ///< called before the first thread; false if the end has begun
};

/**
 * Hands work to threads in the order in which it was queued, to as many as it takes for no work to
 * wait, up to a limit. Of the idle threads, the one that ran last works first, so that those
 * which are not needed stay idle and go.
 *
 * What leaves a piece of work as an exception, or leaves the destructor of something bound to it,
 * is logged at level 8.
 *
 * Thread safety: any thread, including those of the pool; the destructor excepted.
 */
class ElasticPool
{
public:
    explicit ElasticPool(const ElasticPoolOptions& options) noexcept;

    /** Drops what has not begun, waits for what has, and joins the threads. */
    ~ElasticPool();
    ElasticPool(const ElasticPool&) = delete;
    ElasticPool& operator=(const ElasticPool&) = delete;

    /**
     * Runs a copy of `work` on a thread of the pool, and destroys it there before that thread runs
     * anything else.
     *
     * @throws InvalidArgumentException  `work` is empty.
     * @throws InvalidStateException     the end has begun, the process has forked, or there is no
     *                                   thread and none can be started. Nothing is queued.
     */
    void Queue(const Functor& work);

    std::size_t GetThreadCount() const;

    /**
     * @throws InvalidArgumentException  `limit` is 0.
     * @throws InvalidStateException     the threads have started.
     */
    void SetLimit(std::size_t limit);

    /**
     * Lets no further work begin and waits for what has begun, but not for the work that calls
     * this, and no longer than `patience`. The threads stay, waiting for ever, and what has not
     * begun is kept: nothing of the host's runs any more. Does nothing in a forked child.
     */
    void End(std::chrono::milliseconds patience);

private:
    enum class State
    {
        IDLE,    // no thread was started yet
        OPEN,    // work begins
        ENDED,   // no work begins, and threads wait for ever
        LEAVING, // the threads leave; the pool is being destroyed
    };

    struct Worker
    {
        std::thread thread;
        std::condition_variable wake;
        std::list<Functor> work; // what it was given: nothing or one item
        bool isRunning = false;  // the work has begun; from then on only the thread touches it
        std::chrono::steady_clock::time_point surplusAt; // when it has been idle for too long
    };
    using Position = std::list<Worker>::iterator;

    bool HasForked() const noexcept;
    void RequireSameProcess();

    // With the lock held.
    void RequireOpen();
    void Start();
    void AddThread();
    void HandOver();
    bool IsQuiet() const;
    std::size_t CountThreads() const noexcept { return _idle.size() + _busy.size(); }

    // On a thread of the pool.
    void Run(Position self);
    bool AwaitWork(Position self, std::unique_lock<std::mutex>& lock);
    void FinishWork(Position self);
    void Abandon(Position self);
    void Leave(Position self, std::unique_lock<std::mutex>& lock);

    std::atomic<int> _pid{0}; // of the process that queues

    mutable std::mutex _mutex; // guards the rest
    ElasticPoolOptions _options;
    State _state = State::IDLE;
    bool _isPrepared = false;
    std::condition_variable _quietened; // after the end began: a piece of work is done
    std::list<Functor> _queue;          // empty as long as a thread is idle
    std::list<Worker> _idle;            // the one that ran last in front
    std::list<Worker> _busy;            // those that have work
    std::list<Worker> _retired;         // those whose threads are ending, to be joined
};

} // namespace Quillon::System
