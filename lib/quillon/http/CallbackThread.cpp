#include "http/CallbackThread.h"

#include <utility>

namespace Quillon::Http {

void CallbackThread::Start()
{
    if (!_thread.joinable()) { // an earlier start of the engine may have failed after this
        _thread = std::thread([this] { Run(); });
    }
}

void CallbackThread::Push(const Ref<Exchange>& exchange)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    _due.push_back(exchange);
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
        Ref<Exchange> exchange = std::move(_due.front());
        _due.pop_front();
        _calling = true;
        lock.unlock();
        exchange->Deliver();
        exchange.reset();
        lock.lock();
        _calling = false;
    }
}

void CallbackThread::Stop()
{
    std::deque<Ref<Exchange>> dropped;
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
