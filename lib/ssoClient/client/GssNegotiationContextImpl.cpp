#include "ssoClient/client/GssNegotiationContextImpl.h"

#include "quillon/Exceptions.h"
#include "ssoClient/client/LegDriver.h"
#include "ssoClient/client/grantChecking.h"
#include "ssoClient/client/tokenReading.h"

#include <boost/smart_ptr/make_shared.hpp>

namespace SsoClient::InternalApi {

GssNegotiationContextImpl::GssNegotiationContextImpl(
    const TokenSpec& spec,
    const boost::shared_ptr<const RequestBuilder>& requestBuilder,
    const boost::shared_ptr<TransportSession>& session,
    const boost::shared_ptr<const ResponseHandler>& responseHandler,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
    const boost::optional<ServiceDialect>& dialect,
    const boost::optional<HolderOfKeyConfig>& identity)
    : _spec(spec)
    , _requestBuilder(requestBuilder)
    , _session(session)
    , _responseHandler(responseHandler)
    , _trustedCertificates(trustedCertificates)
    , _dialect(dialect)
    , _identity(identity)
{
    if (_trustedCertificates.empty()) {
        throw Quillon::InvalidArgumentException("No STS trusted certificates provided");
    }
}

NegotiationResult GssNegotiationContextImpl::NegotiateToken(const Leg& leg)
{
    SPNegoResponse response;
    LegDriver(
        *_requestBuilder, *_responseHandler, _trustedCertificates, LegDriver::EmptyLeg::IS_SENT)
        .Exchange(*_session, leg, _spec, _contextId, response);
    _contextId = response.contextId;
    NegotiationResult result;
    result.leg = boost::make_shared<Leg>(response.leg);
    if (!response.token.empty()) {
        result.token = ReadToken(
            response.token, _trustedCertificates, _dialect ? _dialect->reading : boost::none);
        if (_dialect) {
            CheckGrant(*result.token, GrantRequest::ByNegotiation(_spec), *_dialect, _identity);
        }
    }
    return result;
}

} // namespace SsoClient::InternalApi
