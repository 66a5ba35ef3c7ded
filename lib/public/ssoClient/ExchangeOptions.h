#pragma once

#include "quillon/http/ExchangeFacts.h"

namespace SsoClient {

/** How the exchanges with a token service are made. As it starts, it is what a service has without.
 */
struct ExchangeOptions
{
    /** Limits each exchange, from the name look-up to the last byte; positive. */
    long long timeoutMicroseconds = 240'000'000;

    /**
     * Limits, within that, what comes before the request is sent: the name look-up, the connection
     * and the TLS handshake; positive.
     */
    long long connectTimeoutMicroseconds = 240'000'000;

    /** Told of every exchange; may be empty. Several threads' exchanges are told one by one. */
    Quillon::Http::ExchangeObserver observer;
};

} // namespace SsoClient
