#include "http/ConnectionPoolImpl.h"

#include "http/HttpEngine.h"

#include <new>
#include <utility>

namespace Quillon::Http {

ConnectionPoolImpl::ConnectionPoolImpl(Ref<const ConnectionSpecImpl> spec)
    : _connections(HttpEngine::Get().AddConnections(std::move(spec)))
{}

ConnectionPoolImpl::~ConnectionPoolImpl()
{
    HttpEngine::Get().RetireConnections(_connections);
}

CURLSH* ConnectionPoolImpl::GetShare()
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
    return _connections->share.get();
}

void CreateHttpConnectionPool(ConnectionSpec* spec, Ref<HttpConnectionPool>& out)
{
    if (spec == nullptr) {
        throw InvalidArgumentException("There is no connection spec.");
    }
    out = Ref<HttpConnectionPool>(new ConnectionPoolImpl(
        Ref<const ConnectionSpecImpl>(static_cast<const ConnectionSpecImpl*>(spec))));
}

} // namespace Quillon::Http
