#include "Reachability.h"

#include "FileDescriptor.h"

#include "quillon/MessageFormatter.h"

#include <netdb.h>
#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <memory>
#include <system_error>

using Quillon::MessageFormatter;

namespace {

struct AddressDeleter
{
    void operator()(addrinfo* addresses) const noexcept { ::freeaddrinfo(addresses); }
};
using Addresses = std::unique_ptr<addrinfo, AddressDeleter>;

/** @param error  receives the resolver's words if there are no addresses. */
Addresses LookUp(const std::string& host, int port, std::string& error)
{
    addrinfo wanted = {};
    wanted.ai_socktype = SOCK_STREAM;
    addrinfo* found = nullptr;
    const int code = ::getaddrinfo(host.c_str(), std::to_string(port).c_str(), &wanted, &found);
    if (code != 0) {
        error = ::gai_strerror(code);
        return nullptr;
    }
    return Addresses(found);
}

std::string ToText(const addrinfo& address)
{
    std::array<char, NI_MAXHOST> text{};
    ::getnameinfo(
        address.ai_addr, address.ai_addrlen, text.data(), text.size(), nullptr, 0, NI_NUMERICHOST);
    return text.data();
}

/** @return an error number of the system; 0 for success. */
int Connect(const addrinfo& address, int timeoutMs)
{
    const FileDescriptor socket(::socket(
        address.ai_family, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, address.ai_protocol));
    if (!socket.IsOpen()) {
        return errno;
    }
    if (::connect(socket.Get(), address.ai_addr, address.ai_addrlen) == 0) {
        return 0;
    }
    if (errno != EINPROGRESS) {
        return errno;
    }
    pollfd waited = {socket.Get(), POLLOUT, 0};
    if (RetryInterrupted([&] { return ::poll(&waited, 1, timeoutMs); }) == 0) {
        return ETIMEDOUT;
    }
    int error = 0;
    socklen_t size = sizeof error;
    ::getsockopt(socket.Get(), SOL_SOCKET, SO_ERROR, &error, &size);
    return error;
}

Finding ExamineAddress(const addrinfo& address, int port, int timeoutMs)
{
    const int error = Connect(address, timeoutMs);
    const std::string target = MessageFormatter::ASPrint("%1 port %2", ToText(address), port);
    if (error == 0) {
        return {Health::GOOD, "tcp", target + " takes connections", ""};
    }
    return {
        Health::BAD,
        "tcp",
        target + ": " + std::system_category().message(error),
        error == ECONNREFUSED ? "check the port of --url, and whether the service runs"
                              : "a firewall or the network is in between: ask who runs them"};
}

} // namespace

std::vector<Finding> ExamineReachability(const std::string& host, int port, int timeoutMs)
{
    std::string error;
    const Addresses addresses = LookUp(host, port, error);
    if (addresses == nullptr) {
        return {
            {Health::BAD,
             "name",
             host + ": " + error,
             "check the host of --url, and this machine's resolver with: getent hosts " + host}};
    }
    std::vector<Finding> findings;
    std::string names;
    for (const addrinfo* each = addresses.get(); each != nullptr; each = each->ai_next) {
        names += (names.empty() ? "" : ", ") + ToText(*each);
        findings.push_back(ExamineAddress(*each, port, timeoutMs));
    }
    findings.insert(
        findings.begin(), {Health::GOOD, "name", host + " has the addresses " + names, ""});
    return findings;
}
