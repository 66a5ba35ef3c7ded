#pragma once

#include <atomic>
#include <unistd.h>

namespace Quillon::System {

/**
 * A mutex that cannot stop a forked child for ever. A thread of the parent that holds a mutex at
 * the fork does not exist in the child and never releases it there; this one tells its holder's
 * process, so that the child takes it over.
 *
 * Thread safety: any number of threads; a lock is released by the process that took it.
 */
class ProcessMutex
{
public:
    /**
     * Waits for the lock and takes it.
     *
     * @return false if it was taken over from the parent: what the lock guards may be half changed.
     */
    bool Lock() noexcept
    {
        const int own = getpid();
        int holder = 0;
        while (!_holder.compare_exchange_weak(holder, own, std::memory_order_acquire)) {
            if (holder == own) {
                _holder.wait(own, std::memory_order_relaxed);
                holder = 0;
            }
            // A foreign holder is what the next round expects.
        }
        return holder == 0;
    }

    void Unlock() noexcept
    {
        _holder.store(0, std::memory_order_release);
        _holder.notify_one();
    }

private:
    std::atomic<int> _holder{0}; // the process of the thread that has it
};

/** Holds a lock for the length of a scope. */
class ProcessLock
{
public:
    explicit ProcessLock(ProcessMutex& mutex) noexcept
        : _mutex(mutex)
        , _isIntact(mutex.Lock())
    {}
    ~ProcessLock() { _mutex.Unlock(); }
    ProcessLock(const ProcessLock&) = delete;
    ProcessLock& operator=(const ProcessLock&) = delete;

    /** Whether what the lock guards is whole, see `ProcessMutex::Lock`. */
    bool IsIntact() const noexcept { return _isIntact; }

private:
    ProcessMutex& _mutex;
    const bool _isIntact;
};

} // namespace Quillon::System
