#include "ServiceManager.h"

#include "CommandLine.h"
#include "ExitCode.h"
#include "OneLine.h"

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <system_error>
#include <utility>

#include <unistd.h>

namespace {

/** Its value, which nobody finds in the environment any more. */
std::string TakeVariable(const char* name)
{
    const char* const value = std::getenv(name);
    std::string text = value == nullptr ? "" : value;
    ::unsetenv(name);
    return text;
}

long long ParsePositive(const char* name, const std::string& text)
{
    long long number = 0;
    if (!ToNumber(text, number) || number <= 0) {
        throw UsageError(std::string(name) + ": `" + text + "' is not a positive number");
    }
    return number;
}

/** Half of what the watchdog allows for, so that a late one is still early enough. */
std::optional<std::chrono::microseconds> TakeAlivePeriod()
{
    const std::string allowed = TakeVariable("WATCHDOG_USEC");
    const std::string process = TakeVariable("WATCHDOG_PID");
    if (allowed.empty()) {
        return std::nullopt;
    }
    if (!process.empty() && ParsePositive("WATCHDOG_PID", process) != ::getpid()) {
        return std::nullopt; // it waits for another process
    }
    return std::chrono::microseconds((ParsePositive("WATCHDOG_USEC", allowed) + 1) / 2);
}

/** By the clock that the protocol wants [sd_notify(3)]. */
std::string GetMonotonicMicros()
{
    constexpr long long MicrosPerSecond = 1'000'000;
    constexpr long long NanosPerMicro = 1'000;
    timespec now = {};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    return std::to_string(now.tv_sec * MicrosPerSecond + now.tv_nsec / NanosPerMicro);
}

} // namespace

ServiceManager::ServiceManager(std::function<void(const std::string&)> complain)
    : _complain(std::move(complain))
    , _alivePeriod(TakeAlivePeriod())
{
    const std::string address = TakeVariable("NOTIFY_SOCKET");
    if (!address.empty()) {
        Connect(address);
    }
}

/** The name of a file, or behind `@` one of the abstract ones, which begin with a zero octet. */
void ServiceManager::Connect(const std::string& address)
{
    if ((address[0] != '/' && address[0] != '@') || address.size() < 2
        || address.size() >= sizeof _address.sun_path) {
        throw UsageError("NOTIFY_SOCKET: `" + address + "' is not the name of a local socket");
    }
    _address.sun_family = AF_UNIX;
    std::memcpy(_address.sun_path, address.data(), address.size());
    if (address[0] == '@') {
        _address.sun_path[0] = '\0';
    }
    _addressSize = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + address.size());
    _socket = FileDescriptor(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    if (!_socket.IsOpen()) {
        ThrowSystemError("NOTIFY_SOCKET");
    }
}

/** That nobody listens is no reason to stop. */
void ServiceManager::Tell(const std::string& state)
{
    if (!_socket.IsOpen()) {
        return;
    }
    const auto* const address = reinterpret_cast<const sockaddr*>(&_address);
    const ssize_t sent = ::sendto(
        _socket.Get(),
        state.data(),
        state.size(),
        MSG_NOSIGNAL | MSG_DONTWAIT,
        address,
        _addressSize);
    if (sent < 0 && _complain) {
        std::exchange(_complain, nullptr)(
            "the service manager cannot be told: " + std::system_category().message(errno));
    }
}

void ServiceManager::TellReady(const std::string& status)
{
    Tell("READY=1\nSTATUS=" + ToOneLine(Shorten(status, MaxShownBytes)));
}

void ServiceManager::TellStatus(const std::string& status)
{
    Tell("STATUS=" + ToOneLine(Shorten(status, MaxShownBytes)));
}

void ServiceManager::TellReloading()
{
    Tell("RELOADING=1\nMONOTONIC_USEC=" + GetMonotonicMicros());
}

void ServiceManager::TellStopping()
{
    Tell("STOPPING=1");
}

void ServiceManager::TellAlive()
{
    Tell("WATCHDOG=1");
}
