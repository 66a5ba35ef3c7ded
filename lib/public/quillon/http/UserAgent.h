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
 * An exchange that was started. Keep it to wait for the exchange or to call it off; letting go of
 * it changes nothing.
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

/** @throws HttpException  the process has forked after its first exchange. */
QUILLON_API void CreateHttpConnectionPool(ConnectionSpec* spec, Ref<HttpConnectionPool>& out);

/**
 * The same for a pool that closes all of its connections once it has had nothing to do for a time.
 *
 * @param idleLimit  in microseconds; positive.
 * @throws InvalidArgumentException  it is not positive.
 */
QUILLON_API void CreateHttpConnectionPool(
    ConnectionSpec* spec, long long idleLimit, Ref<HttpConnectionPool>& out);

/**
 * Sends requests to one server, over HTTP/1.1.
 *
 * Nothing outside the arguments has a say in an exchange: no environment, proxy or .netrc.
 * Redirects are not followed. A request goes out once: if a connection that was kept ends before
 * the reply begins, that is the exchange's failure, because the server may have acted on it. A
 * connection that is found closed before anything is sent is replaced. A reply may have 8 MiB of
 * body and 64 KiB of headers.
 *
 * Replies of status 100, 102 and 103 are passed over. Another of status 1xx is the answer if it is
 * a 101, announces a body or the end of the connection, or if no other reply follows; it has no
 * body.
 *
 * The libraries below look at the environment when they initialise, with the first exchange at the
 * latest: libcurl creates the file that SSLKEYLOGFILE names (no keys land in it), and OpenSSL reads
 * its configuration file, which OPENSSL_CONF can name, unless the process initialised OpenSSL with
 * OPENSSL_INIT_NO_LOAD_CONFIG before.
 *
 * All exchanges of the process run on one I/O thread, which starts with the first of them.
 * Completions run on a second thread, one after another, and should return soon: a slow one
 * delays the others, but no exchange and no wait. At the exit of the process both threads stop;
 * what is still in flight fails, and its completion is not called.
 *
 * A child that is forked before the process has any thread can send. A child that is forked after
 * the first exchange cannot: everything here that would send or wait throws an `HttpException`, at
 * once. In between, when the process has threads but has sent nothing, a lock of a library below
 * may be taken for ever; fork before that.
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
     * @param pending  receives the item to wait on or to call the exchange off with.
     * @throws HttpException  the HTTP threads cannot be started (a later call tries again), or the
     *                        process has forked or is about to end.
     */
    virtual void SendRequestAsync(
        ClientRequest* request, const Completion& completion, Ref<PendingRequestItem>& pending) = 0;

    /**
     * Waits until the exchange has completed, and gives its response. Several threads may wait.
     *
     * @param timeout  in microseconds.
     * @throws TimeoutException  the time is over; the exchange is then called off.
     * @throws HttpException     the exchange failed or was called off, or is one of the process
     *                           that this one was forked from.
     */
    virtual void WaitForResponse(
        PendingRequestItem* pending, long long timeout, Ref<ClientResponse>& response) = 0;
};

/**
 * @param cookieStore  may be null: cookies are then forgotten.
 * @param pool         a pool of the same spec, or null: the agent then keeps connections for
 *                     itself and closes them when it goes.
 * @throws InvalidArgumentException  `spec` is null, or the pool is for another spec.
 * @throws HttpException             the process has forked after its first exchange.
 */
QUILLON_API void CreateHttpUserAgent(
    ConnectionSpec* spec, CookieStore* cookieStore, HttpConnectionPool* pool, Ref<UserAgent>& out);

} // namespace Quillon::Http
