#include "MetricsServer.h"

#include "CommandLine.h"
#include "ExitCode.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <utility>

#include <unistd.h>

namespace {

constexpr std::chrono::seconds ClientTime(5);
constexpr std::chrono::seconds RestAfterFailure(1);
constexpr std::size_t MaxClients = 16;
constexpr std::size_t MaxRequestBytes = 8192;
constexpr int MaxPort = 65535;

/** An IPv4 or IPv6 address as the system calls want it. */
union SocketAddress {
    sockaddr any;
    sockaddr_in v4;
    sockaddr_in6 v6;
};

SocketAddress MakeSocketAddress(const ListenAddress& address)
{
    SocketAddress made = {};
    if (address.isV6) {
        made.v6 = {};
        made.v6.sin6_family = AF_INET6;
        made.v6.sin6_port = htons(static_cast<std::uint16_t>(address.port));
        ::inet_pton(AF_INET6, address.host.c_str(), &made.v6.sin6_addr);
    } else {
        made.v4 = {};
        made.v4.sin_family = AF_INET;
        made.v4.sin_port = htons(static_cast<std::uint16_t>(address.port));
        ::inet_pton(AF_INET, address.host.c_str(), &made.v4.sin_addr);
    }
    return made;
}

/** [RFC 1122 3.2.1.3] [RFC 4291 2.5.3] @return whether it is an address at all. */
bool Judge(ListenAddress& address)
{
    in_addr v4 = {};
    in6_addr v6 = {};
    if (address.isV6) {
        const bool isAddress = ::inet_pton(AF_INET6, address.host.c_str(), &v6) == 1;
        address.isLoopback = IN6_IS_ADDR_LOOPBACK(&v6);
        return isAddress;
    }
    const bool isAddress = ::inet_pton(AF_INET, address.host.c_str(), &v4) == 1;
    address.isLoopback = (ntohl(v4.s_addr) >> 24) == IN_LOOPBACKNET;
    return isAddress;
}

FileDescriptor Listen(const ListenAddress& address)
{
    const SocketAddress where = MakeSocketAddress(address);
    const socklen_t size = address.isV6 ? sizeof where.v6 : sizeof where.v4;
    FileDescriptor listener(
        ::socket(where.any.sa_family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    const int yes = 1;
    if (!listener.IsOpen()
        || ::setsockopt(listener.Get(), SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes) != 0
        || ::bind(listener.Get(), &where.any, size) != 0
        || ::listen(listener.Get(), static_cast<int>(MaxClients)) != 0) {
        ThrowSystemError("--metrics: cannot listen");
    }
    return listener;
}

int GetPort(const FileDescriptor& listener)
{
    SocketAddress where = {};
    socklen_t size = sizeof where;
    if (::getsockname(listener.Get(), &where.any, &size) != 0) {
        ThrowSystemError("--metrics: cannot listen");
    }
    return ntohs(where.any.sa_family == AF_INET6 ? where.v6.sin6_port : where.v4.sin_port);
}

std::string MakeReply(
    const std::string& status, const std::string& headers, const std::string& body)
{
    return "HTTP/1.1 " + status + "\r\n" + headers + "Connection: close\r\nContent-Length: "
           + std::to_string(body.size()) + "\r\n\r\n" + body;
}

std::string MakeRefusal(const std::string& status, const std::string& headers = "")
{
    return MakeReply(status, headers + "Content-Type: text/plain\r\n", status + "\n");
}

bool WouldWait()
{
    return errno == EAGAIN || errno == EINTR;
}

} // namespace

std::optional<ListenAddress> ParseListenAddress(const std::string& text)
{
    const std::size_t colon = text.rfind(':');
    if (colon == std::string::npos) {
        return std::nullopt;
    }
    ListenAddress address;
    address.host = text.substr(0, colon);
    if (address.host == "localhost") {
        address.host = "127.0.0.1";
    }
    if (address.host.size() > 2 && address.host.front() == '[' && address.host.back() == ']') {
        address.host = address.host.substr(1, address.host.size() - 2);
        address.isV6 = true;
    }
    const std::string port = text.substr(colon + 1);
    long long number = 0;
    if (port.empty() || port.find_first_not_of("0123456789") != std::string::npos
        || !ToNumber(port, number) || number > MaxPort) {
        return std::nullopt;
    }
    address.port = static_cast<int>(number);
    return Judge(address) ? std::optional(address) : std::nullopt;
}

MetricsServer::MetricsServer(const ListenAddress& address, std::function<std::string()> describe)
    : _describe(std::move(describe))
    , _listener(Listen(address))
    , _url(
          "http://" + (address.isV6 ? "[" + address.host + "]" : address.host) + ":"
          + std::to_string(GetPort(_listener)) + "/metrics")
{}

std::optional<MetricsServer::Clock::time_point> MetricsServer::AddTo(
    std::vector<pollfd>& waits) const
{
    std::optional<Clock::time_point> longest;
    if (Clock::now() < _acceptsFrom) {
        longest = _acceptsFrom;
    } else {
        waits.push_back({_listener.Get(), POLLIN, 0});
    }
    for (const Client& client : _clients) {
        const short events = client.reply.empty() ? POLLIN : POLLOUT;
        waits.push_back({client.socket.Get(), events, 0});
        longest = std::min(longest.value_or(client.end), client.end);
    }
    return longest;
}

void MetricsServer::Serve()
{
    Accept();
    const Clock::time_point now = Clock::now();
    for (Client& client : _clients) {
        GoOn(client);
    }
    _clients.remove_if([&](const Client& client) { return client.isOver || client.end <= now; });
}

void MetricsServer::Accept()
{
    while (Clock::now() >= _acceptsFrom) {
        FileDescriptor socket(
            ::accept4(_listener.Get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
        if (socket.IsOpen()) {
            Admit(std::move(socket));
        } else if (WouldWait() || errno == ECONNABORTED) {
            return;
        } else {
            // Without a descriptor for it, who wants in would wake the loop for ever.
            _acceptsFrom = Clock::now() + RestAfterFailure;
        }
    }
}

void MetricsServer::Admit(FileDescriptor socket)
{
    if (_clients.size() == MaxClients) {
        _clients.pop_front();
    }
    Client& client = _clients.emplace_back();
    client.socket = std::move(socket);
    client.end = Clock::now() + ClientTime;
}

void MetricsServer::GoOn(Client& client) const
{
    if (!client.isAnswered) {
        Read(client);
    }
    if (!client.reply.empty()) {
        const ssize_t count =
            ::send(client.socket.Get(), client.reply.data(), client.reply.size(), MSG_NOSIGNAL);
        client.isOver = client.isOver || (count < 0 && !WouldWait());
        client.reply.erase(0, count < 0 ? 0 : static_cast<std::size_t>(count));
        if (client.reply.empty()) {
            ::shutdown(client.socket.Get(), SHUT_WR);
        }
    }
    // Closed with something unread, the connection would be reset, and the reply be lost with it.
    if (client.isAnswered && client.reply.empty() && !client.isOver) {
        Read(client);
    }
}

/** Of a request that is answered, the rest is thrown away. */
void MetricsServer::Read(Client& client) const
{
    std::array<char, MaxRequestBytes> buffer = {};
    const ssize_t count = ::recv(client.socket.Get(), buffer.data(), buffer.size(), 0);
    if (count <= 0) {
        client.isOver = count == 0 || !WouldWait();
        return;
    }
    if (client.isAnswered) {
        return;
    }
    client.request.append(buffer.data(), static_cast<std::size_t>(count));
    const bool isWhole = client.request.find("\r\n\r\n") != std::string::npos;
    if (isWhole || client.request.size() > MaxRequestBytes) {
        client.reply =
            isWhole ? Answer(client.request) : MakeRefusal("431 Request Header Fields Too Large");
        client.isAnswered = true;
    }
}

/** @param request  its first line counts [RFC 9112 3]. */
std::string MetricsServer::Answer(const std::string& request) const
{
    const std::string line = request.substr(0, request.find("\r\n"));
    const std::size_t afterMethod = line.find(' ');
    const std::size_t beforeVersion = line.rfind(' ');
    if (afterMethod == std::string::npos || beforeVersion <= afterMethod
        || line.compare(beforeVersion, 8, " HTTP/1.") != 0) {
        return MakeRefusal("400 Bad Request");
    }
    const std::string target = line.substr(afterMethod + 1, beforeVersion - afterMethod - 1);
    if (target.substr(0, target.find('?')) != "/metrics") {
        return MakeRefusal("404 Not Found");
    }
    if (line.substr(0, afterMethod) != "GET") {
        return MakeRefusal("405 Method Not Allowed", "Allow: GET\r\n");
    }
    return MakeReply(
        "200 OK", "Content-Type: text/plain; version=0.0.4; charset=utf-8\r\n", _describe());
}
