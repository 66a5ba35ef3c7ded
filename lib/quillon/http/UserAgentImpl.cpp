#include "http/HttpEngine.h"

#include "quillon/http/UserAgent.h"

#include <utility>

namespace Quillon::Http {

namespace {

class UserAgentImpl final : public UserAgent
{
public:
    UserAgentImpl(Ref<ConnectionPoolImpl> pool, Ref<CookieStoreImpl> cookies)
        : _pool(std::move(pool))
        , _cookies(std::move(cookies))
    {}

    void SendRequestAsync(
        ClientRequest* request,
        const Completion& completion,
        Ref<PendingRequestItem>& pending) override
    {
        HttpEngine& engine = HttpEngine::Get();
        engine.RequireRunning();
        const Ref<Exchange> exchange(new Exchange(completion, _pool->GetSpec().DescribeServer()));
        const Ref<PendingRequestItemImpl> item(new PendingRequestItemImpl(exchange));
        engine.Submit(std::make_unique<Transfer>(
            Ref<ClientRequestImpl>(static_cast<ClientRequestImpl*>(request)),
            _pool,
            _cookies,
            item));
        pending = item;
    }

    void WaitForResponse(
        PendingRequestItem* pending, long long timeout, Ref<ClientResponse>& response) override
    {
        HttpEngine::Get().RequireOwnProcess();
        response = static_cast<PendingRequestItemImpl*>(pending)->GetExchange().Wait(timeout);
    }

private:
    const Ref<ConnectionPoolImpl> _pool;
    const Ref<CookieStoreImpl> _cookies; // may be null
};

} // namespace

void CreateHttpUserAgent(
    ConnectionSpec* spec, CookieStore* cookieStore, HttpConnectionPool* pool, Ref<UserAgent>& out)
{
    Ref<HttpConnectionPool> connections(pool);
    if (pool == nullptr) {
        CreateHttpConnectionPool(spec, connections);
    }
    const Ref<ConnectionPoolImpl> ownPool(static_cast<ConnectionPoolImpl*>(connections.get()));
    if (spec != &ownPool->GetSpec()) {
        throw InvalidArgumentException("The connection pool is for another connection spec.");
    }
    out = Ref<UserAgent>(new UserAgentImpl(
        ownPool, Ref<CookieStoreImpl>(static_cast<CookieStoreImpl*>(cookieStore))));
}

} // namespace Quillon::Http
