#include "devsts/service/Authentication.h"

#include "devsts/token/AssertionReader.h"
#include "devsts/wire/Fault.h"
#include "devsts/wire/Names.h"

#include <algorithm>

namespace DevSts {

namespace {

// However long a message says that it holds, it is old after this, so that the memory of
// messages stays bounded.
constexpr std::chrono::hours LongestFreshness(1);

TimePoint FreshUntil(const Interval& timestamp)
{
    return std::min<TimePoint>(timestamp.expires, timestamp.created + LongestFreshness) + ClockSkew;
}

} // namespace

void Authentication::RequireFresh(const Request& request) const
{
    const Interval& timestamp = request.freshness;
    if (timestamp.created > _now + ClockSkew) {
        throw Fault(
            FaultCodes::ExpiredData,
            "The message was created in the future: " + FormatTime(timestamp.created));
    }
    if (FreshUntil(timestamp) <= _now) {
        throw Fault(
            FaultCodes::ExpiredData,
            "The message created at " + FormatTime(timestamp.created) + " has expired");
    }
}

Sender Authentication::Identify(const Request& request) const
{
    if (request.presentedAssertion != nullptr && request.usernameToken) {
        throw Fault(FaultCodes::InvalidRequest, "The request carries both a password and a token");
    }
    if (request.presentedAssertion != nullptr) {
        return ByToken(request);
    }
    if (request.usernameToken) {
        return ByPassword(request);
    }
    if (request.signature != nullptr) {
        return ByCertificate(request);
    }
    throw Fault(FaultCodes::InvalidRequest, "The request carries no credentials");
}

std::optional<KeyProof> Authentication::ProveNegotiator(const Request& request) const
{
    if (request.usernameToken || request.presentedAssertion != nullptr) {
        throw Fault(
            FaultCodes::InvalidRequest,
            "A negotiation carries no password and no token in its header");
    }
    if (request.signature != nullptr) {
        return ProveCertificate(request);
    }
    if (request.binaryToken != nullptr) {
        throw Fault(
            FaultCodes::InvalidRequest, "The header carries a certificate but no signature");
    }
    return std::nullopt;
}

Sender Authentication::ByPrincipal(
    const std::string& principal, const std::optional<KeyProof>& proof) const
{
    Sender sender;
    sender.user = _users.FindByName(principal);
    if (sender.user == nullptr) {
        throw Fault(
            FaultCodes::FailedAuthentication,
            "The principal '" + principal + "' belongs to no known user");
    }
    sender.proof = proof;
    sender.authnContext = Names::ContextKerberos;
    return sender;
}

KeyProof Authentication::ProveCertificate(const Request& request) const
{
    if (request.signature == nullptr) {
        throw Fault(FaultCodes::InvalidRequest, "The request must be signed");
    }
    const MessageSignature signature(request);
    const std::string certificate = signature.NamedCertificate();
    signature.RequireMadeBy(certificate);
    RequireNew(request, signature);
    return {certificate, signature.Id()};
}

Sender Authentication::ByPassword(const Request& request) const
{
    const UsernameToken& token = *request.usernameToken;
    Sender sender;
    sender.user = _users.FindByName(token.name);
    if (sender.user == nullptr || sender.user->password != token.password) {
        throw Fault(FaultCodes::FailedAuthentication, "Invalid user name or password");
    }
    sender.authnContext = Names::ContextPassword;
    if (request.signature != nullptr) {
        sender.proof = ProveCertificate(request);
    }
    return sender;
}

Sender Authentication::ByToken(const Request& request) const
{
    if (request.signature == nullptr) {
        throw Fault(FaultCodes::InvalidRequest, "Presenting a token needs a signed request");
    }
    Sender sender;
    sender.presented = ReadPresented(request);
    const MessageSignature signature(request);
    signature.RequireNamesAssertion(sender.presented->id);
    sender.proof = KeyProof{PresenterCertificate(signature, *sender.presented), signature.Id()};
    RequireNew(request, signature);
    sender.authnContext = sender.presented->authnContext;
    return sender;
}

Sender Authentication::ByCertificate(const Request& request) const
{
    Sender sender;
    sender.proof = ProveCertificate(request);
    sender.user = _users.FindByCertificate(sender.proof->certificateDer);
    if (sender.user == nullptr) {
        throw Fault(FaultCodes::FailedAuthentication, "The certificate belongs to no known user");
    }
    sender.authnContext = Names::ContextCertificate;
    return sender;
}

Assertion Authentication::ReadPresented(const Request& request) const
{
    try {
        Assertion assertion =
            ReadVerifiedAssertion(request.presentedAssertion, _signingCertificateDer);
        RequireCurrent(assertion, _now);
        return assertion;
    } catch (const ShapeError& error) {
        throw Fault(
            FaultCodes::InvalidSecurityToken,
            std::string("The presented token is refused: ") + error.what());
    }
}

std::string Authentication::PresenterCertificate(
    const MessageSignature& signature, const Assertion& presented) const
{
    if (presented.confirmationCertificateDer) {
        signature.RequireMadeBy(*presented.confirmationCertificateDer);
        return *presented.confirmationCertificateDer;
    }
    // A bearer token names no key. Its presenter has to be a user whose certificate is known,
    // and the delegate if the token has one.
    for (const User& user : _users.All()) {
        if (!user.certificateDer || !signature.IsMadeBy(*user.certificateDer)) {
            continue;
        }
        if (!presented.delegates.empty() && presented.delegates.back().name != user.name) {
            throw Fault(
                FaultCodes::FailedAuthentication,
                "The token is for '" + presented.delegates.back().name + "', not for '" + user.name
                    + "'");
        }
        return *user.certificateDer;
    }
    throw Fault(
        FaultCodes::FailedCheck,
        "The message is not signed by any user whose certificate is known");
}

// Requests that are not signed are not remembered: whoever can repeat one also reads the
// password in it, and two honest ones may agree to the millisecond.
void Authentication::RequireNew(const Request& request, const MessageSignature& signature) const
{
    const TimePoint until = FreshUntil(request.freshness);
    if (!_guard.Remember("signature " + signature.Value(), until, _now)
        || !_guard.Remember("digests " + signature.Digests(), until, _now)) {
        throw Fault(FaultCodes::InvalidRequest, "The message has been received before");
    }
}

} // namespace DevSts
