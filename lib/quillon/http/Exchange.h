#pragma once

#include "quillon/http/UserAgent.h"

#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>

namespace Quillon::Http {

/** How an exchange ended: with one of the two. */
struct Outcome
{
    std::shared_ptr<const Exception> error;
    Ref<ClientResponse> response;
};

/**
 * What the I/O thread, the callback thread and the callers know of one exchange in common: its
 * outcome, and whether its completion may still be called.
 *
 * Thread safety: any thread.
 */
class Exchange final : public RefCounted
{
public:
    /** @param server  the host and port, for messages. */
    Exchange(const Completion& completion, std::string server);

    /** Sets the outcome, unless the exchange was called off. @return if the completion is due. */
    bool Complete(Outcome outcome);

    /**
     * Calls the completion with the outcome, unless the exchange was called off.
     *
     * @param item  what the completion is given for this exchange.
     */
    void Deliver(PendingRequestItem& item) noexcept;

    /** See `System::ScheduledItem::Cancel`. The completion is released. */
    bool Cancel() noexcept;

    /** Whether the exchange was called off before it had an outcome. */
    bool IsCancelled() const;

    /** See `UserAgent::WaitForResponse`. */
    Ref<ClientResponse> Wait(long long timeout);

    const std::string& GetServer() const noexcept { return _server; }

private:
    enum class State
    {
        PENDING,
        COMPLETED,
        CANCELLED
    };

    const std::string _server;
    mutable std::mutex _mutex;
    std::condition_variable _ended;
    State _state = State::PENDING;
    bool _completionStarted = false;
    Completion _completion; // empty when it was started or will not be
    Outcome _outcome;       // set once, when the state becomes COMPLETED
};

/** The caller's hold on an exchange. */
class PendingRequestItemImpl final : public PendingRequestItem
{
public:
    explicit PendingRequestItemImpl(Ref<Exchange> exchange);
    bool Cancel() noexcept override;

    Exchange& GetExchange() const noexcept { return *_exchange; }

private:
    const Ref<Exchange> _exchange;
};

/** The failure of an exchange whose reply was not complete in time. */
TimeoutException MakeTimeoutException(const std::string& server, long long timeout);

/** The failure of an exchange whose request could not be sent in time. */
TimeoutException MakeConnectTimeoutException(const std::string& server, long long timeout);

} // namespace Quillon::Http
