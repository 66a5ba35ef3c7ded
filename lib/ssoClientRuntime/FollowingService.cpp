#include "ssoClientRuntime/FollowingService.h"

#include "quillon/Exceptions.h"

#include <boost/smart_ptr/make_shared.hpp>

namespace SsoClient {

FollowingService::FollowingService(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const boost::shared_ptr<const TrustStore>& trust)
    : _service(service)
    , _trust(trust)
{
    if (_trust == nullptr) {
        throw Quillon::InvalidArgumentException("There is no store of trusted certificates.");
    }
    Get(); // a service that cannot be followed is known now
}

/** Whoever has it keeps it: what is under way is not touched by a change. */
boost::shared_ptr<const SecurityTokenService> FollowingService::Get() const
{
    const auto certificates = _trust->Get();
    const std::lock_guard<std::mutex> lock(_mutex);
    if (certificates != _certificates) {
        _current = WithTrustedCertificates(_service, *certificates);
        _certificates = certificates;
    }
    return _current;
}

boost::shared_ptr<const SamlToken> FollowingService::AcquireToken(
    const std::string& userName, const std::string& password, const TokenSpec& spec) const
{
    return Get()->AcquireToken(userName, password, spec);
}

boost::shared_ptr<const SamlToken> FollowingService::AcquireTokenByGSS(
    const TokenSpec& spec, NegotiationHandler& handler) const
{
    return Get()->AcquireTokenByGSS(spec, handler);
}

boost::shared_ptr<const SamlToken> FollowingService::AcquireTokenByCertificate(
    const TokenSpec& spec) const
{
    return Get()->AcquireTokenByCertificate(spec);
}

boost::shared_ptr<const SamlToken> FollowingService::AcquireTokenByToken(
    const SamlToken& token, const TokenSpec& spec) const
{
    return Get()->AcquireTokenByToken(token, spec);
}

bool FollowingService::ValidateSubject(const SamlToken& token) const
{
    return Get()->ValidateSubject(token);
}

boost::shared_ptr<const SamlToken> FollowingService::RenewToken(
    const SamlToken& token, long long lifetimeSec) const
{
    return Get()->RenewToken(token, lifetimeSec);
}

void FollowingService::AcquireTokenAsync(
    const std::string& userName,
    const std::string& password,
    const TokenSpec& spec,
    const TokenCompletion& completion) const
{
    Get()->AcquireTokenAsync(userName, password, spec, completion);
}

void FollowingService::AcquireTokenByGssAsync(
    const TokenSpec& spec,
    const boost::shared_ptr<NegotiationHandler>& handler,
    const TokenCompletion& completion) const
{
    Get()->AcquireTokenByGssAsync(spec, handler, completion);
}

void FollowingService::AcquireTokenByCertificateAsync(
    const TokenSpec& spec, const TokenCompletion& completion) const
{
    Get()->AcquireTokenByCertificateAsync(spec, completion);
}

void FollowingService::AcquireTokenByTokenAsync(
    const boost::shared_ptr<const SamlToken>& token,
    const TokenSpec& spec,
    const TokenCompletion& completion) const
{
    Get()->AcquireTokenByTokenAsync(token, spec, completion);
}

void FollowingService::ValidateSubjectAsync(
    const boost::shared_ptr<const SamlToken>& token, const ValidationCompletion& completion) const
{
    Get()->ValidateSubjectAsync(token, completion);
}

void FollowingService::RenewTokenAsync(
    const boost::shared_ptr<const SamlToken>& token,
    long long lifetimeSec,
    const TokenCompletion& completion) const
{
    Get()->RenewTokenAsync(token, lifetimeSec, completion);
}

boost::shared_ptr<SecurityTokenService> FollowTrust(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const boost::shared_ptr<const TrustStore>& trust)
{
    return boost::make_shared<FollowingService>(service, trust);
}

} // namespace SsoClient
