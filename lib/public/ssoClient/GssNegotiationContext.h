#pragma once

#include "ssoClient/Export.h"
#include "ssoClient/Leg.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/SecurityTokenServiceConfig.h"
#include "ssoClient/TokenSpec.h"

#include <boost/smart_ptr/shared_ptr.hpp>

namespace SsoClient::InternalApi {

/** What one exchange of legs gave. */
struct NegotiationResult
{
    boost::shared_ptr<Leg> leg;               ///< the service's; never null, but possibly empty
    boost::shared_ptr<const SamlToken> token; ///< the verified token; null until it has arrived
};

/**
 * A SPNEGO negotiation with the token service, one exchange at a time, for callers whose own legs
 * come from elsewhere, such as a remote client. All legs go over one connection, with the cookies
 * that the service sets, and each exchange takes at most 40 seconds.
 *
 * There is no virtual destructor: a context is only owned by the pointer of its factory.
 *
 * Thread safety: one thread at a time; different contexts are independent. A forked child may
 * use one only if the process had neither threads nor exchanges before.
 */
class SSOCLIENT_API GssNegotiationContext
{
public:
    /**
     * Sends a leg and waits for the answer. The first leg begins the negotiation; so does the one
     * after a reply without context id. Nothing is logged, and the leg may be empty.
     *
     * @throws Quillon::InvalidArgumentException  the lifetime asked for is not positive or too long
     *                                            for a date, or a trusted certificate is null.
     * @throws ParseException, InvalidSignatureException  the token is unacceptable.
     * @throws SsoException  a fault, or a failure as of a blocking operation of
     *                       `SecurityTokenService`. The negotiation stays where it was.
     */
    virtual NegotiationResult NegotiateToken(const Leg& leg) = 0;

protected:
    ~GssNegotiationContext() = default;
};

/**
 * Begins a negotiation for a token as `spec` asks for it. Connects only with the first exchange.
 * `config` may go afterwards, except its SSL context.
 *
 * @throws Quillon::InvalidArgumentException  there is no trusted certificate, the URL is malformed,
 *                                            or it is an HTTPS URL and there is no SSL context.
 */
SSOCLIENT_API boost::shared_ptr<GssNegotiationContext> CreateGssNegotiationContext(
    const SecurityTokenServiceConfig& config, const TokenSpec& spec);

} // namespace SsoClient::InternalApi
