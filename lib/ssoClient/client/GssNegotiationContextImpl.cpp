#include "ssoClient/client/GssNegotiationContextImpl.h"

#include "quillon/Exceptions.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/protocol/HttpsClient.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"

#include <boost/smart_ptr/make_shared.hpp>

namespace SsoClient::InternalApi {

namespace {

// Shorter than a service object's: somebody waits at the other end for the next leg.
constexpr long long SendTimeoutMicroseconds = 40'000'000;

} // namespace

GssNegotiationContextImpl::GssNegotiationContextImpl(
    const TokenSpec& spec,
    const boost::shared_ptr<const RequestBuilder>& requestBuilder,
    const boost::shared_ptr<TransportSession>& session,
    const boost::shared_ptr<const ResponseHandler>& responseHandler,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates)
    : _spec(spec)
    , _requestBuilder(requestBuilder)
    , _session(session)
    , _responseHandler(responseHandler)
    , _trustedCertificates(trustedCertificates)
{
    if (_trustedCertificates.empty()) {
        throw Quillon::InvalidArgumentException("No STS trusted certificates provided");
    }
}

NegotiationResult GssNegotiationContextImpl::NegotiateToken(const Leg& leg)
{
    const Quillon::Ref<Quillon::Reader> reply = Send(leg);
    SPNegoResponse response;
    _responseHandler->HandleSPNegoResponse(reply.get(), response);
    _contextId = response.contextId;
    NegotiationResult result;
    result.leg = boost::make_shared<Leg>(response.leg);
    if (!response.token.empty()) {
        result.token = CreateSamlToken(response.token, _trustedCertificates);
    }
    return result;
}

Quillon::Ref<Quillon::Reader> GssNegotiationContextImpl::Send(const Leg& leg)
{
    Request request;
    if (_contextId.empty()) {
        _requestBuilder->BuildInitialSPNegoRequest(_spec, leg, request);
    } else {
        _requestBuilder->BuildContinuedSPNegoRequest(_contextId, leg, request);
    }
    Quillon::Ref<Quillon::Reader> reply;
    _session->SendRequest(request, reply);
    return reply;
}

boost::shared_ptr<GssNegotiationContext> CreateGssNegotiationContext(
    const SecurityTokenServiceConfig& config, const TokenSpec& spec)
{
    return boost::make_shared<GssNegotiationContextImpl>(
        spec,
        boost::make_shared<RequestBuilderImpl>(config.holderOfKeyConfig),
        HttpsClient(config.url, config.sslContext, config.sslPeerParameter, SendTimeoutMicroseconds)
            .CreateSession(),
        boost::make_shared<ResponseHandlerImpl>(),
        config.trustedCertificates);
}

} // namespace SsoClient::InternalApi
