#pragma once

#include "http/Exchange.h"

#include <condition_variable>
#include <deque>
#include <mutex>
#include <thread>

namespace Quillon::Http {

/** Calls completions one after another, so that no caller's code runs on the I/O thread. */
class CallbackThread
{
public:
    void Start();
    void Push(const Ref<Exchange>& exchange);

    /**
     * Lets no further completion start. Does not wait for one that runs: it is the caller's code,
     * and it may be the one that ends the process.
     */
    void Stop();

private:
    void Run();

    std::mutex _mutex;
    std::condition_variable _changed;
    std::deque<Ref<Exchange>> _due;
    bool _stopping = false;
    bool _calling = false;
    std::thread _thread;
};

} // namespace Quillon::Http
