#pragma once

#include "http/CallbackThread.h"
#include "http/ConnectionPoolImpl.h"
#include "http/Curl.h"
#include "http/Transfer.h"
#include "system/ProcessMutex.h"

#include <atomic>
#include <list>
#include <map>
#include <memory>
#include <thread>
#include <vector>

namespace Quillon::Http {

/**
 * Drives all transfers of the process through one multi handle of libcurl on one I/O thread.
 *
 * The engine itself is never destroyed, because objects of the host may still refer to it while
 * the process runs its static destructors. Its threads stop before that: they must not use
 * OpenSSL while OpenSSL takes itself down.
 *
 * Thread safety: any thread.
 */
class HttpEngine
{
public:
    /** The engine of the process. Its threads start with the first transfer. */
    static HttpEngine& Get() noexcept;

    HttpEngine() = default;
    HttpEngine(const HttpEngine&) = delete;
    HttpEngine& operator=(const HttpEngine&) = delete;

    /**
     * Initialises libcurl, starts the threads if they do not run, and makes sure that they do.
     * To be called before any handle of libcurl is made.
     *
     * @throws HttpException  the process has forked since they started, or is about to end.
     */
    void RequireRunning();

    /** @throws HttpException  the process is about to end. */
    void Submit(std::unique_ptr<Transfer> transfer);

    /** Whether the process is a child that was forked too late to use the engine. */
    bool HasForked() const noexcept;

    /** @throws HttpException  `HasForked`. */
    void RequireOwnProcess() const;

    /** Makes the I/O thread look for exchanges that were called off. */
    void NoteCancellation() noexcept;

    /** @throws HttpException  the process is a child that was forked too late. */
    std::list<Connections>::iterator AddConnections(
        Ref<const ConnectionSpecImpl> spec, std::optional<std::chrono::microseconds> idleLimit);
    void RetireConnections(std::list<Connections>::iterator connections) noexcept;

    /** Stops the threads; what is in flight fails, and so does what comes later. */
    void Stop();

private:
    enum class State
    {
        IDLE,
        RUNNING,
        ENDED
    };

    void Start();
    void MakeMulti();
    void Wake() noexcept;

    // On the I/O thread.
    void Run();
    bool TakeWork(std::vector<std::unique_ptr<Transfer>>& submitted);
    void StartTransfer(std::unique_ptr<Transfer> transfer) noexcept;
    void Perform(std::unique_ptr<Transfer> transfer) noexcept;
    void Attach(std::unique_ptr<Transfer>& transfer);
    void DropCancelled();
    std::chrono::milliseconds LookForIdle() noexcept;
    std::chrono::milliseconds CloseIdle();
    void CompleteFinished();
    void Complete(std::unique_ptr<Transfer> transfer, Outcome outcome) noexcept;
    Outcome Finish(Transfer& transfer, CURLcode result) const noexcept;
    Outcome MakeFailure(const char* text) const noexcept;
    std::unique_ptr<Transfer> Remove(CURL* easy);
    void GiveUp(const Transfer& transfer) const noexcept;
    void CloseEverything();

    bool IsOwn(const System::ProcessLock& lock) noexcept;

    System::ProcessMutex _mutex; // guards the next group
    State _state = State::IDLE;
    std::vector<std::unique_ptr<Transfer>> _submitted;
    std::list<Connections> _connections;
    std::list<Connections> _retired;

    std::atomic<bool> _hasCancelled{false};
    std::atomic<CURLM*> _multi{nullptr};
    std::atomic<int> _pid{0};
    std::thread _ioThread;
    CallbackThread _callbackThread;

    // Made before there is a need for it. Whoever waits is told even if there is no memory.
    std::shared_ptr<const Exception> _noMemory;

    std::map<CURL*, std::unique_ptr<Transfer>> _transfers; // on the I/O thread only
};

} // namespace Quillon::Http
