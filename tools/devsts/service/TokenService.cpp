#include "devsts/service/TokenService.h"

#include "devsts/security/Certificates.h"
#include "devsts/service/Issuance.h"
#include "devsts/token/AssertionReader.h"
#include "devsts/token/AssertionWriter.h"
#include "devsts/wire/Fault.h"
#include "devsts/wire/ReplyWriter.h"
#include "devsts/wire/RequestReader.h"

#include <optional>
#include <stdexcept>

namespace DevSts {

namespace {

constexpr int StatusFault = 500; // [SOAP11 6.2]

Reply OkReply(std::string body)
{
    Reply reply;
    reply.body = std::move(body);
    return reply;
}

Reply FaultReply(const Fault& fault)
{
    Reply reply;
    reply.status = StatusFault;
    reply.body = WriteFault(fault);
    return reply;
}

void RequireTimestampOnly(const Request& request)
{
    if (request.usernameToken || request.presentedAssertion != nullptr
        || request.binaryToken != nullptr || request.signature != nullptr) {
        throw Fault(
            FaultCodes::InvalidRequest,
            "A continued negotiation carries nothing but a timestamp in its header");
    }
}

void RequireNoCredentials(const Request& request, const char* operation)
{
    if (request.usernameToken || request.presentedAssertion != nullptr) {
        throw Fault(
            FaultCodes::InvalidRequest,
            std::string("A ") + operation
                + " request carries no password and no token in its header");
    }
}

} // namespace

TokenService::TokenService(const State& state, Clock clock, const NegotiatorOptions& negotiation)
    : _state(state)
    , _clock(std::move(clock))
    , _signer(state.SigningKeyPem(), state.SigningCertificatePem())
    , _signingCertificateDer(DerFromPem(state.SigningCertificatePem()))
    , _negotiator(negotiation)
{}

Reply TokenService::Answer(const ReceivedRequest& received)
{
    try {
        return Handle(received);
    } catch (const Fault& fault) {
        return FaultReply(fault);
    } catch (const std::runtime_error& error) {
        return FaultReply(Fault(FaultCodes::Server, error.what()));
    }
}

Reply TokenService::Handle(const ReceivedRequest& received)
{
    const auto action = received.headers.find("SOAPAction");
    const Request request = ReadRequest(
        received.body,
        action == received.headers.end() ? std::nullopt : std::optional(action->second));
    const TimePoint now = _clock();
    const Users users = Users::Load(_state.Dir());
    Authenticate(users, now).RequireFresh(request);
    switch (request.operation) {
    case Operation::ISSUE:
        return request.leg ? BeginNegotiation(request, users, now)
                           : OkReply(Issue(request, users, now));
    case Operation::CONTINUE:
        return ContinueNegotiation(request, received.headers, users, now);
    case Operation::RENEW:
        return OkReply(Renew(request, users, now));
    case Operation::VALIDATE:
        return OkReply(Validate(request, users, now));
    }
    throw std::runtime_error("unknown operation");
}

std::string TokenService::Issue(const Request& request, const Users& users, TimePoint now)
{
    const Sender sender = Authenticate(users, now).Identify(request);
    const Assertion assertion = IssueAssertion(sender, request.token, users, now);
    return WriteIssueReply(Sign(assertion).get(), {assertion.notBefore, assertion.notOnOrAfter});
}

Reply TokenService::BeginNegotiation(const Request& request, const Users& users, TimePoint now)
{
    const Negotiator::Step step = _negotiator.Begin(
        request.leg->bytes, request.token, Authenticate(users, now).ProveNegotiator(request), now);
    Reply reply = OkReply(AnswerLeg(step, users, now));
    reply.headers.emplace("Set-Cookie", step.setCookie);
    return reply;
}

Reply TokenService::ContinueNegotiation(
    const Request& request, const Headers& headers, const Users& users, TimePoint now)
{
    RequireTimestampOnly(request);
    return OkReply(AnswerLeg(_negotiator.Continue(*request.leg, headers, now), users, now));
}

std::string TokenService::AnswerLeg(const Negotiator::Step& step, const Users& users, TimePoint now)
{
    if (!step.complete) {
        return WriteLegReply(step.leg);
    }
    const Sender sender =
        Authenticate(users, now)
            .ByPrincipal(step.complete->context.Principal(), step.complete->proof);
    const Assertion assertion = IssueAssertion(sender, step.complete->wanted, users, now);
    return WriteNegotiatedReply(
        Sign(assertion).get(), {assertion.notBefore, assertion.notOnOrAfter}, step.leg);
}

std::string TokenService::Renew(const Request& request, const Users& users, TimePoint now)
{
    RequireNoCredentials(request, "Renew");
    const KeyProof proof = Authenticate(users, now).ProveCertificate(request);
    Assertion old;
    try {
        old = ReadVerifiedAssertion(request.token.target, _signingCertificateDer);
        RequireCurrent(old, now);
    } catch (const ShapeError& error) {
        throw Fault(
            FaultCodes::UnableToRenew, std::string("The token is refused: ") + error.what());
    }
    const Assertion renewed = RenewAssertion(old, proof, *request.token.lifetime, users, now);
    return WriteRenewReply(Sign(renewed).get(), {renewed.notBefore, renewed.notOnOrAfter});
}

std::string TokenService::Validate(const Request& request, const Users& users, TimePoint now) const
{
    RequireNoCredentials(request, "Validate");
    if (request.signature != nullptr || request.binaryToken != nullptr) {
        throw Fault(FaultCodes::InvalidRequest, "A Validate request is not signed");
    }
    try {
        const Assertion assertion =
            ReadVerifiedAssertion(request.token.target, _signingCertificateDer);
        RequireCurrent(assertion, now);
        if (users.FindByName(assertion.subject) == nullptr) {
            throw ShapeError("The subject '" + assertion.subject + "' is not known any more");
        }
    } catch (const ShapeError& error) {
        return WriteStatusReply(false, error.what());
    }
    return WriteStatusReply(true, "The token and its subject are valid");
}

Authentication TokenService::Authenticate(const Users& users, TimePoint now)
{
    return {users, _signingCertificateDer, _guard, now};
}

XmlDocument TokenService::Sign(const Assertion& assertion) const
{
    XmlDocument doc = WriteAssertion(assertion);
    _signer.SignAssertion(doc.get());
    return doc;
}

} // namespace DevSts
