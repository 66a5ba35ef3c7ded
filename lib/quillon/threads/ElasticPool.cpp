#include "threads/ElasticPool.h"

#include "system/systemError.h"

#include "quillon/Exceptions.h"
#include "quillon/service/Logger.h"
#include "quillon/system/SignalBlock.h"

#include <algorithm>
#include <cxxabi.h>
#include <memory>
#include <new>
#include <string>
#include <system_error>
#include <unistd.h>

namespace Quillon::System {

namespace {

void LogStray(const std::string& what, const std::exception* error) noexcept
{
    try {
        Service::GetApp()->GetLogFacility().GetLogger("Quillon")->Log(
            Service::LOG_LEVEL_WARNING,
            what + " on the thread pool raised "
                + (error != nullptr ? GetClassName(*error) + ": " + error->what()
                                    : "something that is not an exception."));
    } catch (const std::bad_alloc&) { // NOLINT(bugprone-empty-catch): a lost line harms nobody
    }
}

/** Runs code of the host and logs what it throws. */
template <class Action>
void Contain(const char* what, const Action& action)
{
    try {
        action();
    } catch (abi::__forced_unwind&) {
        throw; // pthread_exit and cancellation unwind the stack this way, and must get to its end
    } catch (const std::exception& error) {
        LogStray(what, &error);
    } catch (...) {
        LogStray(what, nullptr);
    }
}

/** Destroys what is bound to the work. */
void Release(std::list<Functor>& work)
{
    Functor& functor = work.front();
    bool isClear = false;
    Contain("Releasing a piece of work", [&] {
        functor.clear();
        isClear = true;
    });
    if (!isClear) {
        // It still refers to what is destroyed by now.
        std::construct_at(&functor);
    }
    work.clear();
}

void Perform(std::list<Functor>& work)
{
    Contain("A piece of work", work.front());
    Release(work);
}

template <class Workers>
void Join(Workers& workers)
{
    for (auto& worker : workers) {
        worker.thread.join();
    }
}

} // namespace

ElasticPool::ElasticPool(const ElasticPoolOptions& options) noexcept
    : _options(options)
{}

ElasticPool::~ElasticPool()
{
    std::list<Worker> workers;
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _state = State::LEAVING;
        workers.splice(workers.end(), _idle);
        workers.splice(workers.end(), _busy);
        workers.splice(workers.end(), _retired);
        for (Worker& worker : workers) {
            worker.wake.notify_one();
        }
    }
    Join(workers);
}

void ElasticPool::Queue(const Functor& work)
{
    if (work.empty()) {
        throw InvalidArgumentException("the work for the thread pool is empty");
    }
    RequireSameProcess();
    // Copied, and destroyed if it is refused, outside the lock: that is the caller's code.
    std::list<Functor> item(1, work);
    const std::lock_guard<std::mutex> lock(_mutex);
    RequireOpen();
    Start();
    if (_idle.empty() && CountThreads() < _options.limit) {
        AddThread();
    }
    _queue.splice(_queue.end(), item);
    HandOver();
}

std::size_t ElasticPool::GetThreadCount() const
{
    if (HasForked()) {
        return 0;
    }
    const std::lock_guard<std::mutex> lock(_mutex);
    return CountThreads();
}

void ElasticPool::SetLimit(std::size_t limit)
{
    if (limit == 0) {
        throw InvalidArgumentException("the thread pool needs at least one thread");
    }
    if (!HasForked()) {
        const std::lock_guard<std::mutex> lock(_mutex);
        if (_state == State::IDLE) {
            _options.limit = limit;
            return;
        }
    }
    throw InvalidStateException(
        "The thread pool has started; its limit must be set before the first work.");
}

void ElasticPool::End(std::chrono::milliseconds patience)
{
    if (HasForked()) {
        return;
    }
    const auto deadline = std::chrono::steady_clock::now() + patience;
    std::list<Worker> retired;
    {
        std::unique_lock<std::mutex> lock(_mutex);
        _state = State::ENDED;
        _quietened.wait_until(lock, deadline, [this] { return IsQuiet(); });
        retired.swap(_retired);
    }
    Join(retired);
}

bool ElasticPool::HasForked() const noexcept
{
    const int pid = _pid;
    return pid != 0 && pid != getpid();
}

/** Comes before the lock, which a thread of the parent may have held at the fork. */
void ElasticPool::RequireSameProcess()
{
    const int own = getpid();
    int known = 0;
    if (!_pid.compare_exchange_strong(known, own) && known != own) {
        throw InvalidStateException("The process has forked after its first work on the thread "
                                    "pool; the child cannot queue any. Fork first.");
    }
}

void ElasticPool::RequireOpen()
{
    if (_state == State::IDLE && !_isPrepared) {
        if (_options.prepare != nullptr && !_options.prepare()) {
            _state = State::ENDED;
        }
        _isPrepared = true;
    }
    if (_state == State::ENDED) {
        throw InvalidStateException(
            "The process is about to end; the thread pool takes no more work.");
    }
}

void ElasticPool::Start()
{
    if (_state != State::IDLE) {
        return;
    }
    AddThread();
    _state = State::OPEN;
    const std::size_t count = std::min(_options.initial, _options.limit);
    for (std::size_t index = 1; index < count; ++index) {
        AddThread();
    }
}

/** Does nothing if the system has no thread to give, but there is one that takes the work. */
void ElasticPool::AddThread()
{
    std::list<Worker> fresh(1);
    const Position worker = fresh.begin();
    worker->surplusAt = std::chrono::steady_clock::now() + _options.idleTime;
    try {
        const SignalBlock noSignals;
        worker->thread = std::thread([this, worker] { Run(worker); });
    } catch (const std::system_error& error) {
        if (CountThreads() > 0) {
            return;
        }
        throw InvalidStateException(
            "The thread pool cannot start a thread: " + DescribeSystemError(error.code().value()));
    }
    _idle.splice(_idle.begin(), fresh);
}

void ElasticPool::HandOver()
{
    while (!_queue.empty() && !_idle.empty()) {
        const Position worker = _idle.begin();
        worker->work.splice(worker->work.end(), _queue, _queue.begin());
        _busy.splice(_busy.end(), _idle, worker);
        worker->wake.notify_one();
    }
}

/** Whether no work runs, but for the work that asks. */
bool ElasticPool::IsQuiet() const
{
    return std::none_of(_busy.begin(), _busy.end(), [](const Worker& worker) {
        return worker.isRunning && worker.thread.get_id() != std::this_thread::get_id();
    });
}

void ElasticPool::Run(Position self)
{
    std::unique_lock<std::mutex> lock(_mutex);
    while (AwaitWork(self, lock)) {
        self->isRunning = true;
        lock.unlock();
        try {
            Perform(self->work);
        } catch (...) { // the thread is being unwound to its end
            Abandon(self);
            throw;
        }
        lock.lock();
        FinishWork(self);
    }
}

/** @return whether there is work; if not, the thread must leave. */
bool ElasticPool::AwaitWork(Position self, std::unique_lock<std::mutex>& lock)
{
    while (_state != State::LEAVING) {
        if (_state == State::OPEN && !self->work.empty()) {
            return true;
        }
        // Threads are only added when none is idle. So a thread that waits without a limit
        // because it was not one too many does not become one while it waits.
        if (_state == State::ENDED || CountThreads() <= _options.initial) {
            self->wake.wait(lock);
        } else if (std::chrono::steady_clock::now() < self->surplusAt) {
            self->wake.wait_until(lock, self->surplusAt);
        } else {
            Leave(self, lock);
            return false;
        }
    }
    return false;
}

void ElasticPool::FinishWork(Position self)
{
    self->isRunning = false;
    self->surplusAt = std::chrono::steady_clock::now() + _options.idleTime;
    if (_state == State::LEAVING) {
        return; // the destructor has the threads
    }
    _idle.splice(_idle.begin(), _busy, self);
    if (_state == State::ENDED) {
        _quietened.notify_all();
    } else {
        HandOver();
    }
}

/** Puts another thread in the place of one that its work has ended. */
void ElasticPool::Abandon(Position self)
{
    Release(self->work);
    std::unique_lock<std::mutex> lock(_mutex);
    self->isRunning = false;
    if (_state == State::LEAVING) {
        return; // the destructor has the threads
    }
    std::list<Worker> departed;
    departed.swap(_retired);
    _retired.splice(_retired.end(), _busy, self);
    if (_state == State::ENDED) {
        _quietened.notify_all();
    } else if (!_queue.empty()) {
        Contain("Starting a thread in the place of one that has ended", [this] { AddThread(); });
        HandOver(); // without a thread, the work waits for the next that is queued
    }
    lock.unlock();
    Join(departed);
}

/** Joins those that left before and is joined by the next, so that ended threads do not pile up. */
void ElasticPool::Leave(Position self, std::unique_lock<std::mutex>& lock)
{
    std::list<Worker> departed;
    departed.swap(_retired);
    _retired.splice(_retired.end(), _idle, self);
    lock.unlock();
    Join(departed);
}

} // namespace Quillon::System
