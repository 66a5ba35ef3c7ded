#include "ssoClientRuntime/ProcessEnvironment.h"

#include "quillon/system/Clock.h"
#include "quillon/system/SignalBlock.h"
#include "quillon/system/ThreadPool.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <cstdlib>
#include <new>
#include <random>
#include <system_error>
#include <thread>

namespace SsoClient {

namespace {

/** Never destroyed: its thread goes on while static objects are destroyed. */
union ImmortalEnvironment {
    ImmortalEnvironment() { new (&pointer) Pointer(boost::make_shared<ProcessEnvironment>()); }
    ~ImmortalEnvironment() {} // NOLINT(modernize-use-equals-default): the member is left alone
    ImmortalEnvironment(const ImmortalEnvironment&) = delete;
    ImmortalEnvironment& operator=(const ImmortalEnvironment&) = delete;

    using Pointer = boost::shared_ptr<ProcessEnvironment>;
    Pointer pointer;
};

ProcessEnvironment& GetEnvironment()
{
    return *boost::static_pointer_cast<ProcessEnvironment>(GetProcessEnvironment());
}

} // namespace

Quillon::System::DateTime ProcessEnvironment::GetWallTime() const
{
    return Quillon::System::GetUtcDateTime();
}

std::chrono::steady_clock::time_point ProcessEnvironment::GetSteadyTime() const
{
    return std::chrono::steady_clock::now();
}

double ProcessEnvironment::DrawNumber()
{
    thread_local std::mt19937_64 engine{std::random_device()()};
    return std::generate_canonical<double, 32>(engine);
}

void ProcessEnvironment::Run(const Work& work)
{
    Quillon::System::GetThreadPool()->Queue(work);
}

void ProcessEnvironment::RunAt(std::chrono::steady_clock::time_point time, const Work& work)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    _queue.emplace(time, work);
    if (!_hasThread) {
        StartThread();
    }
    _changed.notify_one();
}

/** If there is no thread to be had, the next call tries again. */
void ProcessEnvironment::StartThread()
{
    try {
        const Quillon::System::SignalBlock noSignals;
        std::thread([this] { Ring(); }).detach();
        _hasThread = true;
    } catch (const std::system_error&) { // NOLINT(bugprone-empty-catch)
    }
}

void ProcessEnvironment::Ring()
{
    std::unique_lock<std::mutex> lock(_mutex);
    while (!_isEnding) {
        if (_queue.empty()) {
            _changed.wait(lock);
        } else if (_queue.begin()->first > std::chrono::steady_clock::now()) {
            const auto next = _queue.begin()->first;
            _changed.wait_until(lock, next);
        } else {
            auto due = _queue.extract(_queue.begin());
            lock.unlock();
            due.mapped()();
            due = {}; // what it holds is destroyed outside the lock, too
            lock.lock();
        }
    }
}

void ProcessEnvironment::End() noexcept
{
    const std::lock_guard<std::mutex> lock(_mutex);
    _isEnding = true;
    _changed.notify_one();
}

boost::shared_ptr<RuntimeEnvironment> GetProcessEnvironment()
{
    static ImmortalEnvironment immortal;
    static const int atEnd = std::atexit([] { GetEnvironment().End(); });
    static_cast<void>(atEnd);
    return immortal.pointer;
}

} // namespace SsoClient
