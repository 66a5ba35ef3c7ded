#pragma once

#include "devsts/http/Server.h"
#include "devsts/misbehaviour/Misbehaviour.h"

#include <memory>
#include <string>

namespace DevSts {

/**
 * A server on a port of this machine that does one thing wrong, on every connection. What it does
 * right it does as the development STS, with the same files, but for negotiations, which it
 * refuses.
 *
 * Thread safety: that of `Server`.
 */
class MisbehavingServer
{
public:
    /** @throws std::runtime_error  the state directory cannot be used. */
    MisbehavingServer(const Options& options, const Misbehaviour& misbehaviour);

    /** Stops. */
    ~MisbehavingServer();

    MisbehavingServer(const MisbehavingServer&) = delete;
    MisbehavingServer& operator=(const MisbehavingServer&) = delete;

    /**
     * Serves from now on, on threads of its own.
     *
     * @return the port. @throws std::runtime_error  the address cannot be bound.
     */
    int Start();

    /** Cuts what is under way. */
    void Stop();

    /** Where requests go; known once started. */
    std::string Url() const;

    /** Returns when a connection has said all that does not wait for its client. */
    void AwaitQuiet();

private:
    class Impl;
    std::unique_ptr<Impl> _impl;
};

} // namespace DevSts
