#pragma once

#include "quillon/Exceptions.h"
#include "quillon/Functor.h"

#include <future>
#include <memory>
#include <string>
#include <thread>

namespace Testing {

/** Holds work back until it is opened, at the latest by its destructor. */
class Gate
{
public:
    ~Gate() { Open(); }

    /** Work that waits for the gate; it may outlive the gate. */
    Quillon::Functor MakeWaiter() const
    {
        return [opened = _opened] { opened.wait(); };
    }

    void Open()
    {
        if (!_isOpen) {
            _isOpen = true;
            _promise.set_value();
        }
    }

private:
    bool _isOpen = false;
    std::promise<void> _promise;
    std::shared_future<void> _opened{_promise.get_future()};
};

/** The message of the `Error` that `action` raises; "accepted" if it does not. */
template <class Error, class Action>
std::string GetMessage(const Action& action)
{
    try {
        action();
    } catch (const Error& error) {
        return error.what();
    }
    return "accepted";
}

/** Returns when `pool` takes no more work. */
template <class Pool>
void AwaitEnd(Pool& pool)
{
    const auto queue = [&pool] { pool.Queue([] {}); };
    while (GetMessage<Quillon::InvalidStateException>(queue) == "accepted") {
        std::this_thread::yield();
    }
}

/** Runs `action` on the pool and returns its result when it has one. */
template <class Pool, class Action>
auto RunOn(Pool& pool, const Action& action)
{
    // The work may still be setting the value when it arrives here.
    const auto result = std::make_shared<std::promise<decltype(action())>>();
    pool.Queue([result, action] { result->set_value(action()); });
    return result->get_future().get();
}

} // namespace Testing
