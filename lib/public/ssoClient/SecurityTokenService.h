#pragma once

#include "quillon/Exceptions.h"
#include "ssoClient/ExchangeOptions.h"
#include "ssoClient/NegotiationHandler.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/SecurityTokenServiceConfig.h"
#include "ssoClient/TokenSpec.h"

#include <boost/function.hpp>
#include <boost/optional.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>

namespace SsoClient {

/**
 * Told how an asynchronous operation ended: what the blocking one returns and no exception, or
 * nothing and the exception. The pointer is valid during the call only; `Clone` keeps the
 * exception, and `Throw` raises it again as what it is.
 */
using TokenCompletion =
    boost::function<void(const boost::shared_ptr<const SamlToken>&, const Quillon::Exception*)>;
using ValidationCompletion =
    boost::function<void(const boost::optional<bool>&, const Quillon::Exception*)>;

/**
 * Obtains, renews and validates tokens at a WS-Trust 1.3 security token service, or at another one
 * in the dialect of the configuration. Every operation
 * has a blocking and an asynchronous form.
 *
 * No operation retries. Each may throw:
 * - `Quillon::InvalidArgumentException`, before anything is sent, for a bad argument, or if a
 *   trusted certificate is null and the operation gives a token;
 * - `Quillon::InvalidStateException`, before anything is sent, if it needs the holder-of-key
 *   identity and the configuration has none or half of one;
 * - `CommunicationException` if the service answers outside the protocol, for example with another
 *   status;
 * - `Quillon::Http::HttpException`, which is no `SsoException`, if the exchange fails: no
 * connection, not the right server, no complete reply in time. It takes two clauses to catch what a
 * service can do: `catch (const SsoException&)` and `catch (const Quillon::Http::HttpException&)`;
 * - `InvalidCredentialsException` if the service rejects the credentials;
 * - `InvalidSignatureException` if the token it sends does not verify;
 * - `SsoException` for any other fault or an answer that cannot be used; as a `ParseException` if
 *   the code of a fault has a prefix that nothing declares. With a dialect, also for a token that
 *   is not the one that was asked for (see `GrantCheck`).
 * An answer that is malformed in a particular place ends with the exception of that place:
 * - `Quillon::Xml::XMLParseException` if the token in it cannot be parsed by itself;
 * - `Quillon::Xml::Security::XmlSecurityException` if it has no canonical form;
 * - `Quillon::Base64FormatException` or `Quillon::Crypto::CryptoException` if the certificate in
 *   it cannot be decoded; the latter also if the caller's own key cannot sign;
 * - `Quillon::TypeMismatchException` if the status of a validation is not text.
 *
 * An asynchronous form returns at once, and runs the blocking operation on
 * `Quillon::System::GetThreadPool()`. Its arguments are copied or, if they are pointers, kept, so
 * that the caller may let go of everything, this object included. A null pointer stops the process
 * before anything is queued. The completion is called exactly once, on a thread of the pool; it is
 * not called for an exception that is no `Quillon::Exception`, such as `std::bad_alloc`, nor if the
 * process ends first. What the completion throws is logged. On the calling thread there is only
 * what the pool throws when it takes no work.
 *
 * A child that was forked after the process had its first exchange or another thread cannot use
 * any form: fork first. What sends then throws a `Quillon::Http::HttpException` at once.
 *
 * There is no virtual destructor: a service is only owned by the pointer of its factory.
 *
 * Thread safety: immutable; any number of threads.
 */
class SSOCLIENT_API SecurityTokenService
{
public:
    /**
     * Acquires a token with a user name and a password (WS-Security UsernameToken Profile 1.0).
     *
     * @return the verified token; null if the service answered with an empty assertion.
     */
    virtual boost::shared_ptr<const SamlToken> AcquireToken(
        const std::string& userName, const std::string& password, const TokenSpec& spec) const = 0;

    /**
     * Acquires a token by a SPNEGO negotiation. All legs go over one connection, with the cookies
     * that the service sets.
     *
     * @param handler  makes the caller's legs, on the calling thread; used by this call alone.
     *                 What it throws leaves the operation unchanged.
     * @return as `AcquireToken`.
     *
     * @throws Quillon::InvalidArgumentException  also if the handler returns null. An empty leg
     *                                            before the token has arrived stops the process.
     */
    virtual boost::shared_ptr<const SamlToken> AcquireTokenByGSS(
        const TokenSpec& spec, NegotiationHandler& handler) const = 0;

    /**
     * Acquires a holder-of-key token with the caller's own key and certificate. The confirmation
     * asked for must be the default.
     *
     * @return as `AcquireToken`.
     */
    virtual boost::shared_ptr<const SamlToken> AcquireTokenByCertificate(
        const TokenSpec& spec) const = 0;

    /**
     * Acquires a token by presenting `token`, for delegation or with other properties. The
     * request is signed with the caller's own key, unless a dialect with the token in the body has
     * the configuration's user name and password say who asks.
     *
     * @return as `AcquireToken`.
     */
    virtual boost::shared_ptr<const SamlToken> AcquireTokenByToken(
        const SamlToken& token, const TokenSpec& spec) const = 0;

    /** Asks the service whether the subject of `token` is still valid. */
    virtual bool ValidateSubject(const SamlToken& token) const = 0;

    /**
     * Renews a holder-of-key token. The request is signed with the caller's own key.
     *
     * @param lifetimeSec  of the new token, from now; must be positive.
     * @return as `AcquireToken`.
     */
    virtual boost::shared_ptr<const SamlToken> RenewToken(
        const SamlToken& token, long long lifetimeSec) const = 0;

    virtual void AcquireTokenAsync(
        const std::string& userName,
        const std::string& password,
        const TokenSpec& spec,
        const TokenCompletion& completion) const = 0;

    /** The handler is called on a thread of the pool. */
    virtual void AcquireTokenByGssAsync(
        const TokenSpec& spec,
        const boost::shared_ptr<NegotiationHandler>& handler,
        const TokenCompletion& completion) const = 0;

    virtual void AcquireTokenByCertificateAsync(
        const TokenSpec& spec, const TokenCompletion& completion) const = 0;

    virtual void AcquireTokenByTokenAsync(
        const boost::shared_ptr<const SamlToken>& token,
        const TokenSpec& spec,
        const TokenCompletion& completion) const = 0;

    virtual void ValidateSubjectAsync(
        const boost::shared_ptr<const SamlToken>& token,
        const ValidationCompletion& completion) const = 0;

    virtual void RenewTokenAsync(
        const boost::shared_ptr<const SamlToken>& token,
        long long lifetimeSec,
        const TokenCompletion& completion) const = 0;

protected:
    ~SecurityTokenService() = default;
};

/**
 * Creates the service object. `config` may go afterwards, except its SSL context.
 *
 * @throws Quillon::InvalidArgumentException  the URL is malformed, or it is an HTTPS URL and there
 *                                            is no SSL context.
 */
SSOCLIENT_API boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(
    const SecurityTokenServiceConfig& config);

/**
 * The same with time-outs of the caller's own, and an observer of the exchanges.
 *
 * @throws Quillon::InvalidArgumentException  as above, or a time-out is not positive.
 */
SSOCLIENT_API boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(
    const SecurityTokenServiceConfig& config, const ExchangeOptions& options);

/**
 * A service that shares everything with `service`, kept connections included, but for the
 * certificates that may have signed its tokens.
 *
 * @throws Quillon::InvalidArgumentException  `service` is null or not one that this library made,
 *                                            or a certificate is null.
 */
SSOCLIENT_API boost::shared_ptr<SecurityTokenService> WithTrustedCertificates(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& certificates);

} // namespace SsoClient
