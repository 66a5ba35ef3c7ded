#pragma once

#include "quillon/http/ConnectionSpec.h"
#include "quillon/http/UserAgent.h"
#include "ssoClient/ConnectionReuse.h"

#include <mutex>
#include <vector>

namespace SsoClient {

/**
 * Connections of one transport that wait for their next session. A pool of Quillon's stands for
 * each of them: so that it can be taken by one session at a time, and closes itself when it is idle
 * for too long.
 *
 * Thread safety: any thread.
 */
class ConnectionShelf
{
public:
    ConnectionShelf(Quillon::Ref<Quillon::Http::ConnectionSpec> spec, const ConnectionReuse& reuse);

    /** The connection that was put back last, which is the likeliest to be open; or a new one. */
    Quillon::Ref<Quillon::Http::HttpConnectionPool> Take();

    /** Keeps a connection, or closes it if there are enough. */
    void PutBack(const Quillon::Ref<Quillon::Http::HttpConnectionPool>& connection) noexcept;

private:
    const Quillon::Ref<Quillon::Http::ConnectionSpec> _spec;
    const ConnectionReuse _reuse;
    std::mutex _mutex;
    std::vector<Quillon::Ref<Quillon::Http::HttpConnectionPool>> _idle;
};

} // namespace SsoClient
