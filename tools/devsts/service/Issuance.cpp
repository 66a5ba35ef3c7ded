#include "devsts/service/Issuance.h"

#include "devsts/security/Random.h"
#include "devsts/wire/Fault.h"

#include <algorithm>

namespace DevSts {

namespace {

constexpr std::chrono::hours LongestLifetime(30 * 24);
constexpr unsigned RenewCount = 10;
constexpr unsigned ProxyCount = 10;

// An xs:ID begins with no digit.
std::string NewAssertionId()
{
    return "_" + RandomHex();
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
    assertion.notOnOrAfter =
        std::min<TimePoint>(lifetime.expires, lifetime.created + LongestLifetime);
}

void SetSubject(Assertion& assertion, const User& user)
{
    assertion.subject = user.name;
    assertion.groups = user.groups;
    assertion.givenName = user.givenName;
    assertion.surname = user.surname;
    assertion.isSolution = user.isSolution;
}

const User& RequireDelegate(const std::string& name, const Users& users)
{
    const User* delegate = users.FindByName(name);
    if (delegate == nullptr) {
        throw Fault(FaultCodes::InvalidRequest, "The delegate '" + name + "' is not known");
    }
    return *delegate;
}

std::string RequireProvenKey(const Sender& sender, const TokenRequest& wanted)
{
    if (!sender.proof) {
        throw Fault(FaultCodes::InvalidRequest, "A holder-of-key token needs a signed request");
    }
    // A presented token's key needs no UseKey to be meant; any other does. [WST13 9.2]
    if (!wanted.useKeySig && !sender.presented) {
        throw Fault(FaultCodes::InvalidRequest, "A holder-of-key token needs a UseKey");
    }
    if (wanted.useKeySig && *wanted.useKeySig != sender.proof->signatureId) {
        throw Fault(
            FaultCodes::InvalidRequest,
            "UseKey names the signature '" + *wanted.useKeySig + "', but there is '"
                + sender.proof->signatureId + "'");
    }
    return sender.proof->certificateDer;
}

// Clients ask for these in requests that are not signed: not their key counts, but that of the
// delegate, who will have to prove it.
std::string RequireDelegatesKey(const TokenRequest& wanted, const Users& users)
{
    const User& delegate = RequireDelegate(*wanted.delegateTo, users);
    if (wanted.useKeySig) {
        throw Fault(FaultCodes::InvalidRequest, "UseKey and DelegateTo exclude each other");
    }
    if (!delegate.isSolution || !delegate.certificateDer) {
        throw Fault(
            FaultCodes::InvalidRequest,
            "A holder-of-key token for the delegate '" + delegate.name
                + "' needs a solution user whose certificate is known");
    }
    return *delegate.certificateDer;
}

void SetConfirmation(
    Assertion& assertion, const Sender& sender, const TokenRequest& wanted, const Users& users)
{
    if (wanted.keyType == KeyType::PUBLIC_KEY) {
        assertion.confirmationCertificateDer = wanted.delegateTo
                                                   ? RequireDelegatesKey(wanted, users)
                                                   : RequireProvenKey(sender, wanted);
    } else if (wanted.useKeySig) {
        throw Fault(FaultCodes::InvalidRequest, "A bearer token uses no key");
    }
}

void SetGrants(Assertion& assertion, const TokenRequest& wanted)
{
    if (wanted.renewable) {
        assertion.renewCount = RenewCount;
    }
    if (wanted.delegable) {
        assertion.proxyCount = ProxyCount;
    }
    assertion.audience.insert(wanted.audience.begin(), wanted.audience.end());
    assertion.advice = wanted.advice;
}

void LimitDelegation(Assertion& assertion, const Assertion& presented, const TokenRequest& wanted)
{
    const unsigned left = presented.proxyCount.value_or(0);
    if (wanted.delegateTo && left == 0) {
        throw Fault(FaultCodes::InvalidRequest, "The presented token may not be delegated");
    }
    assertion.delegates = presented.delegates;
    assertion.proxyCount.reset();
    if (wanted.delegable && left > 0) {
        assertion.proxyCount = wanted.delegateTo ? left - 1 : left;
    }
}

void LimitAudience(Assertion& assertion, const Assertion& presented)
{
    if (presented.audience.empty()) {
        return;
    }
    if (assertion.audience.empty()) {
        assertion.audience = presented.audience;
    }
    if (!std::includes(
            presented.audience.begin(),
            presented.audience.end(),
            assertion.audience.begin(),
            assertion.audience.end())) {
        throw Fault(
            FaultCodes::InvalidScope, "The audience goes beyond that of the presented token");
    }
}

void LimitLifetime(Assertion& assertion, const Assertion& presented)
{
    assertion.notOnOrAfter = std::min(assertion.notOnOrAfter, presented.notOnOrAfter);
    if (assertion.notOnOrAfter <= assertion.notBefore) {
        throw Fault(
            FaultCodes::InvalidTimeRange,
            "The lifetime begins after the end of the presented token");
    }
}

void LimitTo(Assertion& assertion, const Assertion& presented, const TokenRequest& wanted)
{
    LimitLifetime(assertion, presented);
    LimitDelegation(assertion, presented, wanted);
    LimitAudience(assertion, presented);
    if (assertion.renewCount) {
        assertion.renewCount = presented.renewCount;
    }
    if (assertion.advice.empty()) {
        assertion.advice = presented.advice;
    }
    assertion.authnInstant = presented.authnInstant;
}

const User& RequireSubject(const Sender& sender, const Users& users)
{
    if (sender.user != nullptr) {
        return *sender.user;
    }
    const User* subject = users.FindByName(sender.presented->subject);
    if (subject == nullptr) {
        throw Fault(
            FaultCodes::InvalidSecurityToken,
            "The subject '" + sender.presented->subject + "' is not known any more");
    }
    return *subject;
}

} // namespace

Assertion IssueAssertion(
    const Sender& sender, const TokenRequest& wanted, const Users& users, TimePoint now)
{
    Assertion assertion;
    assertion.id = NewAssertionId();
    assertion.issueInstant = now;
    assertion.authnInstant = now;
    assertion.authnContext = sender.authnContext;
    SetSubject(assertion, RequireSubject(sender, users));
    SetLifetime(assertion, *wanted.lifetime, now);
    SetGrants(assertion, wanted);
    SetConfirmation(assertion, sender, wanted, users);
    if (sender.presented) {
        LimitTo(assertion, *sender.presented, wanted);
    }
    if (wanted.delegateTo) {
        assertion.delegates.push_back({RequireDelegate(*wanted.delegateTo, users).name, now});
    }
    return assertion;
}

Assertion RenewAssertion(
    const Assertion& old,
    const KeyProof& proof,
    const Interval& lifetime,
    const Users& users,
    TimePoint now)
{
    if (old.confirmationCertificateDer != proof.certificateDer) {
        throw Fault(
            FaultCodes::UnableToRenew, "The token is not bound to the key that signed the request");
    }
    if (old.renewCount.value_or(0) == 0) {
        throw Fault(FaultCodes::UnableToRenew, "The token is not renewable");
    }
    const User* subject = users.FindByName(old.subject);
    if (subject == nullptr) {
        throw Fault(
            FaultCodes::UnableToRenew, "The subject '" + old.subject + "' is not known any more");
    }
    Assertion renewed = old;
    renewed.id = NewAssertionId();
    renewed.issueInstant = now;
    renewed.renewCount = *old.renewCount - 1;
    SetSubject(renewed, *subject);
    SetLifetime(renewed, lifetime, now);
    return renewed;
}

} // namespace DevSts
