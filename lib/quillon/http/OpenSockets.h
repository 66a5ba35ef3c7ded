#pragma once

#include "http/Curl.h"

#include <vector>

namespace Quillon::Http {

/**
 * The sockets of the connections of one pool: libcurl does not tell which one a connection that was
 * kept has.
 *
 * Thread safety: used by the I/O thread alone.
 */
class OpenSockets
{
public:
    /** Opens one for libcurl. @return `CURL_SOCKET_BAD`, with `errno`, if there is none. */
    curl_socket_t Open(const curl_sockaddr& address) noexcept;

    /** Closes one of `self`, as libcurl wants it done. */
    static int Close(void* self, curl_socket_t socket) noexcept;

    /** Whether the one of this local port has something to read, be it the end. */
    bool HasInput(int localPort) const noexcept;

private:
    std::vector<curl_socket_t> _sockets;
};

} // namespace Quillon::Http
