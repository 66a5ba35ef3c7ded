#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClient/client/GssNegotiationContextImpl.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
#include "ssoClient/client/trustedCertificates.h"
#include "ssoClient/protocol/HttpsClient.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"

#include <boost/smart_ptr/make_shared.hpp>

namespace SsoClient {

namespace {

constexpr long long ServiceTimeoutMicroseconds = 240'000'000;

// Shorter than a service object's: somebody waits at the other end for the next leg.
constexpr long long ContextTimeoutMicroseconds = 40'000'000;

void RequirePositive(long long timeoutMicroseconds)
{
    if (timeoutMicroseconds <= 0) {
        throw Quillon::InvalidArgumentException(
            "The time-out of " + std::to_string(timeoutMicroseconds)
            + " microseconds is not positive.");
    }
}

ServiceDialect GetDialect(const SecurityTokenServiceConfig& config)
{
    return config.dialect ? *config.dialect : ServiceDialect();
}

/** @param limits  a time-out, or all options of the exchanges. */
template <class Limits>
boost::shared_ptr<HttpsClient> MakeTransport(
    const SecurityTokenServiceConfig& config, const Limits& limits)
{
    return boost::make_shared<HttpsClient>(
        config.url, config.sslContext, config.sslPeerParameter, limits);
}

boost::shared_ptr<RequestBuilderImpl> MakeRequestBuilder(const SecurityTokenServiceConfig& config)
{
    RequestForm form;
    if (config.dialect) {
        form = {*config.dialect, config.url, config.credentials};
    }
    return boost::make_shared<RequestBuilderImpl>(config.holderOfKeyConfig, form);
}

boost::shared_ptr<ResponseHandlerImpl> MakeResponseHandler(const SecurityTokenServiceConfig& config)
{
    return boost::make_shared<ResponseHandlerImpl>(
        ReplyForm{GetDialect(config), config.faultObserver});
}

template <class Limits>
boost::shared_ptr<SecurityTokenService> MakeService(
    const SecurityTokenServiceConfig& config, const Limits& limits)
{
    return boost::make_shared<SecurityTokenServiceImpl>(
        MakeRequestBuilder(config),
        MakeTransport(config, limits),
        MakeResponseHandler(config),
        config.trustedCertificates,
        config.dialect,
        config.holderOfKeyConfig);
}

} // namespace

boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(
    const SecurityTokenServiceConfig& config)
{
    return MakeService(config, ServiceTimeoutMicroseconds);
}

boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(
    const SecurityTokenServiceConfig& config, const ExchangeOptions& options)
{
    RequirePositive(options.timeoutMicroseconds);
    RequirePositive(options.connectTimeoutMicroseconds);
    return MakeService(config, options);
}

boost::shared_ptr<SecurityTokenService> WithTrustedCertificates(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& certificates)
{
    const SecurityTokenServiceImpl& own = RequireOwn(service);
    RefuseNullCertificate(certificates);
    return own.Trusting(certificates);
}

boost::shared_ptr<InternalApi::GssNegotiationContext> InternalApi::CreateGssNegotiationContext(
    const SecurityTokenServiceConfig& config, const TokenSpec& spec)
{
    return boost::make_shared<GssNegotiationContextImpl>(
        spec,
        MakeRequestBuilder(config),
        MakeTransport(config, ContextTimeoutMicroseconds)->CreateSession(),
        MakeResponseHandler(config),
        config.trustedCertificates,
        config.dialect,
        config.holderOfKeyConfig);
}

} // namespace SsoClient
