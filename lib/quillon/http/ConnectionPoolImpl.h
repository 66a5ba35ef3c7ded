#pragma once

#include "http/ConnectionSpecImpl.h"
#include "http/Curl.h"

#include "quillon/http/UserAgent.h"

#include <list>

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

    Ref<const ConnectionSpecImpl> spec; // outlives the connections, which point to its `tls`
    ShareOwner share;                   // made with the first exchange
};

class ConnectionPoolImpl final : public HttpConnectionPool
{
public:
    explicit ConnectionPoolImpl(Ref<const ConnectionSpecImpl> spec);
    ~ConnectionPoolImpl() override;

    const ConnectionSpecImpl& GetSpec() const noexcept { return *_connections->spec; }

    /** libcurl's handle of the connections. On the I/O thread. */
    CURLSH* GetShare();

private:
    std::list<Connections>::iterator _connections;
};

} // namespace Quillon::Http
