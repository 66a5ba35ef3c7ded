#pragma once

#include "Presentation.h"

#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>

/** Tells a terminal what is waited for, if this lives for more than a few seconds. */
class WaitNotice
{
public:
    WaitNotice(const Presentation& presentation, const std::string& server, long long timeoutSec);
    WaitNotice(const WaitNotice&) = delete;
    WaitNotice& operator=(const WaitNotice&) = delete;
    ~WaitNotice();

private:
    std::mutex _mutex;
    std::condition_variable _ended;
    bool _isOver = false;
    std::thread _thread;
};
