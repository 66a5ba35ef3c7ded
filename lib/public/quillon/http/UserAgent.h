#pragma once

#include "quillon/Exceptions.h"
#include "quillon/http/ClientRequest.h"
#include "quillon/http/ClientResponse.h"
#include "quillon/http/ConnectionSpec.h"
#include "quillon/http/CookieStore.h"
#include "quillon/http/HttpException.h"
#include "quillon/system/ScheduledItem.h"

#include <boost/function.hpp>

namespace Quillon::Http {

/**
 * An exchange that was started. Keep it: when its last reference goes before the exchange has
 * completed, the exchange is called off.
 */
class QUILLON_API PendingRequestItem : public System::ScheduledItem
{};

/**
 * Told of the end of an exchange: an exception and no response, or no exception and the response;
 * in any case an item of the exchange. All are valid during the call; responses and items can be
 * kept by reference, exceptions with `Clone`.
 */
using Completion = boost::function<void(const Exception*, ClientResponse*, PendingRequestItem*)>;

/** Connections that user agents of one connection spec keep open between exchanges. */
class QUILLON_API HttpConnectionPool : public RefCounted
{};

QUILLON_API void CreateHttpConnectionPool(ConnectionSpec* spec, Ref<HttpConnectionPool>& out);

/**
 * Sends requests to one server, over HTTP/1.1.
 *
 * Nothing outside the arguments has a say in an exchange: no environment, proxy or .netrc.
 * Redirects are not followed. A reply may have 8 MiB of body and 64 KiB of headers.
 *
 * The libraries below look at the environment when they initialise, with the first exchange at the
 * latest: libcurl creates the file that SSLKEYLOGFILE names (no keys land in it), and OpenSSL reads
 * its configuration file, which OPENSSL_CONF can name, unless the process initialised OpenSSL with
 * OPENSSL_INIT_NO_LOAD_CONFIG before.
 *
 * All exchanges of the process run on one I/O thread, which starts with the first of them.
 * Completions run on a second thread, one after another, and should return soon: a slow one
 * delays the others, but no exchange and no wait. At the exit of the process both threads stop;
 * what is still in flight fails, and its completion is not called. A process that forks after
 * its first exchange cannot send in the child.
 *
 * Thread safety: any number of threads. Concurrent exchanges use connections of their own.
 */
class QUILLON_API UserAgent : public RefCounted
{
public:
    /**
     * Starts an exchange and returns at once. The completion is called exactly once, on a thread
     * of the HTTP client, unless the exchange is called off; it may be empty. The agent may go
     * before. What the completion throws is logged and dropped.
     *
     * @param pending  receives the item to wait on, and to hold as long as the exchange matters.
     * @throws HttpException  the process has forked or is about to end.
     */
    virtual void SendRequestAsync(
        ClientRequest* request, const Completion& completion, Ref<PendingRequestItem>& pending) = 0;

    /**
     * Waits until the exchange has completed, and gives its response. Several threads may wait.
     *
     * @param timeout  in microseconds.
     * @throws TimeoutException  the time is over; the exchange is then called off.
     * @throws HttpException     the exchange failed or was called off.
     */
    virtual void WaitForResponse(
        PendingRequestItem* pending, long long timeout, Ref<ClientResponse>& response) = 0;
};

/**
 * @param cookieStore  may be null: cookies are then forgotten.
 * @param pool         a pool of the same spec, or null: the agent then keeps connections for
 *                     itself and closes them when it goes.
 * @throws InvalidArgumentException  `spec` is null, or the pool is for another spec.
 */
QUILLON_API void CreateHttpUserAgent(
    ConnectionSpec* spec, CookieStore* cookieStore, HttpConnectionPool* pool, Ref<UserAgent>& out);

} // namespace Quillon::Http
