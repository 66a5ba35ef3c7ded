#pragma once

#include "ssoClient/Cancellation.h"

#include <boost/function.hpp>

#include <condition_variable>
#include <list>
#include <mutex>

namespace SsoClient {

/** What the tokens of one source have in common. Thread safety: any thread. */
class CancellationState
{
public:
    using Action = boost::function<void()>;
    using Place = std::list<Action>::iterator;

    bool IsCancelled() const noexcept;

    /** Runs what was added, outside any lock, and wakes who waits. */
    void Cancel();

    /** @return whether it was added; not if the source has cancelled already. */
    bool Add(const Action& action, Place& place);

    /** Takes it back, unless it is being run or was. */
    void Remove(Place place) noexcept;

    /** Waits at most for `microseconds`. @return whether the source has cancelled. */
    bool Wait(long long microseconds) const;

private:
    mutable std::mutex _mutex;
    mutable std::condition_variable _cancelled;
    bool _isCancelled = false;
    std::list<Action> _actions; // what has not been run
};

/**
 * Has `action` run when a token's source cancels, as long as this object lives; at once if it has
 * cancelled already. The action must be able to run a little later, too: it may be under way on
 * another thread when this object goes.
 */
class CancellationWatch
{
public:
    CancellationWatch(const CancellationToken& token, const CancellationState::Action& action);
    CancellationWatch(const CancellationWatch&) = delete;
    CancellationWatch& operator=(const CancellationWatch&) = delete;
    ~CancellationWatch();

    /** Waits at most for `microseconds`. @return whether the token's source has cancelled. */
    static bool Wait(const CancellationToken& token, long long microseconds);

private:
    boost::shared_ptr<CancellationState> _state; // null if nothing is to be taken back
    CancellationState::Place _place;
};

} // namespace SsoClient
