#include "devsts/TokenService.h"

#include "devsts/AssertionWriter.h"
#include "devsts/Fault.h"
#include "devsts/Names.h"
#include "devsts/ReplyWriter.h"
#include "devsts/RequestReader.h"

#include <algorithm>
#include <openssl/rand.h>
#include <optional>
#include <stdexcept>

namespace DevSts {

namespace {

constexpr std::chrono::minutes ClockSkew(5);
constexpr std::chrono::hours LongestLifetime(30 * 24);
constexpr unsigned RenewCount = 10;
constexpr unsigned ProxyCount = 10;

constexpr int StatusFault = 500; // [SOAP11 6.2]

void RequireFresh(const Interval& timestamp, TimePoint now)
{
    if (timestamp.created > now + ClockSkew) {
        throw Fault(
            FaultCodes::ExpiredData,
            "The message was created in the future: " + FormatTime(timestamp.created));
    }
    if (timestamp.expires + ClockSkew <= now) {
        throw Fault(
            FaultCodes::ExpiredData, "The message has expired at " + FormatTime(timestamp.expires));
    }
}

const User& Authenticate(const UsernameToken& token, const Users& users)
{
    const User* user = users.FindByName(token.name);
    if (user == nullptr || user->password != token.password) {
        throw Fault(FaultCodes::FailedAuthentication, "Invalid user name or password");
    }
    return *user;
}

std::string NewAssertionId()
{
    unsigned char bytes[16];
    if (RAND_bytes(bytes, sizeof bytes) != 1) {
        throw std::runtime_error("RAND_bytes failed");
    }
    static constexpr const char* Digits = "0123456789abcdef";
    std::string id = "_";
    for (const unsigned char byte : bytes) {
        id += Digits[byte >> 4U];
        id += Digits[byte & 15U];
    }
    return id;
}

void SetLifetime(Assertion& assertion, const Interval& lifetime, TimePoint now)
{
    if (lifetime.expires <= lifetime.created) {
        throw Fault(FaultCodes::InvalidTimeRange, "The lifetime ends before it begins");
    }
    if (lifetime.created > now + ClockSkew || lifetime.created < now - ClockSkew) {
        throw Fault(
            FaultCodes::InvalidTimeRange,
            "The lifetime must begin now, not at " + FormatTime(lifetime.created));
    }
    assertion.notBefore = lifetime.created;
    assertion.notOnOrAfter = std::min<TimePoint>(
        lifetime.expires, lifetime.created + std::chrono::microseconds(LongestLifetime));
}

void SetAttributes(Assertion& assertion, const User& user)
{
    assertion.groups = user.groups;
    assertion.givenName = user.givenName;
    assertion.surname = user.surname;
    assertion.isSolution = user.isSolution;
}

void SetDelegate(Assertion& assertion, const std::string& name, const Users& users, TimePoint now)
{
    const User* delegate = users.FindByName(name);
    if (delegate == nullptr) {
        throw Fault(FaultCodes::InvalidRequest, "The delegate '" + name + "' is not known");
    }
    assertion.delegates.push_back({delegate->name, now});
}

Assertion NewAssertion(
    const User& subject, const TokenRequest& wanted, const Users& users, TimePoint now)
{
    Assertion assertion;
    assertion.id = NewAssertionId();
    assertion.issueInstant = now;
    assertion.subject = subject.name;
    SetLifetime(assertion, *wanted.lifetime, now);
    if (wanted.renewable) {
        assertion.renewCount = RenewCount;
    }
    if (wanted.delegable) {
        assertion.proxyCount = ProxyCount;
    }
    if (wanted.delegateTo) {
        SetDelegate(assertion, *wanted.delegateTo, users, now);
    }
    assertion.audience.insert(wanted.audience.begin(), wanted.audience.end());
    assertion.advice = wanted.advice;
    assertion.authnInstant = now;
    SetAttributes(assertion, subject);
    return assertion;
}

} // namespace

TokenService::TokenService(const State& state, Clock clock)
    : _state(state)
    , _clock(std::move(clock))
    , _signer(state.SigningKeyPem(), state.SigningCertificatePem())
{}

Reply TokenService::Answer(const ReceivedRequest& received) const
{
    Reply reply;
    try {
        reply.body = Handle(received);
    } catch (const Fault& fault) {
        reply.status = StatusFault;
        reply.body = WriteFault(fault);
    } catch (const std::runtime_error& error) {
        reply.status = StatusFault;
        reply.body = WriteFault(Fault(FaultCodes::Server, error.what()));
    }
    return reply;
}

std::string TokenService::Handle(const ReceivedRequest& received) const
{
    const auto action = received.headers.find("SOAPAction");
    const Request request = ReadRequest(
        received.body,
        action == received.headers.end() ? std::nullopt : std::optional(action->second));
    const TimePoint now = _clock();
    RequireFresh(request.freshness, now);
    const Users users = Users::Load(_state.Dir());
    if (request.operation != Operation::Issue || request.signature != nullptr) {
        throw Fault(FaultCodes::InvalidRequest, "Signed requests are not offered");
    }
    return Issue(request, users, now);
}

std::string TokenService::Issue(const Request& request, const Users& users, TimePoint now) const
{
    if (!request.usernameToken) {
        throw Fault(FaultCodes::InvalidRequest, "The request carries no credentials");
    }
    const User& user = Authenticate(*request.usernameToken, users);
    if (request.token.keyType == KeyType::PublicKey) {
        throw Fault(FaultCodes::InvalidRequest, "A holder-of-key token needs a signed request");
    }
    Assertion assertion = NewAssertion(user, request.token, users, now);
    assertion.authnContext = Names::ContextPassword;
    const XmlDocument doc = WriteAssertion(assertion);
    _signer.SignAssertion(doc.get());
    return WriteIssueReply(doc.get(), {assertion.notBefore, assertion.notOnOrAfter});
}

} // namespace DevSts
