#pragma once

#include "http/ConnectionSpecImpl.h"
#include "http/Curl.h"
#include "http/OpenSockets.h"

#include "quillon/http/UserAgent.h"

#include <chrono>
#include <list>
#include <optional>

namespace Quillon::Http {

/**
 * A set of open connections, as the I/O thread has it. It lives in a list of the engine, because
 * closing connections is for the I/O thread, whoever lets the pool go.
 */
struct Connections
{
    explicit Connections(Ref<const ConnectionSpecImpl> connectionSpec)
        : spec(std::move(connectionSpec))
    {}

    using Clock = std::chrono::steady_clock;

    Ref<const ConnectionSpecImpl> spec; // outlives the connections, which point to its `tls`
    OpenSockets sockets;                // outlive the connections, which are closed through them
    ShareOwner share;                   // made with the first exchange

    std::optional<std::chrono::microseconds> idleLimit; // none: they stay as long as the pool
    unsigned transfers = 0;                             // under way
    Clock::time_point idleSince;                        // if there are none
};

class ConnectionPoolImpl final : public HttpConnectionPool
{
public:
    explicit ConnectionPoolImpl(
        Ref<const ConnectionSpecImpl> spec,
        std::optional<std::chrono::microseconds> idleLimit = std::nullopt);
    ~ConnectionPoolImpl() override;

    const ConnectionSpecImpl& GetSpec() const noexcept { return *_connections->spec; }

    /** On the I/O thread. */
    OpenSockets& GetSockets() const noexcept { return _connections->sockets; }

    /** libcurl's handle of the connections, for a transfer that begins. On the I/O thread. */
    CURLSH* Use();

    /** To be called when that transfer has ended. On the I/O thread. */
    void Leave() noexcept;

private:
    std::list<Connections>::iterator _connections;
};

} // namespace Quillon::Http
