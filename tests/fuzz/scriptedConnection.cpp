#include "fuzz/scriptedConnection.h"

#include "fuzz/fuzzing.h"

#include <atomic>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace ScriptedConnection {

namespace {

std::atomic<const std::string*> playing{nullptr};
/** The server's end of the latest connection; -1 for none. */
std::atomic<int> serverEnd{-1};

void KeepServerEnd(int end) noexcept
{
    const int old = serverEnd.exchange(end);
    if (old >= 0) {
        close(old);
    }
}

/** @return the client's end of a connection over which all is said. */
int Open(const std::string& text)
{
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
        return -1;
    }
    Fuzzing::Require(
        write(ends[1], text.data(), text.size()) == static_cast<ssize_t>(text.size()),
        "the server cannot say all at once");
    shutdown(ends[1], SHUT_WR);
    KeepServerEnd(ends[1]);
    return ends[0];
}

} // namespace

void Play(const std::string* script) noexcept
{
    playing = script;
    if (script == nullptr) {
        KeepServerEnd(-1);
    }
}

} // namespace ScriptedConnection

extern "C" int socket(int domain, int type, int protocol) noexcept
{
    const std::string* const script = ScriptedConnection::playing.load();
    if (script != nullptr && domain == AF_INET && (type & ~SOCK_CLOEXEC) == SOCK_STREAM) {
        return ScriptedConnection::Open(*script);
    }
    return static_cast<int>(syscall(SYS_socket, domain, type, protocol));
}

extern "C" int connect(int descriptor, const sockaddr* address, socklen_t size)
{
    if (ScriptedConnection::playing.load() != nullptr && address->sa_family == AF_INET) {
        return 0; // a pair is connected
    }
    return static_cast<int>(syscall(SYS_connect, descriptor, address, size));
}
