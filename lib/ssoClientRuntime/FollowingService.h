#pragma once

#include "ssoClient/SecurityTokenService.h"
#include "ssoClientRuntime/TrustStore.h"

#include <mutex>

namespace SsoClient {

/** Has each operation done by a service that trusts what a store has when it begins. */
class FollowingService final : public SecurityTokenService
{
public:
    /** @throws Quillon::InvalidArgumentException  see `FollowTrust`. */
    FollowingService(
        const boost::shared_ptr<const SecurityTokenService>& service,
        const boost::shared_ptr<const TrustStore>& trust);

    boost::shared_ptr<const SamlToken> AcquireToken(
        const std::string& userName,
        const std::string& password,
        const TokenSpec& spec) const override;
    boost::shared_ptr<const SamlToken> AcquireTokenByGSS(
        const TokenSpec& spec, NegotiationHandler& handler) const override;
    boost::shared_ptr<const SamlToken> AcquireTokenByCertificate(
        const TokenSpec& spec) const override;
    boost::shared_ptr<const SamlToken> AcquireTokenByToken(
        const SamlToken& token, const TokenSpec& spec) const override;
    bool ValidateSubject(const SamlToken& token) const override;
    boost::shared_ptr<const SamlToken> RenewToken(
        const SamlToken& token, long long lifetimeSec) const override;

    void AcquireTokenAsync(
        const std::string& userName,
        const std::string& password,
        const TokenSpec& spec,
        const TokenCompletion& completion) const override;
    void AcquireTokenByGssAsync(
        const TokenSpec& spec,
        const boost::shared_ptr<NegotiationHandler>& handler,
        const TokenCompletion& completion) const override;
    void AcquireTokenByCertificateAsync(
        const TokenSpec& spec, const TokenCompletion& completion) const override;
    void AcquireTokenByTokenAsync(
        const boost::shared_ptr<const SamlToken>& token,
        const TokenSpec& spec,
        const TokenCompletion& completion) const override;
    void ValidateSubjectAsync(
        const boost::shared_ptr<const SamlToken>& token,
        const ValidationCompletion& completion) const override;
    void RenewTokenAsync(
        const boost::shared_ptr<const SamlToken>& token,
        long long lifetimeSec,
        const TokenCompletion& completion) const override;

private:
    boost::shared_ptr<const SecurityTokenService> Get() const;

    const boost::shared_ptr<const SecurityTokenService> _service;
    const boost::shared_ptr<const TrustStore> _trust;

    mutable std::mutex _mutex; // guards the following
    mutable boost::shared_ptr<const TrustStore::Certificates> _certificates;
    mutable boost::shared_ptr<const SecurityTokenService> _current; // which trusts these
};

} // namespace SsoClient
