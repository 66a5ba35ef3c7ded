#include "assertionFacts.h"

#include "OneLine.h"

#include <nlohmann/json.hpp>

using Json = nlohmann::ordered_json;
using namespace SsoClient;

namespace {

Json ToJson(const std::string& text)
{
    return text;
}

Json ToJson(unsigned long long count)
{
    return count;
}

Json ToJson(const Quillon::System::DateTime& time)
{
    return time.ToString();
}

Json ToJson(const Quillon::Xml::QName& name)
{
    return name.ToString();
}

Json ToJson(const AssertionAudience& audience)
{
    return audience;
}

// What holds others comes after all that it may hold; trees hold themselves.
Json ToJson(const AssertionXmlAttribute& attribute);
Json ToJson(const AssertionXml& xml);
Json ToJson(const AssertionNameId& id);
Json ToJson(const CertificateReference& reference);
Json ToJson(const AssertionProxyRestriction& restriction);
Json ToJson(const AssertionRenewRestriction& restriction);
Json ToJson(const Quillon::Ref<const Quillon::Crypto::Certificate>& certificate);
Json ToJson(const AssertionKey& key);
Json ToJson(const AssertionConfirmation& confirmation);
Json ToJson(const AssertionDelegate& delegate);
Json ToJson(const AssertionAuthentication& authentication);
Json ToJson(const AssertionAttributeValue& value);
Json ToJson(const AssertionAttribute& attribute);

template <class T>
Json ToJson(const boost::optional<T>& value)
{
    return value ? ToJson(*value) : Json();
}

template <class T>
Json ToJson(const std::vector<T>& items)
{
    Json list = Json::array();
    for (const T& item : items) {
        list.push_back(ToJson(item));
    }
    return list;
}

Json ToJson(const AssertionXmlAttribute& attribute)
{
    return {{"name", ToJson(attribute.name)}, {"value", attribute.value}};
}

Json ToJson(const AssertionXml& xml)
{
    if (!xml.IsElement()) {
        return {{"text", xml.text}};
    }
    Json json;
    json["name"] = ToJson(xml.name);
    json["attributes"] = ToJson(xml.attributes);
    json["children"] = ToJson(xml.children);
    return json;
}

Json ToJson(const AssertionNameId& id)
{
    Json json;
    json["value"] = id.value;
    json["format"] = ToJson(id.format);
    json["nameQualifier"] = ToJson(id.nameQualifier);
    json["spNameQualifier"] = ToJson(id.spNameQualifier);
    json["spProvidedId"] = ToJson(id.spProvidedId);
    return json;
}

Json ToJson(const CertificateReference& reference)
{
    return {{"issuerName", reference.issuerName}, {"serialNumber", reference.serialNumber}};
}

Json ToJson(const Quillon::Ref<const Quillon::Crypto::Certificate>& certificate)
{
    if (!certificate) {
        return {};
    }
    return {{"subject", certificate->GetSubjectName()}, {"sha256", certificate->GetFingerprint()}};
}

Json ToJson(const AssertionKey& key)
{
    Json json;
    json["certificates"] = ToJson(key.certificates);
    json["certificate"] = ToJson(key.certificate);
    json["publicKey"] = key.publicKey ? Json(key.publicKey->GetDescription()) : Json();
    json["issuerSerial"] = ToJson(key.issuerSerial);
    json["subjectName"] = ToJson(key.subjectName);
    json["keyName"] = ToJson(key.keyName);
    return json;
}

Json ToJson(const AssertionConfirmation& confirmation)
{
    Json json;
    json["method"] = confirmation.method;
    json["nameId"] = ToJson(confirmation.nameId);
    json["notBefore"] = ToJson(confirmation.notBefore);
    json["notOnOrAfter"] = ToJson(confirmation.notOnOrAfter);
    json["recipient"] = ToJson(confirmation.recipient);
    json["inResponseTo"] = ToJson(confirmation.inResponseTo);
    json["address"] = ToJson(confirmation.address);
    json["keys"] = ToJson(confirmation.keys);
    return json;
}

Json ToJson(const AssertionProxyRestriction& restriction)
{
    return {{"count", ToJson(restriction.count)}, {"audience", restriction.audience}};
}

Json ToJson(const AssertionRenewRestriction& restriction)
{
    return {
        {"count", ToJson(restriction.count)},
        {"postdatable", restriction.postdatable},
        {"renewExpired", restriction.renewExpired}};
}

Json ToJson(const AssertionDelegate& delegate)
{
    Json json;
    json["nameId"] = ToJson(delegate.nameId);
    json["delegationInstant"] = ToJson(delegate.delegationInstant);
    json["confirmationMethod"] = ToJson(delegate.confirmationMethod);
    return json;
}

Json ToJson(const AssertionConditions& conditions)
{
    Json json;
    json["notBefore"] = ToJson(conditions.notBefore);
    json["notOnOrAfter"] = ToJson(conditions.notOnOrAfter);
    json["audienceRestrictions"] = ToJson(conditions.audienceRestrictions);
    json["oneTimeUse"] = conditions.oneTimeUse;
    json["proxyRestriction"] = ToJson(conditions.proxyRestriction);
    json["delegates"] = ToJson(conditions.delegates);
    json["renewRestriction"] = ToJson(conditions.renewRestriction);
    return json;
}

Json ToJson(const AssertionAuthentication& authentication)
{
    Json json;
    json["authnInstant"] = ToJson(authentication.authnInstant);
    json["sessionIndex"] = ToJson(authentication.sessionIndex);
    json["sessionNotOnOrAfter"] = ToJson(authentication.sessionNotOnOrAfter);
    json["localityAddress"] = ToJson(authentication.localityAddress);
    json["localityDnsName"] = ToJson(authentication.localityDnsName);
    json["contextClass"] = ToJson(authentication.contextClass);
    json["contextDeclarationRef"] = ToJson(authentication.contextDeclarationRef);
    json["contextDeclaration"] = ToJson(authentication.contextDeclaration);
    json["authorities"] = ToJson(authentication.authorities);
    return json;
}

Json ToJson(const AssertionAttributeValue& value)
{
    Json json;
    json["text"] = value.text;
    json["xml"] = ToJson(value.xml);
    json["isNil"] = value.isNil;
    json["type"] = ToJson(value.type);
    json["attributes"] = ToJson(value.attributes);
    return json;
}

Json ToJson(const AssertionAttribute& attribute)
{
    Json json;
    json["name"] = attribute.name;
    json["nameFormat"] = ToJson(attribute.nameFormat);
    json["friendlyName"] = ToJson(attribute.friendlyName);
    json["otherAttributes"] = ToJson(attribute.otherAttributes);
    json["values"] = ToJson(attribute.values);
    return json;
}

Json Collect(const VerifiedAssertion& assertion)
{
    const AssertionFacts& facts = assertion.GetFacts();
    Json json;
    json["id"] = facts.id;
    json["issueInstant"] = ToJson(facts.issueInstant);
    json["issuer"] = ToJson(facts.issuer);
    json["subject"] = ToJson(facts.subject);
    json["confirmations"] = ToJson(facts.confirmations);
    json["acceptedConfirmation"] = &assertion.GetConfirmation() - facts.confirmations.data();
    json["conditions"] = ToJson(facts.conditions);
    json["advice"] = ToJson(facts.advice);
    json["authentications"] = ToJson(facts.authentications);
    json["attributes"] = ToJson(facts.attributes);
    json["startTime"] = ToJson(assertion.GetStartDate());
    json["expirationTime"] = ToJson(assertion.GetEndDate());
    return json;
}

/** Empty lists and objects have no line: there is no fact in them. */
void AppendLines(const std::string& path, const Json& json, std::string& lines)
{
    if (json.is_null()) {
        return;
    }
    if (!json.is_structured()) {
        const std::string value = json.is_string() ? json.get<std::string>() : json.dump();
        lines += path + ": " + ToOneLine(value) + "\n";
        return;
    }
    std::size_t index = 0;
    for (const auto& item : json.items()) {
        const std::string step = json.is_array() ? "[" + std::to_string(index++) + "]"
                                                 : (path.empty() ? "" : ".") + item.key();
        AppendLines(path + step, item.value(), lines);
    }
}

} // namespace

std::string DescribeAsJson(const VerifiedAssertion& assertion)
{
    return Collect(assertion).dump(2, ' ', true) + "\n";
}

std::string DescribeAsLines(const VerifiedAssertion& assertion)
{
    std::string lines;
    AppendLines("", Collect(assertion), lines);
    return lines;
}
