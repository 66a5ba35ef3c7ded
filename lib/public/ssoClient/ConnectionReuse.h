#pragma once

namespace SsoClient {

/**
 * Connections that are kept for the next operation, which so needs no handshake. Each is used by
 * one operation at a time. The one of a negotiation is closed with it, because a service may take
 * the connection for the one who negotiated. Cookies do not outlive their operation.
 */
struct ConnectionReuse
{
    /** How many connections are kept at most while nothing uses them. */
    unsigned mostIdle = 8;

    /** How long. Services close idle connections, too: it should be less than their limit. */
    long long idleMicroseconds = 20'000'000;
};

} // namespace SsoClient
