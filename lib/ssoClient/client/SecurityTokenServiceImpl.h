#pragma once

#include "ssoClient/SecurityTokenService.h"
#include "ssoClient/client/grantChecking.h"
#include "ssoClient/client/operation.h"
#include "ssoClient/protocol/RequestBuilder.h"
#include "ssoClient/protocol/ResponseHandler.h"
#include "ssoClient/protocol/Transport.h"

#include <list>

namespace SsoClient {

/**
 * Says of each operation what is its own: its line in the log, what it asks for, what it reads. The
 * road that all of them go is in operation.h, the one of a negotiation in negotiation.h.
 */
class SecurityTokenServiceImpl final : public SecurityTokenService
{
public:
    SecurityTokenServiceImpl(
        const boost::shared_ptr<const RequestBuilder>& requestBuilder,
        const boost::shared_ptr<const Transport>& transport,
        const boost::shared_ptr<const ResponseHandler>& responseHandler,
        const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
        const boost::optional<ServiceDialect>& dialect = boost::none,
        const boost::optional<HolderOfKeyConfig>& identity = boost::none);

    /** A service that shares everything with this one but what is said of its calls. */
    boost::shared_ptr<SecurityTokenService> UnderControl(const CallControl& control) const;

    /** The same but for whose tokens it takes. */
    boost::shared_ptr<SecurityTokenService> Trusting(
        const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& certificates) const;

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
    /**
     * Runs an operation whose reply has a token, the text of which `read` stores.
     *
     * @param asked  what that token is to be like.
     */
    template <class Describe, class Build, class Read>
    boost::shared_ptr<const SamlToken> RunForToken(
        const char* operationName,
        const GrantRequest& asked,
        const Describe& describe,
        const Build& build,
        const Read& read) const;

    /** What an asynchronous operation works with: the caller's object may go meanwhile. */
    boost::shared_ptr<const SecurityTokenService> Copy() const;

    Road GetRoad() const noexcept;

    /** Queues a blocking operation, so that it can be called off if it is under control. */
    template <class Call, class... Rest>
    void Queue(const Call& call, const Rest&... rest) const;

    /** @return the verified token; null for an empty text. */
    boost::shared_ptr<const SamlToken> ToSamlToken(
        const std::string& tokenXml, const GrantRequest& asked) const;

    boost::shared_ptr<const RequestBuilder> _requestBuilder;
    boost::shared_ptr<const Transport> _transport;
    boost::shared_ptr<const ResponseHandler> _responseHandler;
    std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> _trustedCertificates;
    boost::optional<ServiceDialect> _dialect;
    boost::optional<HolderOfKeyConfig> _identity;
    boost::shared_ptr<const CallControl> _control; // null without options
};

/** @throws Quillon::InvalidArgumentException  it is null, or somebody else made it. */
const SecurityTokenServiceImpl& RequireOwn(
    const boost::shared_ptr<const SecurityTokenService>& service);

} // namespace SsoClient
