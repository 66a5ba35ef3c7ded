#pragma once

#include <set>
#include <sys/socket.h>

namespace DevSts {

/** One end of an IP socket. */
class IpAddress
{
public:
    /** Covers nothing. */
    IpAddress() = default;

    /** The end of `socket` here. What is no IP socket has an address that covers nothing. */
    static IpAddress Local(int socket);

    /** The other end. */
    static IpAddress Peer(int socket);

    /** Tells whether a connection with that address here came in at this one. */
    bool Covers(const IpAddress& other) const;

    /** 0 if there is none. */
    int Port() const;

private:
    sockaddr_storage _address{};
};

/**
 * Lets the connections of this process that came in at `listener` read their end from now on, as
 * if their peers had nothing more to say, except those from one of the ports `busy`.
 *
 * The HTTP library waits for idle connections until their time is up, and does not tell their
 * sockets: they are found among the open files of the process. It also writes no answer to a
 * connection that has been ended so.
 */
void EndReading(const IpAddress& listener, const std::set<int>& busy);

} // namespace DevSts
