#include "ssoClient/assertion/subjectReading.h"

#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/keyReading.h"
#include "ssoClient/wire/wireNames.h"

namespace SsoClient::GeneralReader {

using Quillon::Xml::QName;

namespace {

/** [SAML-CORE 2.4]: by name as it should be, or one of the two forms that are not read. */
boost::optional<AssertionNameId> ReadIdentifier(const ReaderContext& context, ElementCursor& child)
{
    if (child.IsAt("BaseID") || child.IsAt("EncryptedID")) {
        throw ParseException(
            "Element " + Describe(*child.Get()) + " is not accepted, expected a NameID");
    }
    const ElementNode* element = child.TakeIf("NameID");
    return element == nullptr ? boost::optional<AssertionNameId>() : ReadNameId(context, *element);
}

/**
 * [SAML-PROF 3.1]: the type may be said, and then is that of key information; it is not needed to
 * tell that there are keys.
 */
void CheckDataType(const ReaderContext& context, const ElementNode& element, bool hasKeys)
{
    const boost::optional<QName> type = GetCoveredType(context, element);
    const QName plain = SamlType("SubjectConfirmationDataType");
    const QName keyInfo = SamlType("KeyInfoConfirmationDataType");
    if (type && *type != keyInfo && *type != plain) {
        throw ParseException(
            "The xsi:type of " + Describe(element) + " is " + Quote(type->ToString())
            + ", expected one of SAML's confirmation data");
    }
    if (type && *type == keyInfo && !hasKeys) {
        throw ParseException(Describe(element) + " has the type of key information and no key");
    }
}

void ReadConfirmationData(
    const ReaderContext& context, const ElementNode& element, AssertionConfirmation& confirmation)
{
    CheckAttributeNames(
        element, {"NotBefore", "NotOnOrAfter", "Recipient", "InResponseTo", "Address"});
    confirmation.notBefore = GetOptionalDate(element, "NotBefore");
    confirmation.notOnOrAfter = GetOptionalDate(element, "NotOnOrAfter");
    confirmation.recipient = GetOptional(element, "Recipient");
    confirmation.inResponseTo = GetOptional(element, "InResponseTo");
    confirmation.address = GetOptional(element, "Address");
    for (ElementCursor child(element); child.Get() != nullptr;) {
        const ElementNode& content = child.TakeAny();
        if (!content.HasQName("KeyInfo", Wire::DsNamespace)) {
            ThrowUnexpected(content, Describe(element));
        }
        confirmation.keys.push_back(ReadKeyInfo(content));
    }
    CheckDataType(context, element, !confirmation.keys.empty());
}

AssertionConfirmation ReadConfirmation(const ReaderContext& context, const ElementNode& element)
{
    CheckAttributes(context, element, {"Method"}, SamlType("SubjectConfirmationType"));
    AssertionConfirmation confirmation;
    confirmation.method = GetRequired(element, "Method");
    ElementCursor child(element);
    confirmation.nameId = ReadIdentifier(context, child);
    if (const ElementNode* data = child.TakeIf("SubjectConfirmationData")) {
        ReadConfirmationData(context, *data, confirmation);
    }
    child.RequireEnd();
    // [SAML-PROF 3.1]: without a key there is nothing to hold.
    if (confirmation.method == HolderOfKeyConfirmation && confirmation.keys.empty()) {
        throw ParseException(Describe(element) + " is holder-of-key and has no ds:KeyInfo");
    }
    return confirmation;
}

} // namespace

AssertionNameId ReadNameId(const ReaderContext& context, const ElementNode& element)
{
    CheckAttributes(
        context,
        element,
        {"Format", "NameQualifier", "SPNameQualifier", "SPProvidedID"},
        SamlType("NameIDType"));
    AssertionNameId id;
    id.value = GetText(element);
    id.format = GetOptional(element, "Format");
    id.nameQualifier = GetOptional(element, "NameQualifier");
    id.spNameQualifier = GetOptional(element, "SPNameQualifier");
    id.spProvidedId = GetOptional(element, "SPProvidedID");
    if (id.value.empty()) {
        throw ParseException(Describe(element) + " has no value");
    }
    return id;
}

void ReadSubject(const ReaderContext& context, const ElementNode& element, AssertionFacts& facts)
{
    CheckAttributes(context, element, {}, SamlType("SubjectType"));
    ElementCursor child(element);
    facts.subject = ReadIdentifier(context, child);
    while (const ElementNode* confirmation = child.TakeIf("SubjectConfirmation")) {
        facts.confirmations.push_back(ReadConfirmation(context, *confirmation));
    }
    child.RequireEnd();
}

} // namespace SsoClient::GeneralReader
