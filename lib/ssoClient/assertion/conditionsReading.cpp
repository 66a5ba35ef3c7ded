#include "ssoClient/assertion/conditionsReading.h"

#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/subjectReading.h"
#include "ssoClient/wire/wireNames.h"

namespace SsoClient::GeneralReader {

using Quillon::Xml::QName;

namespace {

const QName AnyUri(Wire::XsNamespace, "anyURI");
const QName DelegationRestriction(Wire::DelegationNamespace, "DelegationRestrictionType");
const QName RenewRestriction(Wire::RsaNamespace, "RenewRestrictionType");

AssertionAudience ReadAudiences(const ReaderContext& context, const ElementNode& element)
{
    AssertionAudience audience;
    ElementCursor child(element);
    while (const ElementNode* name = child.TakeIf("Audience")) {
        CheckAttributes(context, *name, {}, AnyUri);
        audience.insert(GetUri(*name));
    }
    child.RequireEnd();
    return audience;
}

AssertionAudience ReadAudienceRestriction(const ReaderContext& context, const ElementNode& element)
{
    CheckAttributes(context, element, {}, SamlType("AudienceRestrictionType"));
    AssertionAudience audience = ReadAudiences(context, element);
    if (audience.empty()) {
        throw ParseException(Describe(element) + " names no audience");
    }
    return audience;
}

/** [SAML-CORE 2.5.1.5, 2.5.1.6]: not more than one of a kind. */
void RequireFirst(bool isThere, const ElementNode& element)
{
    if (isThere) {
        throw ParseException("Second condition of its kind: " + Describe(element));
    }
}

AssertionProxyRestriction ReadProxyRestriction(
    const ReaderContext& context, const ElementNode& element)
{
    CheckAttributes(context, element, {"Count"}, SamlType("ProxyRestrictionType"));
    AssertionProxyRestriction restriction;
    restriction.count = GetOptionalCount(element, "Count");
    restriction.audience = ReadAudiences(context, element);
    return restriction;
}

AssertionDelegate ReadDelegate(const ReaderContext& context, const ElementNode& element)
{
    if (!element.HasQName("Delegate", Wire::DelegationNamespace)) {
        ThrowUnexpected(element, "a delegation restriction");
    }
    CheckAttributes(
        context,
        element,
        {"DelegationInstant", "ConfirmationMethod"},
        QName(Wire::DelegationNamespace, "DelegateType"));
    ElementCursor child(element);
    AssertionDelegate delegate;
    delegate.nameId = ReadNameId(context, child.Take("NameID"));
    delegate.delegationInstant = GetOptionalDate(element, "DelegationInstant");
    delegate.confirmationMethod = GetOptional(element, "ConfirmationMethod");
    child.RequireEnd();
    return delegate;
}

std::vector<AssertionDelegate> ReadDelegates(
    const ReaderContext& context, const ElementNode& element)
{
    CheckAttributeNames(element, {});
    std::vector<AssertionDelegate> delegates;
    for (ElementCursor child(element); child.Get() != nullptr;) {
        delegates.push_back(ReadDelegate(context, child.TakeAny()));
    }
    if (delegates.empty()) {
        throw ParseException(Describe(element) + " names no delegate");
    }
    return delegates;
}

AssertionRenewRestriction ReadRenewRestriction(const ElementNode& element)
{
    CheckAttributeNames(element, {"Count", "Postdatable", "RenewExpired"});
    AssertionRenewRestriction restriction;
    restriction.count = GetOptionalCount(element, "Count");
    restriction.postdatable = GetFlag(element, "Postdatable");
    restriction.renewExpired = GetFlag(element, "RenewExpired");
    ElementCursor(element).RequireEnd();
    return restriction;
}

/** A condition that only its type tells from others. */
void ReadTypedCondition(
    const ReaderContext& context, const ElementNode& element, AssertionConditions& conditions)
{
    const boost::optional<QName> type = GetCoveredType(context, element);
    if (type && *type == DelegationRestriction) {
        RequireFirst(!conditions.delegates.empty(), element);
        conditions.delegates = ReadDelegates(context, element);
    } else if (type && *type == RenewRestriction) {
        RequireFirst(conditions.renewRestriction.has_value(), element);
        conditions.renewRestriction = ReadRenewRestriction(element);
    } else {
        throw ParseException(
            "Unknown condition " + Describe(element) + " of type "
            + Quote(type ? type->ToString() : ""));
    }
}

void ReadCondition(
    const ReaderContext& context, const ElementNode& element, AssertionConditions& conditions)
{
    if (element.HasQName("AudienceRestriction", Wire::SamlNamespace)) {
        conditions.audienceRestrictions.push_back(ReadAudienceRestriction(context, element));
    } else if (element.HasQName("OneTimeUse", Wire::SamlNamespace)) {
        RequireFirst(conditions.oneTimeUse, element);
        CheckAttributes(context, element, {}, SamlType("OneTimeUseType"));
        ElementCursor(element).RequireEnd();
        conditions.oneTimeUse = true;
    } else if (element.HasQName("ProxyRestriction", Wire::SamlNamespace)) {
        RequireFirst(conditions.proxyRestriction.has_value(), element);
        conditions.proxyRestriction = ReadProxyRestriction(context, element);
    } else if (element.HasQName("Condition", Wire::SamlNamespace)) {
        ReadTypedCondition(context, element, conditions);
    } else {
        // [SAML-CORE 2.5.1]: a condition that is not understood makes the whole indeterminate.
        throw ParseException("Unknown condition " + Describe(element));
    }
}

} // namespace

AssertionConditions ReadConditions(const ReaderContext& context, const ElementNode& element)
{
    CheckAttributes(context, element, {"NotBefore", "NotOnOrAfter"}, SamlType("ConditionsType"));
    AssertionConditions conditions;
    conditions.notBefore = GetOptionalDate(element, "NotBefore");
    conditions.notOnOrAfter = GetOptionalDate(element, "NotOnOrAfter");
    for (ElementCursor child(element); child.Get() != nullptr;) {
        ReadCondition(context, child.TakeAny(), conditions);
    }
    return conditions;
}

} // namespace SsoClient::GeneralReader
