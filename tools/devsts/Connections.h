#ifndef DEVSTS_CONNECTIONS_H
#define DEVSTS_CONNECTIONS_H

#include <sys/socket.h>

namespace DevSts {

/** The end of an IP socket on this machine. */
class LocalAddress
{
public:
    /** Covers nothing. */
    LocalAddress() = default;

    /** What is no IP socket has an address that covers nothing. */
    explicit LocalAddress(int socket);

    /** Tells whether a connection with that address came in at this one. */
    bool Covers(const LocalAddress& other) const;

private:
    sockaddr_storage _address{};
};

/**
 * Lets every connection of this process that came in at `listener` read its end from now on, as
 * if its peer had nothing more to say; answers can still be written.
 *
 * The HTTP library waits for idle connections until their time is up, and does not tell their
 * sockets: they are found among the open files of the process.
 */
void EndReading(const LocalAddress& listener);

} // namespace DevSts

#endif
