#include "ssoClient/client/grantChecking.h"

#include "quillon/StringUtil.h"
#include "quillon/system/Clock.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/principals.h"

#include <boost/algorithm/string/join.hpp>

#include <algorithm>

namespace SsoClient {

namespace {

using Quillon::StringUtil::ToUpper;

[[noreturn]] void ThrowOtherToken(const std::string& difference)
{
    throw SsoException("The service issued another token than was asked for: " + difference);
}

bool IsWhole(const boost::optional<HolderOfKeyConfig>& identity)
{
    return identity && identity->privateKey && identity->certificate;
}

bool AsksForKey(const GrantRequest& asked, const boost::optional<HolderOfKeyConfig>& identity)
{
    return asked.spec == nullptr
           || (IsWhole(identity) && asked.spec->confirmation == TokenSpec::CONFIRMATION_DEFAULT);
}

void CheckKey(
    const SamlToken& token,
    const GrantRequest& asked,
    const boost::optional<HolderOfKeyConfig>& identity)
{
    const bool isBound = token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY;
    if (!AsksForKey(asked, identity)) {
        if (isBound) {
            ThrowOtherToken("it is bound to a key");
        }
        return;
    }
    if (!isBound) {
        ThrowOtherToken("it is bound to no key");
    }
    // The key of a token for a delegate is the delegate's.
    const bool isForDelegate = asked.spec != nullptr && asked.spec->delegateTo;
    if (!isForDelegate && IsWhole(identity)
        && token.GetConfirmationCertificate()->GetPublicKey().GetEncoded()
               != identity->certificate->GetPublicKey().GetEncoded()) {
        ThrowOtherToken("it is bound to another key than the caller's");
    }
}

/** A user's name as it is typed: `name`, `name@domain` or `DOMAIN\name`. */
struct TypedName
{
    std::string name;
    std::string upnDomain; ///< only of `name@domain`
};

TypedName ParseTypedName(const std::string& text)
{
    const std::size_t at = text.rfind('@');
    if (at != std::string::npos) {
        return {text.substr(0, at), text.substr(at + 1)};
    }
    const std::size_t backslash = text.find('\\');
    return {backslash == std::string::npos ? text : text.substr(backslash + 1), std::string()};
}

bool IsCertificateName(const SubjectRule& rule)
{
    return rule.form == SubjectForm::X509_SUBJECT && !rule.attribute;
}

bool IsUserName(const SubjectRule& rule)
{
    return !rule.domain
           && (rule.form == SubjectForm::UPN || rule.form == SubjectForm::WINDOWS_NAME
               || rule.form == SubjectForm::PLAIN);
}

/** How the subject of a token was found. */
struct FoundSubject
{
    bool isNarrow = true;
    bool isOneDirectory = false;
    const SubjectRule* rule = nullptr; ///< of a token that is not narrow
};

FoundSubject GetFoundSubject(const SamlToken& token, const ServiceDialect& dialect)
{
    FoundSubject found;
    const auto assertion = GetAssertion(token);
    if (assertion && dialect.reading) {
        found.isNarrow = false;
        found.isOneDirectory = dialect.reading->mapping.isOneDirectory;
        found.rule =
            GeneralReader::FindSubjectRule(assertion->GetFacts(), dialect.reading->mapping);
    }
    return found;
}

/** Whether the subject's name is one by which users log on. */
bool HasUserName(const FoundSubject& found)
{
    return found.isNarrow || found.isOneDirectory
           || (found.rule != nullptr && IsUserName(*found.rule));
}

/** Whether the subject's domain is that of a UPN. */
bool HasUpnDomain(const FoundSubject& found)
{
    return found.isNarrow
           || (found.rule != nullptr && !found.rule->domain
               && found.rule->form == SubjectForm::UPN);
}

[[noreturn]] void ThrowOtherSubject(const SamlToken& token, const std::string& expected)
{
    ThrowOtherToken(
        "its subject is " + token.GetSubject().ToString() + ", and it was asked for by or for "
        + expected);
}

void CheckUserName(const SamlToken& token, const std::string& userName, const FoundSubject& found)
{
    if (!HasUserName(found)) {
        return;
    }
    const TypedName typed = ParseTypedName(userName);
    const PrincipalId& subject = token.GetSubject();
    const bool isSameDomain = typed.upnDomain.empty() || !HasUpnDomain(found)
                              || ToUpper(typed.upnDomain) == ToUpper(subject.GetDomain());
    if (ToUpper(typed.name) != ToUpper(subject.GetName()) || !isSameDomain) {
        ThrowOtherSubject(token, userName);
    }
}

/** Distinguished names are compared without blanks and case, which producers write differently. */
std::string Normalize(const std::string& distinguishedName)
{
    std::string name = ToUpper(distinguishedName);
    name.erase(std::remove(name.begin(), name.end(), ' '), name.end());
    return name;
}

void CheckCertificateName(
    const SamlToken& token,
    const boost::optional<HolderOfKeyConfig>& identity,
    const FoundSubject& found)
{
    if (found.rule == nullptr || !IsCertificateName(*found.rule) || !IsWhole(identity)) {
        return;
    }
    const std::string expected = identity->certificate->GetSubjectName();
    if (Normalize(GetAssertion(token)->GetFacts().subject->value) != Normalize(expected)) {
        ThrowOtherSubject(token, expected);
    }
}

void CheckPresentedSubject(
    const SamlToken& token,
    const SamlToken& presented,
    const ServiceDialect& dialect,
    const FoundSubject& found)
{
    const FoundSubject before = GetFoundSubject(presented, dialect);
    const bool isComparable = found.isNarrow == before.isNarrow && HasUserName(found)
                              && (found.isOneDirectory || found.rule == before.rule);
    if (isComparable && token.GetSubject() != presented.GetSubject()) {
        ThrowOtherSubject(token, presented.GetSubject().ToString());
    }
}

void CheckSubject(
    const SamlToken& token,
    const GrantRequest& asked,
    const ServiceDialect& dialect,
    const boost::optional<HolderOfKeyConfig>& identity)
{
    const FoundSubject found = GetFoundSubject(token, dialect);
    const bool actsAs = dialect.presentedToken == PresentedTokenForm::ACT_AS;
    if (asked.way == GrantRequest::Way::PASSWORD) {
        CheckUserName(token, *asked.userName, found);
    } else if (asked.way == GrantRequest::Way::CERTIFICATE) {
        CheckCertificateName(token, identity, found);
    } else if (
        asked.way == GrantRequest::Way::RENEWAL
        || (asked.way == GrantRequest::Way::TOKEN && !actsAs)) {
        CheckPresentedSubject(token, *asked.presented, dialect, found);
    }
}

std::string Describe(const std::set<std::string>& audience)
{
    return audience.empty() ? "everybody" : boost::algorithm::join(audience, ", ");
}

void CheckAudience(const SamlToken& token, const GrantRequest& asked)
{
    std::set<std::string> expected;
    if (asked.spec == nullptr) {
        asked.presented->GetAudience(expected);
    } else {
        expected = asked.spec->audienceRestriction;
    }
    std::set<std::string> audience;
    token.GetAudience(audience);
    if (!expected.empty() && audience != expected) {
        ThrowOtherToken(
            "it is for " + Describe(audience) + ", and was asked for " + Describe(expected));
    }
}

std::vector<Delegate> GetChain(const SamlToken* token)
{
    std::vector<Delegate> chain;
    if (token != nullptr) {
        token->GetDelegationChain(chain);
    }
    return chain;
}

bool IsSameDelegate(const Delegate& a, const Delegate& b)
{
    return a.subject == b.subject;
}

/** The delegates of a presented token stay, and the one that was asked for is the last. */
void CheckDelegates(const SamlToken& token, const GrantRequest& asked)
{
    const std::vector<Delegate> before = GetChain(asked.presented);
    const std::vector<Delegate> chain = GetChain(&token);
    const bool hasNew = asked.spec != nullptr && asked.spec->delegateTo;
    const bool keepsOld =
        chain.size() == before.size() + (hasNew ? 1 : 0)
        && std::equal(before.begin(), before.end(), chain.begin(), IsSameDelegate);
    if (!keepsOld) {
        ThrowOtherToken(
            "it has " + std::to_string(chain.size())
            + " delegates that are not the ones asked for");
    }
    if (hasNew
        && ToUpper(ParseTypedName(*asked.spec->delegateTo).name)
               != ToUpper(chain.back().subject.GetName())) {
        ThrowOtherToken(
            "its delegate is " + chain.back().subject.ToString() + ", and asked for was "
            + *asked.spec->delegateTo);
    }
}

void CheckDelegation(
    const SamlToken& token, const GrantRequest& asked, const ServiceDialect& dialect)
{
    // In the body the token asks for a delegation that every service tells in its own way.
    if (asked.way != GrantRequest::Way::TOKEN
        || dialect.presentedToken == PresentedTokenForm::IN_HEADER) {
        CheckDelegates(token, asked);
    }
    if (asked.spec != nullptr && token.IsDelegable() != asked.spec->delegable) {
        ThrowOtherToken(token.IsDelegable() ? "it is delegable" : "it is not delegable");
    }
}

void CheckLifetime(const SamlToken& token, const GrantRequest& asked, const ServiceDialect& dialect)
{
    const long long tolerance = dialect.reading ? dialect.reading->rules.clockToleranceSec
                                                : AssertionRules().clockToleranceSec;
    const long long endsIn =
        (token.GetEndDate().GetUtcTime() - Quillon::System::GetUtcDateTime().GetUtcTime())
        / 1'000'000;
    if (endsIn - tolerance > asked.lifetimeSec) {
        ThrowOtherToken(
            "it ends in " + std::to_string(endsIn) + " seconds, and was asked for with "
            + std::to_string(asked.lifetimeSec));
    }
}

GrantRequest MakeRequest(GrantRequest::Way way, const TokenSpec& spec)
{
    GrantRequest request;
    request.way = way;
    request.spec = &spec;
    request.lifetimeSec = spec.tokenLifetimeSec;
    return request;
}

} // namespace

GrantRequest GrantRequest::ByPassword(const std::string& userName, const TokenSpec& spec)
{
    GrantRequest request = MakeRequest(Way::PASSWORD, spec);
    request.userName = &userName;
    return request;
}

GrantRequest GrantRequest::ByNegotiation(const TokenSpec& spec)
{
    return MakeRequest(Way::NEGOTIATION, spec);
}

GrantRequest GrantRequest::ByCertificate(const TokenSpec& spec)
{
    return MakeRequest(Way::CERTIFICATE, spec);
}

GrantRequest GrantRequest::ByToken(const SamlToken& presented, const TokenSpec& spec)
{
    GrantRequest request = MakeRequest(Way::TOKEN, spec);
    request.presented = &presented;
    return request;
}

GrantRequest GrantRequest::ByRenewal(const SamlToken& renewed, long long lifetimeSec)
{
    GrantRequest request;
    request.way = Way::RENEWAL;
    request.presented = &renewed;
    request.lifetimeSec = lifetimeSec;
    return request;
}

void CheckGrant(
    const SamlToken& token,
    const GrantRequest& asked,
    const ServiceDialect& dialect,
    const boost::optional<HolderOfKeyConfig>& identity)
{
    const GrantCheck& parts = dialect.grantCheck;
    if (parts.key) {
        CheckKey(token, asked, identity);
    }
    if (parts.subject) {
        CheckSubject(token, asked, dialect, identity);
    }
    if (parts.audience) {
        CheckAudience(token, asked);
    }
    if (parts.delegation) {
        CheckDelegation(token, asked, dialect);
    }
    if (parts.lifetime) {
        CheckLifetime(token, asked, dialect);
    }
}

} // namespace SsoClient
