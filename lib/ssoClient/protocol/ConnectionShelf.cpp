#include "ssoClient/protocol/ConnectionShelf.h"

#include <new>
#include <utility>

namespace SsoClient {

using Quillon::Http::HttpConnectionPool;

ConnectionShelf::ConnectionShelf(
    Quillon::Ref<Quillon::Http::ConnectionSpec> spec, const ConnectionReuse& reuse)
    : _spec(std::move(spec))
    , _reuse(reuse)
{}

Quillon::Ref<HttpConnectionPool> ConnectionShelf::Take()
{
    Quillon::Ref<HttpConnectionPool> connection;
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        if (!_idle.empty()) {
            connection = std::move(_idle.back());
            _idle.pop_back();
            return connection;
        }
    }
    Quillon::Http::CreateHttpConnectionPool(_spec.get(), _reuse.idleMicroseconds, connection);
    return connection;
}

void ConnectionShelf::PutBack(const Quillon::Ref<HttpConnectionPool>& connection) noexcept
{
    try {
        const std::lock_guard<std::mutex> lock(_mutex);
        if (_idle.size() < _reuse.mostIdle) {
            _idle.push_back(connection);
        }
    } catch (const std::bad_alloc&) { // NOLINT(bugprone-empty-catch): the next one is a new one
    }
}

} // namespace SsoClient
