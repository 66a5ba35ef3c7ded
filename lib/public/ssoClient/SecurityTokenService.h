#pragma once

#include "ssoClient/SamlToken.h"
#include "ssoClient/SecurityTokenServiceConfig.h"
#include "ssoClient/TokenSpec.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>

namespace SsoClient {

/**
 * Obtains tokens from a WS-Trust 1.3 security token service.
 *
 * No operation retries. Each may throw:
 * - `Quillon::InvalidArgumentException`, before anything is sent, for a bad argument;
 * - `CommunicationException`, or the transport's own exception, if the exchange fails;
 * - `InvalidCredentialsException` if the service rejects the credentials;
 * - `InvalidSignatureException` if the token it sends does not verify;
 * - `SsoException` for any other fault or an answer that cannot be used.
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
};

/**
 * Creates the service object. `config` may go afterwards, except its SSL context.
 *
 * @throws Quillon::InvalidArgumentException  the URL is malformed, or it is an HTTPS URL and there
 *                                            is no SSL context.
 */
SSOCLIENT_API boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(
    const SecurityTokenServiceConfig& config);

} // namespace SsoClient
