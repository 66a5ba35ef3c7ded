#include "ssoClientRuntime/TokenSource.h"
#include "ssoClientRuntime/TokenSourceImpl.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <utility>

namespace SsoClient {

namespace {

using Quillon::InvalidArgumentException;
using Service = boost::shared_ptr<const SecurityTokenService>;
using Token = boost::shared_ptr<const SamlToken>;

void Require(bool condition, const char* text)
{
    if (!condition) {
        throw InvalidArgumentException(text);
    }
}

void CheckOptions(const TokenSourceOptions& options)
{
    const std::chrono::milliseconds none(0);
    Require(
        options.refreshAt > 0 && options.jitter >= 0
            && options.refreshAt * (1 + options.jitter) < 1,
        "a token must be refreshed after it has come and before it ends");
    Require(options.minRemainingValidity >= none, "the remaining validity asked for is negative");
    Require(
        options.minWait > none && options.minWait <= options.maxWait,
        "the shortest wait is not positive, or longer than the longest");
    Require(options.refusedWait > none, "the wait after a refusal is not positive");
    Require(options.patience >= none, "the patience is negative");
}

boost::shared_ptr<TokenSource> Create(TokenWays ways, const TokenSourceOptions& options)
{
    CheckOptions(options);
    return boost::make_shared<TokenSourceImpl>(std::move(ways), options);
}

boost::shared_ptr<TokenSource> CreateForService(
    const Service& service,
    TokenFunction acquire,
    const TokenSpec& spec,
    const TokenSourceOptions& options)
{
    const auto renew = [service, lifetimeSec = spec.tokenLifetimeSec](const SamlToken& token) {
        return service->RenewToken(token, lifetimeSec);
    };
    return Create({std::move(acquire), renew}, options);
}

void RequireService(const Service& service)
{
    Require(service != nullptr, "there is no token service");
}

/** What the service does not take for credentials, the source need not hand out any more. */
Token Exchange(const SecurityTokenService& service, TokenSource& presented, const TokenSpec& spec)
{
    const Token token = presented.GetToken();
    try {
        return service.AcquireTokenByToken(*token, spec);
    } catch (const InvalidCredentialsException&) {
        presented.Invalidate(token->GetId());
        throw;
    }
}

} // namespace

boost::shared_ptr<TokenSource> CreatePasswordTokenSource(
    const Service& service,
    const PasswordProvider& provider,
    const TokenSpec& spec,
    const TokenSourceOptions& options)
{
    RequireService(service);
    Require(provider != nullptr, "there is no provider of passwords");
    const auto acquire = [service, provider, spec] {
        const PasswordCredentials credentials = provider();
        return service->AcquireToken(credentials.userName, credentials.password, spec);
    };
    return CreateForService(service, acquire, spec, options);
}

boost::shared_ptr<TokenSource> CreateCertificateTokenSource(
    const Service& service, const TokenSpec& spec, const TokenSourceOptions& options)
{
    RequireService(service);
    const auto acquire = [service, spec] { return service->AcquireTokenByCertificate(spec); };
    return CreateForService(service, acquire, spec, options);
}

boost::shared_ptr<TokenSource> CreateNegotiationTokenSource(
    const Service& service,
    const NegotiationHandlerFactory& factory,
    const TokenSpec& spec,
    const TokenSourceOptions& options)
{
    RequireService(service);
    Require(factory != nullptr, "there is no factory of negotiation handlers");
    const auto acquire = [service, factory, spec] {
        const boost::shared_ptr<NegotiationHandler> handler = factory();
        Require(handler != nullptr, "the factory of negotiation handlers made none");
        return service->AcquireTokenByGSS(spec, *handler);
    };
    return CreateForService(service, acquire, spec, options);
}

boost::shared_ptr<TokenSource> CreateExchangeTokenSource(
    const Service& service,
    const boost::shared_ptr<TokenSource>& presented,
    const TokenSpec& spec,
    const TokenSourceOptions& options)
{
    RequireService(service);
    Require(presented != nullptr, "there is no source of the token to exchange");
    const auto acquire = [service, presented, spec] {
        return Exchange(*service, *presented, spec);
    };
    return CreateForService(service, acquire, spec, options);
}

boost::shared_ptr<TokenSource> CreateTokenSource(
    const TokenFunction& acquire, const TokenSourceOptions& options)
{
    Require(acquire != nullptr, "there is no function that gets a token");
    return Create({acquire, nullptr}, options);
}

} // namespace SsoClient
