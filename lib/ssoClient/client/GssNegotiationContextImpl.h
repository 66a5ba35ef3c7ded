#pragma once

#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/HolderOfKeyConfig.h"
#include "ssoClient/ServiceDialect.h"
#include "ssoClient/protocol/RequestBuilder.h"
#include "ssoClient/protocol/ResponseHandler.h"
#include "ssoClient/protocol/Transport.h"

#include <list>
#include <string>

namespace SsoClient::InternalApi {

class GssNegotiationContextImpl final : public virtual GssNegotiationContext
{
public:
    /** @throws Quillon::InvalidArgumentException  there is no trusted certificate. */
    GssNegotiationContextImpl(
        const TokenSpec& spec,
        const boost::shared_ptr<const RequestBuilder>& requestBuilder,
        const boost::shared_ptr<TransportSession>& session,
        const boost::shared_ptr<const ResponseHandler>& responseHandler,
        const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
        const boost::optional<ServiceDialect>& dialect = boost::none,
        const boost::optional<HolderOfKeyConfig>& identity = boost::none);

    NegotiationResult NegotiateToken(const Leg& leg) override;

private:
    TokenSpec _spec;
    std::string _contextId; // of the last reply; empty before the first
    boost::shared_ptr<const RequestBuilder> _requestBuilder;
    boost::shared_ptr<TransportSession> _session;
    boost::shared_ptr<const ResponseHandler> _responseHandler;
    std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> _trustedCertificates;
    boost::optional<ServiceDialect> _dialect;
    boost::optional<HolderOfKeyConfig> _identity;
};

} // namespace SsoClient::InternalApi
