#include "ssoClient/client/LegDriver.h"

#include "quillon/PanicVerify.h"
#include "ssoClient/client/operation.h"
#include "ssoClient/client/trustedCertificates.h"
#include "ssoClient/wire/assertionPlaces.h"

namespace SsoClient {

LegDriver::LegDriver(
    const RequestBuilder& requestBuilder,
    const ResponseHandler& responseHandler,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
    EmptyLeg emptyLeg) noexcept
    : _requestBuilder(requestBuilder)
    , _responseHandler(responseHandler)
    , _trustedCertificates(trustedCertificates)
    , _emptyLeg(emptyLeg)
{}

void LegDriver::Exchange(
    TransportSession& session,
    const Leg& leg,
    const TokenSpec& spec,
    const std::string& contextId,
    SPNegoResponse& response) const
{
    if (contextId.empty()) {
        StartSPNegotiation(session, leg, spec, response);
    } else {
        ContinueSPNegotiation(session, leg, contextId, response);
    }
}

void LegDriver::StartSPNegotiation(
    TransportSession& session,
    const Leg& leg,
    const TokenSpec& spec,
    SPNegoResponse& response) const
{
    VerifyLeg(leg, AssertionPlaces::EmptyFirstLeg);
    Request request;
    _requestBuilder.BuildInitialSPNegoRequest(spec, leg, request);
    Send(session, request, response);
}

void LegDriver::ContinueSPNegotiation(
    TransportSession& session,
    const Leg& leg,
    const std::string& contextId,
    SPNegoResponse& response) const
{
    VerifyLeg(leg, AssertionPlaces::EmptyFurtherLeg);
    Request request;
    _requestBuilder.BuildContinuedSPNegoRequest(contextId, leg, request);
    Send(session, request, response);
}

void LegDriver::VerifyLeg(const Leg& leg, int place) const
{
    if (leg.empty() && _emptyLeg == EmptyLeg::STOPS_THE_PROCESS) {
        Quillon::PanicVerify("!leg.empty()", AssertionPlaces::SecurityTokenServiceImpl, place);
    }
}

void LegDriver::Send(
    TransportSession& session, const Request& request, SPNegoResponse& response) const
{
    RefuseNullCertificate(_trustedCertificates);
    const Quillon::Ref<Quillon::Reader> reply = SsoClient::Send(session, request);
    _responseHandler.HandleSPNegoResponse(reply.get(), response);
}

} // namespace SsoClient
