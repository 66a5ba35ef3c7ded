#include "http/OpenSockets.h"

#include <algorithm>
#include <cerrno>
#include <netinet/in.h>
#include <new>
#include <sys/socket.h>
#include <unistd.h>

namespace Quillon::Http {

namespace {

/** 0 if it has none. */
int GetLocalPort(curl_socket_t socket) noexcept
{
    sockaddr_storage address{};
    socklen_t size = sizeof address;
    if (getsockname(socket, reinterpret_cast<sockaddr*>(&address), &size) != 0) {
        return 0;
    }
    return ntohs(
        address.ss_family == AF_INET6 ? reinterpret_cast<const sockaddr_in6&>(address).sin6_port
                                      : reinterpret_cast<const sockaddr_in&>(address).sin_port);
}

bool HasSomethingToRead(curl_socket_t socket) noexcept
{
    char octet = 0;
    return recv(socket, &octet, sizeof octet, MSG_PEEK | MSG_DONTWAIT) >= 0;
}

} // namespace

curl_socket_t OpenSockets::Open(const curl_sockaddr& address) noexcept
{
    try {
        _sockets.reserve(_sockets.size() + 1);
    } catch (const std::bad_alloc&) {
        errno = ENOMEM;
        return CURL_SOCKET_BAD;
    }
    // Programs that the host starts do not inherit the connection.
    const curl_socket_t opened =
        socket(address.family, address.socktype | SOCK_CLOEXEC, address.protocol);
    if (opened != CURL_SOCKET_BAD) {
        _sockets.push_back(opened);
    }
    return opened;
}

int OpenSockets::Close(void* self, curl_socket_t socket) noexcept
{
    std::vector<curl_socket_t>& sockets = static_cast<OpenSockets*>(self)->_sockets;
    sockets.erase(std::remove(sockets.begin(), sockets.end(), socket), sockets.end());
    return close(socket);
}

bool OpenSockets::HasInput(int localPort) const noexcept
{
    return std::any_of(_sockets.begin(), _sockets.end(), [localPort](curl_socket_t socket) {
        return GetLocalPort(socket) == localPort && HasSomethingToRead(socket);
    });
}

} // namespace Quillon::Http
