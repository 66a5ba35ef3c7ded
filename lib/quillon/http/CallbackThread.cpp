#include "http/CallbackThread.h"

#include <utility>

namespace Quillon::Http {

void CallbackThread::Start()
{
    if (!_thread.joinable()) { // an earlier start of the engine may have failed after this
        _thread = std::thread([this] { Run(); });
    }
}

void CallbackThread::Push(Notice& notice) noexcept
{
    const std::lock_guard<std::mutex> lock(_mutex);
    _due.splice(_due.end(), notice);
    _changed.notify_one();
}

void CallbackThread::Run()
{
    std::unique_lock<std::mutex> lock(_mutex);
    while (!_stopping) {
        if (_due.empty()) {
            _changed.wait(lock);
            continue;
        }
        Notice next;
        next.splice(next.end(), _due, _due.begin());
        _calling = true;
        lock.unlock();
        next.front()->GetExchange().Deliver(*next.front());
        next.clear();
        lock.lock();
        _calling = false;
    }
}

void CallbackThread::Stop()
{
    Notice dropped;
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _stopping = true;
        _due.swap(dropped);
        _changed.notify_one();
        if (_calling) {
            _thread.detach();
            return;
        }
    }
    _thread.join();
}

} // namespace Quillon::Http
