#pragma once

#include "http/Exchange.h"

#include <condition_variable>
#include <list>
#include <mutex>
#include <thread>

namespace Quillon::Http {

/** An exchange whose completion is due. Made before the exchange begins: its end needs no memory.
 */
using Notice = std::list<Ref<PendingRequestItemImpl>>;

/** Calls completions one after another, so that no caller's code runs on the I/O thread. */
class CallbackThread
{
public:
    void Start();
    void Push(Notice& notice) noexcept;

    /**
     * Lets no further completion start. Does not wait for one that runs: it is the caller's code,
     * and it may be the one that ends the process.
     */
    void Stop();

private:
    void Run();

    std::mutex _mutex;
    std::condition_variable _changed;
    Notice _due;
    bool _stopping = false;
    bool _calling = false;
    std::thread _thread;
};

} // namespace Quillon::Http
