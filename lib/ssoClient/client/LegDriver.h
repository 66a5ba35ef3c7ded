#pragma once

#include "ssoClient/protocol/RequestBuilder.h"
#include "ssoClient/protocol/ResponseHandler.h"
#include "ssoClient/protocol/Transport.h"

#include <list>
#include <string>

namespace SsoClient {

/**
 * Takes the legs of a SPNEGO negotiation to the service. It keeps nothing of a negotiation; the
 * caller has its session and what the service answered last.
 *
 * Thread safety: immutable. References what it is made of.
 */
class LegDriver
{
public:
    /** What it means that a leg is empty. */
    enum class EmptyLeg
    {
        STOPS_THE_PROCESS, ///< the program's own handler is wrong
        IS_SENT            ///< it came from elsewhere, and it is the service that judges it
    };

    LegDriver(
        const RequestBuilder& requestBuilder,
        const ResponseHandler& responseHandler,
        const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
        EmptyLeg emptyLeg) noexcept;

    /**
     * Sends a leg and reads the answer. It is the first one, with `spec`, as long as the service
     * has given no context id.
     *
     * @param contextId  of the last answer; may be the one in `response`.
     * @param response   receives the answer; left as it was on failure.
     */
    void Exchange(
        TransportSession& session,
        const Leg& leg,
        const TokenSpec& spec,
        const std::string& contextId,
        SPNegoResponse& response) const;

private:
    void StartSPNegotiation(
        TransportSession& session,
        const Leg& leg,
        const TokenSpec& spec,
        SPNegoResponse& response) const;
    void ContinueSPNegotiation(
        TransportSession& session,
        const Leg& leg,
        const std::string& contextId,
        SPNegoResponse& response) const;
    void VerifyLeg(const Leg& leg, int place) const;
    void Send(TransportSession& session, const Request& request, SPNegoResponse& response) const;

    const RequestBuilder& _requestBuilder;
    const ResponseHandler& _responseHandler;
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& _trustedCertificates;
    EmptyLeg _emptyLeg;
};

} // namespace SsoClient
