#include "ssoClient/token/samlAssertion.h"

#include "quillon/StringUtil.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/wireNames.h"

#include <algorithm>
#include <utility>

namespace SsoClient {

using Quillon::Ref;
using Quillon::Xml::ElementNode;
using Quillon::Xml::QName;
namespace Security = Quillon::Xml::Security;

namespace {

const std::vector<QName> XsiTypeOnly = {QName(Wire::XsiNamespace, "type")};
const std::vector<QName> NoNames;
const std::vector<QName> RenewRestrictionOptions = {
    LocalName("Count"), LocalName("Postdatable"), LocalName("RenewExpired")};

const QName KeyInfoConfirmationData(Wire::SamlNamespace, "KeyInfoConfirmationDataType");
const QName DelegationRestriction(Wire::DelegationNamespace, "DelegationRestrictionType");
const QName RenewRestriction(Wire::RsaNamespace, "RenewRestrictionType");

bool CoversAssertion(const Security::Signature& signature, std::string_view assertionId)
{
    const auto references = signature.GetReferences();
    return std::any_of(references.begin(), references.end(), [&](const auto* reference) {
        const std::string_view uri = reference->GetUri();
        return uri.empty() || (uri.front() == '#' && uri.substr(1) == assertionId);
    });
}

SamlToken::ConfirmationType ParseConfirmationMethod(std::string_view method)
{
    if (method == Wire::BearerMethod) {
        return SamlToken::CONFIRM_BEARER;
    }
    if (method == Wire::HolderOfKeyMethod) {
        return SamlToken::CONFIRM_HOLDER_OF_KEY;
    }
    throw ParseException("Unknown subject confirmation method: '" + std::string(method) + "'");
}

void ParseBearerData(const NodeFilterIterator& iterator, SubjectConfirmationDataType& data)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireEmptyElement(iterator);
    RequireElementAttributesNames(element, {"NotOnOrAfter"}, {});
    GetDateAttribute(element, "NotOnOrAfter", data.NotOnOrAfter);
}

void ParseHolderOfKeyData(const NodeFilterIterator& iterator, SubjectConfirmationDataType& data)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementAttributesQNames(element, XsiTypeOnly, NoNames);
    QName type;
    ResolveTypeName(element, element->FindAttribute("type", Wire::XsiNamespace)->value, type);
    if (type != KeyInfoConfirmationData) {
        throw ParseException("Invalid SubjectConfirmationData type: '" + type.ToString() + "'");
    }

    NodeFilterIterator child = iterator.GetChild();
    ParseSubjectConfirmationDataKeyInfoElement(child, data);
    RequireNothingAfter(child, "SubjectConfirmationData/KeyInfo");
}

/** The element's iterator, moved to its first child after the name was found right. */
NodeFilterIterator EnterDsElement(const NodeFilterIterator& iterator, const char* localName)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, localName, Wire::DsNamespace);
    RequireNoAttributes(element);
    return iterator.GetChild();
}

void ParseX509CertificateElement(
    NodeFilterIterator& iterator, Ref<const Quillon::Crypto::Certificate>& certificate)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "X509Certificate", Wire::DsNamespace);
    RequireNoAttributes(element);
    std::string text;
    RequireTextualContent(iterator, text);
    std::vector<unsigned char> bytes;
    Quillon::StringUtil::Base64Decode(text, bytes);
    certificate = Quillon::Crypto::CreateCertificate(bytes.data(), bytes.size());
    iterator.MoveToSibling();
}

[[noreturn]] void ThrowUnknownRestriction(const NodeFilterIterator& iterator)
{
    const ElementNode* element = IteratorToElement(iterator);
    throw ParseException(
        "Unknown or duplicate restriction node under Conditions"
        + (element == nullptr ? std::string() : ": " + std::string(element->GetLocalName())));
}

template <class Restriction>
bool ParsedNow(
    NodeFilterIterator& iterator,
    boost::optional<Restriction>& restriction,
    void (*tryParse)(NodeFilterIterator&, boost::optional<Restriction>&))
{
    // A kind that is filled is not tried again, so that a second one counts as unknown.
    if (restriction) {
        return false;
    }
    tryParse(iterator, restriction);
    return static_cast<bool>(restriction);
}

void ParseRestriction(NodeFilterIterator& iterator, ConditionsType& conditions)
{
    const bool parsed =
        ParsedNow(iterator, conditions.DelegationRestriction, &TryParseDelegationRestriction)
        || ParsedNow(iterator, conditions.AudienceRestriction, &TryParseAudienceRestriction)
        || ParsedNow(iterator, conditions.ProxyRestriction, &TryParseProxyRestriction)
        || ParsedNow(iterator, conditions.RenewRestriction, &TryParseRenewRestriction);
    if (!parsed) {
        ThrowUnknownRestriction(iterator);
    }
}

bool IsConditionOfType(const ElementNode* element, const QName& type)
{
    return ElementQNameIs(element, "Condition", Wire::SamlNamespace)
           && ElementXsiTypeIs(element, type);
}

} // namespace

void ParseSamlAssertionElement(NodeFilterIterator& iterator, SamlAssertionType& assertion)
{
    ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "Assertion", Wire::SamlNamespace);
    RequireElementAttributesNames(element, {"Version", "ID", "IssueInstant"}, {});
    assertion.Version = GetTextAttribute(element, "Version");
    assertion.ID = GetTextAttribute(element, "ID");
    GetDateAttribute(element, "IssueInstant", assertion.IssueInstant);

    NodeFilterIterator child = iterator.GetChild();
    ParseSamlIssuerElement(child, assertion.Issuer);
    ParseTokenSignature(child, element, assertion.Signature);
    ParseSubjectElement(child, assertion.Subject);
    ParseConditionsElement(child, assertion.Conditions);
    TryParseAdviceElement(child, assertion.Advice);
    ParseAuthnStatementElement(child, assertion.AuthnStatement);
    if (ElementQNameIs(IteratorToElement(child), "AttributeStatement", Wire::SamlNamespace)) {
        assertion.AttributeStatement.emplace();
        ParseAttributeStatementElement(child, *assertion.AttributeStatement);
    }
    if (!child.IsAtEnd()) {
        throw ParseException("Unexpected elements under Assertion");
    }
    iterator.MoveToSibling();
}

void ParseSamlIssuerElement(NodeFilterIterator& iterator, NameIDType& issuer)
{
    RequireElementQName(IteratorToElement(iterator), "Issuer", Wire::SamlNamespace);
    ParseNameIDType(iterator, issuer);
    iterator.MoveToSibling();
}

void ParseTokenSignature(
    NodeFilterIterator& iterator, ElementNode* assertion, Ref<Security::Signature>& signature)
{
    ElementNode* element = IteratorToElement(iterator);
    if (element == nullptr) {
        throw ParseException("Expected element ds:Signature not found");
    }
    try {
        Security::CreateSignatureFromDom(assertion, element, signature);
    } catch (const Security::SignatureSyntaxException& error) {
        throw ParseException(std::string("Signature syntax error: ") + error.what());
    }
    if (!CoversAssertion(*signature, GetTextAttribute(assertion, "ID"))) {
        throw ParseException("Token's signature must cover the entire token");
    }
    iterator.MoveToSibling();
}

void ParseSubjectElement(NodeFilterIterator& iterator, SubjectType& subject)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "Subject", Wire::SamlNamespace);
    RequireNoAttributes(element);

    NodeFilterIterator child = iterator.GetChild();
    ParseSubjectNameIdElement(child, subject.NameID);
    ParseSubjectConfirmationElement(child, subject.SubjectConfirmation);
    RequireNothingAfter(child, "SubjectConfirmation");
    iterator.MoveToSibling();
}

void ParseSubjectNameIdElement(NodeFilterIterator& iterator, NameIDType& nameId)
{
    RequireElementQName(IteratorToElement(iterator), "NameID", Wire::SamlNamespace);
    ParseNameIDType(iterator, nameId);
    iterator.MoveToSibling();
}

void ParseSubjectConfirmationElement(
    NodeFilterIterator& iterator, SubjectConfirmationType& confirmation)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "SubjectConfirmation", Wire::SamlNamespace);
    RequireElementAttributesNames(element, {"Method"}, {});
    confirmation.Method = ParseConfirmationMethod(GetTextAttribute(element, "Method"));

    NodeFilterIterator child = iterator.GetChild();
    if (ElementQNameIs(IteratorToElement(child), "NameID", Wire::SamlNamespace)) {
        confirmation.NameID.emplace();
        ParseSubjectNameIdElement(child, *confirmation.NameID);
    }
    ParseSubjectConfirmationDataElement(child, confirmation);
    RequireNothingAfter(child, "SubjectConfirmationData");
    iterator.MoveToSibling();
}

void ParseSubjectConfirmationDataElement(
    NodeFilterIterator& iterator, SubjectConfirmationType& confirmation)
{
    RequireElementQName(
        IteratorToElement(iterator), "SubjectConfirmationData", Wire::SamlNamespace);
    if (confirmation.Method == SamlToken::CONFIRM_BEARER) {
        ParseBearerData(iterator, confirmation.SubjectConfirmationData);
    } else {
        ParseHolderOfKeyData(iterator, confirmation.SubjectConfirmationData);
    }
    iterator.MoveToSibling();
}

void ParseSubjectConfirmationDataKeyInfoElement(
    NodeFilterIterator& iterator, SubjectConfirmationDataType& data)
{
    NodeFilterIterator inKeyInfo = EnterDsElement(iterator, "KeyInfo");
    NodeFilterIterator inX509Data = EnterDsElement(inKeyInfo, "X509Data");
    ParseX509CertificateElement(inX509Data, data.Certificate);
    RequireNothingAfter(inX509Data, "X509Certificate");
    RequireNothingAfter(inKeyInfo.MoveToSibling(), "X509Data");
    iterator.MoveToSibling();
}

void ParseNameIDType(const NodeFilterIterator& iterator, NameIDType& nameId)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementAttributesNames(element, {"Format"}, {});
    nameId.Format = GetTextAttribute(element, "Format");
    RequireTextualContent(iterator, nameId.Value);
}

void ParseConditionsElement(NodeFilterIterator& iterator, ConditionsType& conditions)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "Conditions", Wire::SamlNamespace);
    RequireElementAttributesNames(element, {"NotBefore", "NotOnOrAfter"}, {});
    GetDateAttribute(element, "NotBefore", conditions.NotBefore);
    GetDateAttribute(element, "NotOnOrAfter", conditions.NotOnOrAfter);

    NodeFilterIterator child = iterator.GetChild();
    while (!child.IsAtEnd()) {
        ParseRestriction(child, conditions);
    }
    iterator.MoveToSibling();
}

void TryParseAudienceRestriction(
    NodeFilterIterator& iterator, boost::optional<AudienceRestrictionType>& restriction)
{
    if (!ElementQNameIs(IteratorToElement(iterator), "AudienceRestriction", Wire::SamlNamespace)) {
        return;
    }
    AudienceRestrictionType result;
    NodeFilterIterator child = iterator.GetChild();
    while (!child.IsAtEnd()) {
        RequireElementQName(IteratorToElement(child), "Audience", Wire::SamlNamespace);
        std::string audience;
        RequireTextualContent(child, audience);
        result.Audience.insert(std::move(audience));
        child.MoveToSibling();
    }
    restriction = std::move(result);
    iterator.MoveToSibling();
}

void TryParseDelegationRestriction(
    NodeFilterIterator& iterator, boost::optional<DelegationRestrictionType>& restriction)
{
    const ElementNode* element = IteratorToElement(iterator);
    if (!IsConditionOfType(element, DelegationRestriction)) {
        return;
    }
    RequireElementAttributesQNames(element, XsiTypeOnly, NoNames);

    DelegationRestrictionType result;
    NodeFilterIterator child = iterator.GetChild();
    do {
        result.Delegate.emplace_back();
        ParseDelegate(child, result.Delegate.back());
    } while (!child.IsAtEnd());
    restriction = std::move(result);
    iterator.MoveToSibling();
}

void ParseDelegate(NodeFilterIterator& iterator, DelegateType& delegate)
{
    const ElementNode* element = IteratorToElement(iterator);
    RequireElementQName(element, "Delegate", Wire::DelegationNamespace);
    RequireElementAttributesNames(element, {"DelegationInstant"}, {});
    GetDateAttribute(element, "DelegationInstant", delegate.DelegationInstant);

    NodeFilterIterator child = iterator.GetChild();
    ParseSubjectNameIdElement(child, delegate.NameID);
    RequireNothingAfter(child, "NameID");
    iterator.MoveToSibling();
}

void TryParseProxyRestriction(
    NodeFilterIterator& iterator, boost::optional<ProxyRestrictionType>& restriction)
{
    const ElementNode* element = IteratorToElement(iterator);
    if (!ElementQNameIs(element, "ProxyRestriction", Wire::SamlNamespace)) {
        return;
    }
    // Count is required although SAML lets it be absent [SAML-CORE 2.5.1.6].
    RequireElementAttributesNames(element, {"Count"}, {});
    ProxyRestrictionType result;
    GetULongOptionalAttribute(element, "Count", result.Count);
    RequireEmptyElement(iterator);
    restriction = result;
    iterator.MoveToSibling();
}

void TryParseRenewRestriction(
    NodeFilterIterator& iterator, boost::optional<RenewRestrictionType>& restriction)
{
    const ElementNode* element = IteratorToElement(iterator);
    if (!IsConditionOfType(element, RenewRestriction)) {
        return;
    }
    RequireElementAttributesQNames(element, XsiTypeOnly, RenewRestrictionOptions);
    RenewRestrictionType result;
    GetULongOptionalAttribute(element, "Count", result.Count);
    RequireEmptyElement(iterator);
    restriction = result;
    iterator.MoveToSibling();
}

} // namespace SsoClient
