#include "http/ConnectionPoolImpl.h"

#include "http/HttpEngine.h"

#include <algorithm>
#include <new>
#include <utility>

namespace Quillon::Http {

ConnectionPoolImpl::ConnectionPoolImpl(
    Ref<const ConnectionSpecImpl> spec, std::optional<std::chrono::microseconds> idleLimit)
    : _connections(HttpEngine::Get().AddConnections(std::move(spec), idleLimit))
{}

ConnectionPoolImpl::~ConnectionPoolImpl()
{
    HttpEngine::Get().RetireConnections(_connections);
}

CURLSH* ConnectionPoolImpl::Use()
{
    if (_connections->share == nullptr) {
        ShareOwner share(curl_share_init());
        if (share == nullptr
            || curl_share_setopt(share.get(), CURLSHOPT_SHARE, CURL_LOCK_DATA_CONNECT)
                   != CURLSHE_OK) {
            throw std::bad_alloc();
        }
        _connections->share = std::move(share);
    }
    ++_connections->transfers;
    return _connections->share.get();
}

void ConnectionPoolImpl::Leave() noexcept
{
    --_connections->transfers;
    _connections->idleSince = Connections::Clock::now();
}

namespace {

/** Longer than any process lives; the clock's unit is finer than this one's. */
constexpr long long LongestIdleLimit = 1'000'000'000'000'000;

Ref<const ConnectionSpecImpl> RequireSpec(ConnectionSpec* spec)
{
    if (spec == nullptr) {
        throw InvalidArgumentException("There is no connection spec.");
    }
    return Ref<const ConnectionSpecImpl>(static_cast<const ConnectionSpecImpl*>(spec));
}

} // namespace

void CreateHttpConnectionPool(ConnectionSpec* spec, Ref<HttpConnectionPool>& out)
{
    out = Ref<HttpConnectionPool>(new ConnectionPoolImpl(RequireSpec(spec)));
}

void CreateHttpConnectionPool(
    ConnectionSpec* spec, long long idleLimit, Ref<HttpConnectionPool>& out)
{
    if (idleLimit <= 0) {
        throw InvalidArgumentException(
            "The idle limit of " + std::to_string(idleLimit) + " microseconds is not positive.");
    }
    const std::chrono::microseconds limit(std::min(idleLimit, LongestIdleLimit));
    out = Ref<HttpConnectionPool>(new ConnectionPoolImpl(RequireSpec(spec), limit));
}

} // namespace Quillon::Http
