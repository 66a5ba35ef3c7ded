#include "ssoClient/token/SamlTokenImpl.h"

#include "quillon/PanicVerify.h"
#include "quillon/StringUtil.h"
#include "quillon/system/Clock.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/assertionPlaces.h"
#include "ssoClient/wire/wireNames.h"
#include "ssoClient/wire/xmlReading.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <algorithm>
#include <iterator>

namespace SsoClient {

using Quillon::Ref;
using Quillon::Crypto::Certificate;
using Quillon::System::DateTime;
using Quillon::Xml::AsElement;
using Quillon::Xml::AsText;
using Quillon::Xml::ElementNode;
using Quillon::Xml::Node;
namespace Security = Quillon::Xml::Security;

namespace {

/** Inclusive Canonical XML 1.0; the trailing `#` belongs to the name this library uses for it. */
constexpr char TokenTextCanonicalization[] = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#";

/** More seconds than the calendar has: beyond it, a tolerance changes nothing any more. */
constexpr long long MaxToleranceSec = 400'000'000'000;

void CheckIdentification(const SamlAssertionType& assertion)
{
    if (assertion.Version != "2.0") {
        throw ParseException("Invalid token version");
    }
    if (assertion.ID.empty() || assertion.ID.front() != '_') {
        throw ParseException("Invalid token ID");
    }
}

// [SAML-CORE 2.5.1.2]: the start belongs to the validity, the end does not.
void CheckValidity(const ConditionsType& conditions, long long clockToleranceSec)
{
    const DateTime& start = conditions.NotBefore;
    const DateTime& end = conditions.NotOnOrAfter;
    if (!(start < end)) {
        throw ParseException("Unsatisfiable token validity conditions: NotBefore must be less than "
                             "NotOnOrAfter.");
    }
    const long long toleranceUs =
        std::clamp(clockToleranceSec, -MaxToleranceSec, MaxToleranceSec) * 1'000'000;
    const long long now = Quillon::System::GetUtcDateTime().GetUtcTime();
    if (start.GetUtcTime() - toleranceUs > now) {
        throw ParseException("Token start date is in the future: " + start.ToString());
    }
    if (end.GetUtcTime() + toleranceUs <= now) {
        throw ParseException("The token has expired at: " + end.ToString());
    }
}

void CheckSubjectValidity(
    const SubjectConfirmationType& confirmation, const ConditionsType& conditions)
{
    if (confirmation.Method == SamlToken::CONFIRM_BEARER
        && confirmation.SubjectConfirmationData.NotOnOrAfter < conditions.NotOnOrAfter) {
        throw ParseException("Invalid token subject validity");
    }
}

/** The confirmation must name the most recent delegate exactly if there is a delegation. */
void CheckDelegation(
    const boost::optional<NameIDType>& delegateId,
    const boost::optional<DelegationRestrictionType>& restriction)
{
    if (delegateId && !restriction) {
        throw ParseException("Token SubjectConfirmation contains delegate id, but no delegation "
                             "restriction is present");
    }
    if (!delegateId && restriction) {
        throw ParseException("Token has delegation restriction, but no delegate id is present in "
                             "the SubjectConfirmation");
    }
    if (!delegateId) {
        return;
    }
    const NameIDType& last = restriction->Delegate.back().NameID;
    if (delegateId->Format != last.Format || delegateId->Value != last.Value) {
        throw ParseException(
            "The SubjectConfirmation delegate id does not match the id of the last delegate");
    }
}

void ValidateSignature(
    const Security::Signature& signature, const Security::KeyInfoResolver* keyResolver)
{
    bool verified = false;
    try {
        verified = signature.Verify(keyResolver);
    } catch (const Security::XmlSecurityException& error) {
        throw InvalidSignatureException(
            std::string("Signature verification error. ") + error.what());
    }
    if (!verified) {
        throw InvalidSignatureException(
            "Failed to verify signature: token might have been tampered with.");
    }
}

/** Whether the element's text stands in several nodes, as it does around a comment. */
bool HasDividedText(const ElementNode& element)
{
    unsigned pieces = 0;
    bool isBlank = true;
    for (Node* node = element.GetFirstChild(); node != nullptr; node = node->GetNextSibling()) {
        if (AsText(node) != nullptr) {
            ++pieces;
            isBlank = isBlank && !SkipWsAndCommentsFilter().Accept(node);
        }
    }
    return pieces > 1 && !isBlank;
}

/**
 * The canonical form has no comments, so it joins a value to the blanks that a comment parts from
 * it in the tree: the token's facts would be others than those of its own text. The values of the
 * signature are no facts, and blanks mean nothing in the Base64 of a certificate.
 */
void RequireUndividedValues(const ElementNode& element)
{
    if (HasDividedText(element)) {
        throw ParseException(
            "Element '" + std::string(element.GetLocalName())
            + "' must only have textual content (but has extra children or is empty).");
    }
    for (Node* node = element.GetFirstChild(); node != nullptr; node = node->GetNextSibling()) {
        const ElementNode* child = AsElement(node);
        if (child != nullptr && !ElementQNameIs(child, "Signature", Wire::DsNamespace)
            && !ElementQNameIs(child, "X509Certificate", Wire::DsNamespace)) {
            RequireUndividedValues(*child);
        }
    }
}

template <class Restriction>
bool AllowsSome(const boost::optional<Restriction>& restriction)
{
    return restriction && restriction->Count && *restriction->Count != 0;
}

/** Whether something stands on both sides of `position`. */
bool SplitsInTwo(const std::string& text, std::size_t position)
{
    return position != std::string::npos && position != 0 && position + 1 != text.size();
}

/** @return where domain and group part. */
std::size_t RequireGroupIdentity(const std::string& value)
{
    const std::size_t backslash = value.find('\\');
    if (!SplitsInTwo(value, backslash)) {
        throw ParseException(
            "Failed to parse Group Identity value: `" + value + "'; domain or group missing");
    }
    return backslash;
}

} // namespace

SamlTokenImpl::SamlTokenImpl(
    const std::string& xml,
    const Security::KeyInfoResolver* keyResolver,
    long long clockToleranceSec)
    : _xml(xml)
{
    const Ref<Quillon::Xml::Document> document = Quillon::Xml::ParseInPlace(_xml);
    InitializeFromDom(document->GetRootElement(), keyResolver, clockToleranceSec);
}

SamlTokenImpl::SamlTokenImpl(
    ElementNode* assertion,
    const Security::KeyInfoResolver* keyResolver,
    long long clockToleranceSec)
{
    RequireElementQName(assertion, "Assertion", Wire::SamlNamespace);
    _xml = ToCanonicalXml(assertion, TokenTextCanonicalization);
    InitializeFromDom(assertion, keyResolver, clockToleranceSec);
    RequireUndividedValues(*assertion);
}

void SamlTokenImpl::InitializeFromDom(
    ElementNode* assertion,
    const Security::KeyInfoResolver* keyResolver,
    long long clockToleranceSec)
{
    NodeFilterIterator iterator(assertion, boost::make_shared<SkipWsAndCommentsFilter>());
    SamlAssertionType model;
    ParseSamlAssertionElement(iterator, model);
    CheckTokenProperties(model, clockToleranceSec);
    ValidateSignature(*model.Signature, keyResolver);
    Populate(model);
    if (_subject == nullptr) {
        Quillon::PanicVerify(
            "_subject", AssertionPlaces::SamlTokenImpl, AssertionPlaces::TokenWithoutSubject);
    }
}

void SamlTokenImpl::Populate(SamlAssertionType& assertion)
{
    _id = std::move(assertion.ID);
    _subject.reset(new PrincipalId(ParseSamlNameId(assertion.Subject.NameID)));
    _startDate = assertion.Conditions.NotBefore;
    _endDate = assertion.Conditions.NotOnOrAfter;

    SubjectConfirmationType& confirmation = assertion.Subject.SubjectConfirmation;
    _confirmationMethod = confirmation.Method;
    _confirmationCertificate = std::move(confirmation.SubjectConfirmationData.Certificate);
    _isRenewable = AllowsSome(assertion.Conditions.RenewRestriction);
    _isDelegable = AllowsSome(assertion.Conditions.ProxyRestriction);

    if (assertion.Advice) {
        _advice = std::move(assertion.Advice->RSAAdvice);
    }
    if (assertion.AttributeStatement) {
        for (AttributeType& attribute : assertion.AttributeStatement->Attribute) {
            PopulateTokenAttribute(attribute);
        }
    }
    if (assertion.Conditions.DelegationRestriction) {
        for (const DelegateType& delegate : assertion.Conditions.DelegationRestriction->Delegate) {
            _delegationChain.push_back(ParseToDelegate(delegate));
        }
    }
    if (assertion.Conditions.AudienceRestriction) {
        _audience = std::move(assertion.Conditions.AudienceRestriction->Audience);
    }
}

void SamlTokenImpl::PopulateTokenAttribute(AttributeType& attribute)
{
    if (SamlAttributeIsGroupIdentity(attribute)) {
        AppendGroups(attribute.AttributeValue);
    } else if (SamlAttributeIsSolution(attribute)) {
        _isSolution = ParseIsSolutionAttribute(attribute);
    } else if (SamlAttributeIsGivenName(attribute)) {
        _fullName.first = ParsePrincipalNameAttribute(attribute);
    } else if (SamlAttributeIsSurName(attribute)) {
        _fullName.second = ParsePrincipalNameAttribute(attribute);
    }
}

/** A token has a thousand groups that hardly anybody asks for, so that they stay as written. */
void SamlTokenImpl::AppendGroups(std::vector<std::string>& values)
{
    for (const std::string& value : values) {
        RequireGroupIdentity(value);
    }
    if (_groups.empty()) {
        _groups = std::move(values);
    } else {
        std::move(values.begin(), values.end(), std::back_inserter(_groups));
    }
}

void SamlTokenImpl::GetGroups(std::vector<PrincipalId>& out) const
{
    std::vector<PrincipalId> groups;
    groups.reserve(_groups.size());
    for (const std::string& group : _groups) {
        groups.push_back(ParseGroupIdentity(group));
    }
    out.swap(groups);
}

void CheckTokenProperties(const SamlAssertionType& assertion, long long clockToleranceSec)
{
    const SubjectConfirmationType& confirmation = assertion.Subject.SubjectConfirmation;
    CheckIdentification(assertion);
    CheckValidity(assertion.Conditions, clockToleranceSec);
    CheckSubjectValidity(confirmation, assertion.Conditions);
    CheckDelegation(confirmation.NameID, assertion.Conditions.DelegationRestriction);
}

PrincipalId ParseSamlNameId(const NameIDType& nameId)
{
    if (nameId.Format != Wire::UpnClaim) {
        throw ParseException("Invalid or unsupported NameId format '" + nameId.Format + "'");
    }
    const std::size_t at = nameId.Value.rfind('@');
    if (!SplitsInTwo(nameId.Value, at)) {
        throw ParseException(
            "Failed to parse the UPN NameID: `" + nameId.Value
            + "'; name or domain part is missing.");
    }
    return {nameId.Value.substr(0, at), nameId.Value.substr(at + 1)};
}

PrincipalId ParseGroupIdentity(const std::string& value)
{
    const std::size_t backslash = RequireGroupIdentity(value);
    return {value.substr(backslash + 1), value.substr(0, backslash)};
}

Delegate ParseToDelegate(const DelegateType& delegate)
{
    return {ParseSamlNameId(delegate.NameID), delegate.DelegationInstant};
}

bool ParseIsSolutionAttribute(const AttributeType& attribute)
{
    if (attribute.AttributeValue.empty()) {
        throw ParseException("No value found for attribute isSolution.");
    }
    if (attribute.AttributeValue.size() > 1) {
        throw ParseException("More than one value found for attribute isSolution.");
    }
    return Quillon::StringUtil::ToLower(attribute.AttributeValue.front()) == "true";
}

std::string ParsePrincipalNameAttribute(const AttributeType& attribute)
{
    return attribute.AttributeValue.empty() ? std::string() : attribute.AttributeValue.front();
}

bool SamlAttributeIsGroupIdentity(const AttributeType& attribute)
{
    return attribute.Name == Wire::GroupIdentityAttribute;
}

bool SamlAttributeIsSolution(const AttributeType& attribute)
{
    return attribute.Name == Wire::IsSolutionAttribute;
}

bool SamlAttributeIsGivenName(const AttributeType& attribute)
{
    return attribute.Name == Wire::GivenNameClaim;
}

bool SamlAttributeIsSurName(const AttributeType& attribute)
{
    return attribute.Name == Wire::SurnameClaim;
}

boost::shared_ptr<const SamlToken> CreateSamlToken(
    const std::string& xml,
    const std::list<Ref<const Certificate>>& trustedCerts,
    long long clockToleranceSec)
{
    const auto resolver = Security::CreateTrustSetKeyResolver(trustedCerts);
    return boost::make_shared<SamlTokenImpl>(xml, resolver.get(), clockToleranceSec);
}

boost::shared_ptr<const SamlToken> CreateSamlToken(
    const std::string& xml, const std::list<Ref<const Certificate>>& trustedCerts)
{
    return CreateSamlToken(xml, trustedCerts, DefaultClockToleranceSec);
}

boost::shared_ptr<const SamlToken> CreateSamlToken(
    const std::string& xml, const Certificate* trustedCert)
{
    return CreateSamlToken(xml, {Ref<const Certificate>(trustedCert)});
}

boost::shared_ptr<const SamlToken> CreateSamlTokenFromDom(
    ElementNode* assertion,
    const std::list<Ref<const Certificate>>& trustedCerts,
    long long clockToleranceSec)
{
    const auto resolver = Security::CreateTrustSetKeyResolver(trustedCerts);
    return boost::make_shared<SamlTokenImpl>(assertion, resolver.get(), clockToleranceSec);
}

boost::shared_ptr<const SamlToken> CreateSamlTokenFromDom(
    ElementNode* assertion, const std::list<Ref<const Certificate>>& trustedCerts)
{
    return CreateSamlTokenFromDom(assertion, trustedCerts, DefaultClockToleranceSec);
}

} // namespace SsoClient
