#include "ssoClient/assertion/statementsReading.h"

#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/wireNames.h"

#include <algorithm>

namespace SsoClient::GeneralReader {

using Quillon::Xml::Attribute;
using Quillon::Xml::QName;

namespace {

const QName AnyUri(Wire::XsNamespace, "anyURI");

std::string ReadUriElement(const ReaderContext& context, const ElementNode& element)
{
    CheckAttributes(context, element, {}, AnyUri);
    return GetUri(element);
}

void ReadSubjectLocality(
    const ReaderContext& context, const ElementNode& element, AssertionAuthentication& statement)
{
    CheckAttributes(context, element, {"Address", "DNSName"}, SamlType("SubjectLocalityType"));
    ElementCursor(element).RequireEnd();
    statement.localityAddress = GetOptional(element, "Address");
    statement.localityDnsName = GetOptional(element, "DNSName");
}

/** [SAML-CORE 2.7.2.2]: class, declaration and authorities in this order. */
void ReadAuthnContext(
    const ReaderContext& context, const ElementNode& element, AssertionAuthentication& statement)
{
    CheckAttributes(context, element, {}, SamlType("AuthnContextType"));
    ElementCursor child(element);
    if (const ElementNode* contextClass = child.TakeIf("AuthnContextClassRef")) {
        statement.contextClass = ReadUriElement(context, *contextClass);
    }
    if (const ElementNode* declaration = child.TakeIf("AuthnContextDecl")) {
        statement.contextDeclaration = ReadXml(*declaration);
    } else if (const ElementNode* reference = child.TakeIf("AuthnContextDeclRef")) {
        statement.contextDeclarationRef = ReadUriElement(context, *reference);
    }
    while (const ElementNode* authority = child.TakeIf("AuthenticatingAuthority")) {
        statement.authorities.push_back(ReadUriElement(context, *authority));
    }
    child.RequireEnd();
}

/** [XML Schema Part 1, 2.6.2] */
bool IsNil(const ElementNode& element)
{
    const Attribute* nil = element.FindAttribute("nil", Wire::XsiNamespace);
    const bool isNil = nil != nullptr && (nil->value == "true" || nil->value == "1");
    if (isNil && element.GetFirstChild() != nullptr) {
        throw ParseException(Describe(element) + " is nil and has content");
    }
    return isNil;
}

/** What a value or an attribute carries beyond what its members say. */
std::vector<AssertionXmlAttribute> ReadOtherAttributes(
    const ElementNode& element, const std::vector<QName>& known)
{
    std::vector<AssertionXmlAttribute> others;
    for (const Attribute& attribute : element.GetAttributes()) {
        if (IsAboutTheSchema(element, attribute)) {
            continue;
        }
        QName name = GetAttributeName(element, attribute);
        if (std::find(known.begin(), known.end(), name) == known.end()) {
            others.push_back({std::move(name), std::string(attribute.value)});
        }
    }
    return others;
}

/** An `AttributeValue` may hold anything [SAML-CORE 2.7.3.1.1]. */
AssertionAttributeValue ReadAttributeValue(const ReaderContext& context, const ElementNode& element)
{
    static const std::vector<QName> known = {QName(Wire::XsiNamespace, "nil")};
    AssertionAttributeValue value;
    value.isNil = IsNil(element);
    value.type = FindCoveredType(context, element);
    value.attributes = ReadOtherAttributes(element, known);
    if (HoldsElements(element)) {
        value.xml = ToCoveredText(element);
    } else {
        value.text = GetText(element);
    }
    return value;
}

/** [SAML-CORE 2.7.3.1]: any attribute of another namespace may stand here. */
void CheckAttributeElement(const ReaderContext& context, const ElementNode& element)
{
    for (const AssertionXmlAttribute& other : ReadOtherAttributes(element, {})) {
        const std::string& name = other.name.GetLocalName();
        const bool isKnown = name == "Name" || name == "NameFormat" || name == "FriendlyName";
        const std::string& uri = other.name.GetNamespaceUri();
        if (uri.empty() ? !isKnown : uri == Wire::SamlNamespace) {
            throw ParseException(
                "Unexpected attribute " + Quote(name) + " of " + Describe(element));
        }
    }
    const boost::optional<QName> type = GetCoveredType(context, element);
    if (type && *type != SamlType("AttributeType")) {
        throw ParseException(
            "The xsi:type of " + Describe(element) + " is " + Quote(type->ToString()));
    }
}

AssertionAttribute ReadAttribute(const ReaderContext& context, const ElementNode& element)
{
    static const std::vector<QName> known = {
        QName("", "Name"), QName("", "NameFormat"), QName("", "FriendlyName")};
    CheckAttributeElement(context, element);
    AssertionAttribute attribute;
    attribute.name = GetRequired(element, "Name");
    attribute.nameFormat = GetOptional(element, "NameFormat");
    attribute.friendlyName = GetOptional(element, "FriendlyName");
    attribute.otherAttributes = ReadOtherAttributes(element, known);
    ElementCursor child(element);
    while (const ElementNode* value = child.TakeIf("AttributeValue")) {
        attribute.values.push_back(ReadAttributeValue(context, *value));
    }
    child.RequireEnd();
    return attribute;
}

} // namespace

AssertionAuthentication ReadAuthnStatement(const ReaderContext& context, const ElementNode& element)
{
    CheckAttributes(
        context,
        element,
        {"AuthnInstant", "SessionIndex", "SessionNotOnOrAfter"},
        SamlType("AuthnStatementType"));
    AssertionAuthentication statement;
    statement.authnInstant = GetRequiredDate(element, "AuthnInstant");
    statement.sessionIndex = GetOptional(element, "SessionIndex");
    statement.sessionNotOnOrAfter = GetOptionalDate(element, "SessionNotOnOrAfter");
    ElementCursor child(element);
    if (const ElementNode* locality = child.TakeIf("SubjectLocality")) {
        ReadSubjectLocality(context, *locality, statement);
    }
    ReadAuthnContext(context, child.Take("AuthnContext"), statement);
    child.RequireEnd();
    return statement;
}

void ReadAttributeStatement(
    const ReaderContext& context,
    const ElementNode& element,
    std::vector<AssertionAttribute>& attributes)
{
    CheckAttributes(context, element, {}, SamlType("AttributeStatementType"));
    ElementCursor child(element);
    while (const ElementNode* attribute = child.TakeIf("Attribute")) {
        attributes.push_back(ReadAttribute(context, *attribute));
    }
    // An encrypted attribute ends up here, too.
    child.RequireEnd();
}

} // namespace SsoClient::GeneralReader
