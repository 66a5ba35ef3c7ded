#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClient/client/GssNegotiationContextImpl.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
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

/** @param limits  a time-out, or all options of the exchanges. */
template <class Limits>
boost::shared_ptr<HttpsClient> MakeTransport(
    const SecurityTokenServiceConfig& config, const Limits& limits)
{
    return boost::make_shared<HttpsClient>(
        config.url, config.sslContext, config.sslPeerParameter, limits);
}

template <class Limits>
boost::shared_ptr<SecurityTokenService> MakeService(
    const SecurityTokenServiceConfig& config, const Limits& limits)
{
    return boost::make_shared<SecurityTokenServiceImpl>(
        boost::make_shared<RequestBuilderImpl>(config.holderOfKeyConfig),
        MakeTransport(config, limits),
        boost::make_shared<ResponseHandlerImpl>(),
        config.trustedCertificates);
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

boost::shared_ptr<InternalApi::GssNegotiationContext> InternalApi::CreateGssNegotiationContext(
    const SecurityTokenServiceConfig& config, const TokenSpec& spec)
{
    return boost::make_shared<GssNegotiationContextImpl>(
        spec,
        boost::make_shared<RequestBuilderImpl>(config.holderOfKeyConfig),
        MakeTransport(config, ContextTimeoutMicroseconds)->CreateSession(),
        boost::make_shared<ResponseHandlerImpl>(),
        config.trustedCertificates);
}

} // namespace SsoClient
