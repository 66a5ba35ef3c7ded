#include "devsts/http/Connections.h"

#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <netinet/in.h>
#include <system_error>
#include <unistd.h>

namespace DevSts {

namespace fs = std::filesystem;

namespace {

class File
{
public:
    explicit File(int number)
        : _number(number)
    {}
    ~File()
    {
        if (_number >= 0) {
            close(_number);
        }
    }
    File(const File&) = delete;
    File& operator=(const File&) = delete;

    int Number() const { return _number; }

private:
    int _number;
};

const sockaddr_in& AsIpv4(const sockaddr_storage& address)
{
    return reinterpret_cast<const sockaddr_in&>(address);
}

const sockaddr_in6& AsIpv6(const sockaddr_storage& address)
{
    return reinterpret_cast<const sockaddr_in6&>(address);
}

bool Ipv4Covers(const sockaddr_in& listener, const sockaddr_in& other)
{
    return listener.sin_addr.s_addr == htonl(INADDR_ANY)
           || listener.sin_addr.s_addr == other.sin_addr.s_addr;
}

bool Ipv6Covers(const sockaddr_in6& listener, const sockaddr_in6& other)
{
    return IN6_IS_ADDR_UNSPECIFIED(&listener.sin6_addr)
           || IN6_ARE_ADDR_EQUAL(&listener.sin6_addr, &other.sin6_addr);
}

bool IsSocket(const fs::path& entry)
{
    std::error_code ignored;
    return fs::read_symlink(entry, ignored).string().rfind("socket:", 0) == 0;
}

} // namespace

IpAddress IpAddress::Local(int socket)
{
    IpAddress address;
    socklen_t size = sizeof address._address;
    const bool found =
        getsockname(socket, reinterpret_cast<sockaddr*>(&address._address), &size) == 0;
    return found ? address : IpAddress();
}

IpAddress IpAddress::Peer(int socket)
{
    IpAddress address;
    socklen_t size = sizeof address._address;
    const bool found =
        getpeername(socket, reinterpret_cast<sockaddr*>(&address._address), &size) == 0;
    return found ? address : IpAddress();
}

bool IpAddress::Covers(const IpAddress& other) const
{
    if (_address.ss_family != other._address.ss_family || Port() != other.Port()) {
        return false;
    }
    switch (_address.ss_family) {
    case AF_INET:
        return Ipv4Covers(AsIpv4(_address), AsIpv4(other._address));
    case AF_INET6:
        return Ipv6Covers(AsIpv6(_address), AsIpv6(other._address));
    default:
        return false;
    }
}

int IpAddress::Port() const
{
    switch (_address.ss_family) {
    case AF_INET:
        return ntohs(AsIpv4(_address).sin_port);
    case AF_INET6:
        return ntohs(AsIpv6(_address).sin6_port);
    default:
        return 0;
    }
}

void EndReading(const IpAddress& listener, const std::set<int>& busy)
{
    std::error_code ignored;
    for (const fs::directory_entry& entry : fs::directory_iterator("/proc/self/fd", ignored)) {
        if (!IsSocket(entry.path())) {
            continue;
        }
        // Another thread may close this number and open another file under it. The duplicate
        // stays what it is, so that the socket that is shut is the one that was judged.
        const File socket(fcntl(std::stoi(entry.path().filename().string()), F_DUPFD_CLOEXEC, 0));
        if (listener.Covers(IpAddress::Local(socket.Number()))
            && busy.count(IpAddress::Peer(socket.Number()).Port()) == 0) {
            shutdown(socket.Number(), SHUT_RD);
        }
    }
}

} // namespace DevSts
