#pragma once

#include <arpa/inet.h>
#include <filesystem>
#include <netinet/in.h>
#include <stdexcept>
#include <string>
#include <sys/socket.h>

namespace Testing {

/** The descriptor with which this process is connected to a port of the loopback; -1 for none. */
inline int FindClientSocket(int serverPort)
{
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        const int descriptor = std::stoi(entry.path().filename());
        sockaddr_in peer{};
        socklen_t size = sizeof peer;
        if (getpeername(descriptor, reinterpret_cast<sockaddr*>(&peer), &size) == 0
            && peer.sin_family == AF_INET && ntohs(peer.sin_port) == serverPort) {
            return descriptor;
        }
    }
    return -1;
}

/** Whether the system probes the connection while it is idle; of a socket only. */
inline bool IsProbed(int descriptor)
{
    int isProbed = -1;
    socklen_t size = sizeof isProbed;
    if (getsockopt(descriptor, SOL_SOCKET, SO_KEEPALIVE, &isProbed, &size) != 0) {
        throw std::runtime_error("not a socket");
    }
    return isProbed != 0;
}

} // namespace Testing
