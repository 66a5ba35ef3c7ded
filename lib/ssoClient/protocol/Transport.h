#pragma once

#include "ssoClient/protocol/Request.h"

#include "quillon/Exceptions.h"
#include "quillon/Reader.h"
#include "quillon/http/ExchangeFacts.h"
#include "quillon/system/ScheduledItem.h"
#include "ssoClient/ConnectionReuse.h"

#include <boost/function.hpp>
#include <boost/optional.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

namespace SsoClient {

/**
 * Told how a request ended: an exception and no reply, or no exception and the reply's body. Both
 * are valid during the call; a reply can be kept by reference.
 */
using ResponseCallback = boost::function<void(Quillon::Exception const*, Quillon::Reader*)>;

/** A completion that wants to know nothing, bound without arguments. */
inline void noop() noexcept {} // NOLINT(readability-identifier-naming)

/**
 * One conversation with the token service: its requests share the service's cookies and
 * connection.
 *
 * Thread safety: one operation at a time.
 */
class TransportSession
{
public:
    /**
     * Sends a request and waits for the reply.
     *
     * @param response  receives the reply's body, which may be a SOAP fault.
     * @throws CommunicationException         the service answered with another status.
     * @throws Quillon::Http::HttpException   the exchange failed.
     */
    virtual void SendRequest(const Request& request, Quillon::Ref<Quillon::Reader>& response) = 0;

    /**
     * Sends a request and returns at once; `callback` is called once, on a thread of the HTTP
     * client. Every failure is a `CommunicationException` there.
     *
     * @param pending  receives what can be called off with `Cancel`, after which `callback` is not
     *                 called. It need not be kept: letting go of it changes nothing.
     */
    virtual void SendRequestAsync(
        const Request& request,
        const ResponseCallback& callback,
        Quillon::Ref<Quillon::System::ScheduledItem>& pending) = 0;

protected:
    ~TransportSession() = default;
};

/** What a call has to say of its session; as it starts, nothing. */
struct SessionOptions
{
    /** Told of every exchange, beside the transport's own observer; may be empty. */
    Quillon::Http::ExchangeObserver observer;

    /** What is left for an exchange, in microseconds and positive; empty for no further limit. */
    boost::function<long long()> timeLeft;

    /** Given what calls off the exchange that a blocking request waits for; may be empty. */
    boost::function<void(const Quillon::Ref<Quillon::System::ScheduledItem>&)> onPending;

    /** Whether the service may take the connection for the one who talks. */
    bool isNegotiation = false;
};

/** The way to one token service. Thread safety: immutable. */
class Transport
{
public:
    virtual boost::shared_ptr<TransportSession> CreateSession() const = 0;

    /** One for a call that has more to say. */
    virtual boost::shared_ptr<TransportSession> CreateControlledSession(
        const SessionOptions& options) const = 0;

    /** The same way with connections that are kept, or without. */
    virtual boost::shared_ptr<const Transport> WithReuse(
        const boost::optional<ConnectionReuse>& reuse) const = 0;

    /**
     * Refuses a process that can send nothing, before anything is done for a request: in a forked
     * child a lock of OpenSSL's may never be free, because another thread had it at the fork.
     *
     * @throws Quillon::Http::HttpException  the process is a child that was forked too late.
     */
    virtual void RequireUsable() const {}

protected:
    ~Transport() = default;
};

} // namespace SsoClient
