#pragma once

#include "ssoClient/Cancellation.h"
#include "ssoClient/ConnectionReuse.h"
#include "ssoClient/OperationObserver.h"
#include "ssoClient/SecurityTokenService.h"

#include <boost/optional.hpp>

namespace SsoClient {

/**
 * Whether and when an exchange that failed is made again. Only what the service has not acted on is
 * repeated: there was no connection; or it answered with 408 or 429, or with 503 and a
 * `Retry-After` [RFC 9110 15.5.9, 15.6.4] [RFC 6585 4]. A negotiation is repeated only as long as
 * no leg of it went out. A message that is sent again is composed anew, with times and ids of its
 * own.
 */
struct RetryPolicy
{
    /** How often an exchange is made at most; 1 for no retries. */
    unsigned attempts = 1;

    /**
     * What is waited for before the second attempt; twice as long before each further one. The
     * second half of it is a matter of chance, so that many clients do not come back as one.
     */
    long long firstDelayMicroseconds = 100'000;

    /** The longest of these. A service that asks for more in a `Retry-After` is not asked again. */
    long long longestDelayMicroseconds = 10'000'000;
};

/** What is said of calls beside their arguments. As it starts, they are what they are without. */
struct CallOptions
{
    /**
     * Limits the whole operation: waiting for a thread, names, TLS, all legs and all retries. What
     * a handler of negotiations does is not interrupted, but counts. 0: no limit beside those of
     * the exchanges. An operation that takes longer throws a `Quillon::Http::TimeoutException`.
     */
    long long deadlineMicroseconds = 0;

    CancellationToken cancellation;

    /** Kept; null for none. */
    boost::shared_ptr<OperationObserver> observer;

    RetryPolicy retry;

    /** Absent: each operation has a connection of its own. */
    boost::optional<ConnectionReuse> connectionReuse;
};

/**
 * A service that shares everything with `service`, options of it included, but for the calls'
 * options, which are `options`. Kept connections are its own and its copies', which asynchronous
 * operations make; they are closed when the last of these goes.
 *
 * @throws Quillon::InvalidArgumentException  `service` is null or not one that this library made;
 *                                            a time is negative or, where it must not be, zero; or
 *                                            there are no attempts.
 */
SSOCLIENT_API boost::shared_ptr<SecurityTokenService> WithOptions(
    const boost::shared_ptr<const SecurityTokenService>& service, const CallOptions& options);

} // namespace SsoClient
