#include "WaitNotice.h"

#include "Terminal.h"

#include <chrono>

namespace {

constexpr std::chrono::seconds Patience(5);

} // namespace

WaitNotice::WaitNotice(
    const Presentation& presentation, const std::string& server, long long timeoutSec)
{
    if (!presentation.HasReader()) {
        return;
    }
    _thread = std::thread([this, server, timeoutSec] {
        std::unique_lock<std::mutex> lock(_mutex);
        if (!_ended.wait_for(lock, Patience, [this] { return _isOver; })) {
            Notice(
                "waiting for " + server + ", for up to " + std::to_string(timeoutSec)
                + " seconds an exchange");
        }
    });
}

WaitNotice::~WaitNotice()
{
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _isOver = true;
    }
    _ended.notify_one();
    if (_thread.joinable()) {
        _thread.join();
    }
}
