#pragma once

#include "quillon/Exceptions.h"
#include "quillon/Reader.h"
#include "quillon/Ref.h"
#include "quillon/http/ExchangeFacts.h"

#include <string>

namespace Quillon::Http {

enum class HttpMethod : int
{
    POST = 3
};

/** Answers a question about a status code. Called on a thread of the HTTP client. */
using StatusTest = bool (*)(int status) noexcept;

/**
 * A request in the making. Its body is wiped from memory when the request goes.
 *
 * Thread safety: one thread; once sent it must not be changed any more.
 */
class QUILLON_API ClientRequest : public RefCounted
{
public:
    /**
     * Sets a header field, in place of an earlier one of the same name.
     *
     * @throws InvalidArgumentException  the name is not a token [RFC 9110 5.6.2] or the value has
     *                                   a control character: it could start a line of its own.
     */
    virtual void SetHeader(const std::string& name, const std::string& value) = 0;

    /** Where the body is written; valid as long as the request. */
    virtual Writer* GetBodyWriter() noexcept = 0;

    /**
     * Limits the whole exchange, from the name look-up to the last byte of the reply.
     *
     * @param timeout  in microseconds, rounded up to milliseconds; at least one microsecond. A
     *                 request starts with 240 seconds.
     * @throws InvalidArgumentException  `timeout` is not positive.
     */
    virtual void SetTimeout(long long timeout) = 0;

    /**
     * Says for which status codes the body of the reply counts; without it, for all. A reply of
     * another status ends with its head: its body is empty, nothing behind the head is waited for
     * or judged, and the connection is closed.
     */
    virtual void SetBodyStatuses(StatusTest wantsBody) noexcept = 0;

    /**
     * Limits what comes before the request is sent: the name look-up, the connection and the TLS
     * handshake. A request starts without such a limit of its own.
     *
     * @param timeout  as for `SetTimeout`, which also holds.
     * @throws InvalidArgumentException  `timeout` is not positive.
     */
    virtual void SetConnectTimeout(long long timeout) = 0;

    /** Has the facts of the exchange collected and told. Nothing is collected without it. */
    virtual void SetObserver(const ExchangeObserver& observer) = 0;
};

/**
 * @param path  the request target: `/` and what may follow in a URL, query included.
 * @throws InvalidArgumentException  the path is malformed.
 */
QUILLON_API void CreateHttpRequest(
    HttpMethod method, const std::string& path, Ref<ClientRequest>& out);

} // namespace Quillon::Http
