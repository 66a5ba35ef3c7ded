#include "unit/ssoClient/assertion/AssertionTable.h"

#include "support/FixedClock.h"
#include "support/TestData.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <ostream>

namespace AssertionTable {

namespace {

using namespace SsoClient;
using Json = nlohmann::json;
using Quillon::System::DateTime;

const Json& GetTable()
{
    static const Json table = Json::parse(ReadTestData("assertions/expected.json"));
    return table;
}

Certificates ReadCertificates(const std::string& name)
{
    const bool isOwn = name.rfind("chain-", 0) == 0;
    return Quillon::Crypto::ParsePemCertificates(
        ReadTestData((isOwn ? "assertions/keys/" : "keys/") + name + "-cert.pem"));
}

AssertionRules ToRules(const Json& rules)
{
    AssertionRules result;
    result.clockToleranceSec = rules.value("clockToleranceSec", 0);
    const auto read = [&rules](const char* name, boost::optional<std::string>& member) {
        if (rules.contains(name)) {
            member = rules.at(name).get<std::string>();
        }
    };
    read("audience", result.audience);
    read("recipient", result.recipient);
    read("inResponseTo", result.inResponseTo);
    if (rules.contains("methods")) {
        result.confirmationMethods = rules.at("methods").get<std::set<std::string>>();
    }
    if (rules.contains("maximumAgeSec")) {
        result.maximumAgeSec = rules.at("maximumAgeSec").get<long long>();
    }
    return result;
}

/** Appends the rows of a folder's table. */
void LoadRows(const std::string& folder, const Json& lines, std::vector<Row>& rows)
{
    for (const Json& line : lines) {
        Row row;
        row.folder = folder;
        line.at("file").get_to(row.file);
        line.at("about").get_to(row.about);
        row.rules = ToRules(line.at("rules"));
        if (line.contains("facts")) {
            row.facts = line.at("facts").dump(1);
        } else {
            line.at("refusal").at("class").get_to(row.className);
            line.at("refusal").at("contains").get_to(row.contains);
        }
        rows.push_back(std::move(row));
    }
}

std::vector<Row> LoadRows()
{
    std::vector<Row> rows;
    LoadRows("assertions", GetTable().at("assertions"), rows);
    const Json peers = Json::parse(ReadTestData("peers/expected.json"));
    if (peers.at("defaults") != GetTable().at("defaults")) {
        throw std::runtime_error("the tables are of different times or certificates");
    }
    LoadRows("peers", peers.at("assertions"), rows);
    return rows;
}

Json Describe(const boost::optional<std::string>& text)
{
    return text ? Json(*text) : Json();
}

Json Describe(const boost::optional<DateTime>& time)
{
    return time ? Json(time->GetUtcTime()) : Json();
}

Json Describe(const Quillon::Xml::QName& name)
{
    return name.ToString();
}

Json Describe(const std::vector<AssertionXmlAttribute>& attributes)
{
    Json result = Json::array();
    for (const AssertionXmlAttribute& attribute : attributes) {
        result.push_back({Describe(attribute.name), attribute.value});
    }
    return result;
}

Json Describe(const AssertionXml& xml)
{
    if (!xml.IsElement()) {
        return {{"text", xml.text}};
    }
    Json children = Json::array();
    for (const AssertionXml& child : xml.children) {
        children.push_back(Describe(child));
    }
    return {
        {"name", Describe(xml.name)},
        {"attributes", Describe(xml.attributes)},
        {"children", children}};
}

Json Describe(const AssertionNameId& id)
{
    return {
        {"value", id.value},
        {"format", Describe(id.format)},
        {"nameQualifier", Describe(id.nameQualifier)},
        {"spNameQualifier", Describe(id.spNameQualifier)},
        {"spProvidedId", Describe(id.spProvidedId)}};
}

Json Describe(const boost::optional<AssertionNameId>& id)
{
    return id ? Describe(*id) : Json();
}

/** The name of the test key that has the public key. */
Json NameOf(const Quillon::Crypto::PublicKey* key)
{
    if (key == nullptr) {
        return {};
    }
    for (const char* name : {"client", "sts", "foreign", "sts-p256", "chain-ca", "chain-leaf"}) {
        const auto certificate = ReadCertificates(name).front();
        if (certificate->GetPublicKey().GetEncoded() == key->GetEncoded()) {
            return name;
        }
    }
    return "unknown";
}

Json NameOf(const Quillon::Ref<const Quillon::Crypto::Certificate>& certificate)
{
    return certificate == nullptr ? Json() : NameOf(&certificate->GetPublicKey());
}

Json Describe(const AssertionKey& key)
{
    Json certificates = Json::array();
    for (const auto& certificate : key.certificates) {
        certificates.push_back(NameOf(certificate));
    }
    return {
        {"certificates", certificates},
        {"certificate", NameOf(key.certificate)},
        {"key", NameOf(key.publicKey.get())},
        {"issuerSerial",
         key.issuerSerial ? Json{key.issuerSerial->issuerName, key.issuerSerial->serialNumber}
                          : Json()},
        {"subjectName", Describe(key.subjectName)},
        {"keyName", Describe(key.keyName)}};
}

Json Describe(const AssertionConfirmation& confirmation);
Json Describe(const AssertionDelegate& delegate);
Json Describe(const AssertionAuthentication& authentication);
Json Describe(const AssertionAttributeValue& value);
Json Describe(const AssertionAttribute& attribute);

template <class Item>
Json DescribeAll(const std::vector<Item>& items)
{
    Json result = Json::array();
    for (const Item& item : items) {
        result.push_back(Describe(item));
    }
    return result;
}

Json Describe(const AssertionConfirmation& confirmation)
{
    return {
        {"method", confirmation.method},
        {"nameId", Describe(confirmation.nameId)},
        {"notBefore", Describe(confirmation.notBefore)},
        {"notOnOrAfter", Describe(confirmation.notOnOrAfter)},
        {"recipient", Describe(confirmation.recipient)},
        {"inResponseTo", Describe(confirmation.inResponseTo)},
        {"address", Describe(confirmation.address)},
        {"keys", DescribeAll(confirmation.keys)}};
}

Json Describe(const boost::optional<AssertionProxyRestriction>& proxy)
{
    if (!proxy) {
        return {};
    }
    return {{"count", proxy->count ? Json(*proxy->count) : Json()}, {"audience", proxy->audience}};
}

Json Describe(const boost::optional<AssertionRenewRestriction>& renew)
{
    if (!renew) {
        return {};
    }
    return {
        {"count", renew->count ? Json(*renew->count) : Json()},
        {"postdatable", renew->postdatable},
        {"renewExpired", renew->renewExpired}};
}

Json Describe(const AssertionDelegate& delegate)
{
    return {
        {"nameId", Describe(delegate.nameId)},
        {"instant", Describe(delegate.delegationInstant)},
        {"method", Describe(delegate.confirmationMethod)}};
}

Json Describe(const AssertionConditions& conditions)
{
    return {
        {"notBefore", Describe(conditions.notBefore)},
        {"notOnOrAfter", Describe(conditions.notOnOrAfter)},
        {"audiences", conditions.audienceRestrictions},
        {"oneTimeUse", conditions.oneTimeUse},
        {"proxy", Describe(conditions.proxyRestriction)},
        {"delegates", DescribeAll(conditions.delegates)},
        {"renew", Describe(conditions.renewRestriction)}};
}

Json Describe(const AssertionAuthentication& authentication)
{
    const auto& declaration = authentication.contextDeclaration;
    return {
        {"instant", authentication.authnInstant.GetUtcTime()},
        {"session", Describe(authentication.sessionIndex)},
        {"sessionEnd", Describe(authentication.sessionNotOnOrAfter)},
        {"address", Describe(authentication.localityAddress)},
        {"dns", Describe(authentication.localityDnsName)},
        {"context", Describe(authentication.contextClass)},
        {"declarationRef", Describe(authentication.contextDeclarationRef)},
        {"declaration", declaration ? Describe(*declaration) : Json()},
        {"authorities", authentication.authorities}};
}

Json Describe(const AssertionAttributeValue& value)
{
    return {
        {"text", value.text},
        {"xml", Describe(value.xml)},
        {"nil", value.isNil},
        {"type", value.type ? Describe(*value.type) : Json()},
        {"attributes", Describe(value.attributes)}};
}

Json Describe(const AssertionAttribute& attribute)
{
    return {
        {"name", attribute.name},
        {"nameFormat", Describe(attribute.nameFormat)},
        {"friendlyName", Describe(attribute.friendlyName)},
        {"other", Describe(attribute.otherAttributes)},
        {"values", DescribeAll(attribute.values)}};
}

} // namespace

std::ostream& operator<<(std::ostream& out, const Row& row)
{
    return out << row.file;
}

const std::vector<Row>& GetRows()
{
    static const std::vector<Row> rows = LoadRows();
    return rows;
}

const Row& GetRow(const std::string& file)
{
    const auto found = std::find_if(
        GetRows().begin(), GetRows().end(), [&file](const Row& row) { return row.file == file; });
    if (found == GetRows().end()) {
        throw std::runtime_error("the table has no " + file);
    }
    return *found;
}

const std::string& GetNow()
{
    return GetTable().at("defaults").at("now").get_ref<const std::string&>();
}

const Certificates& GetTrusted()
{
    static const Certificates trusted = [] {
        Certificates result;
        for (const Json& name : GetTable().at("defaults").at("trust")) {
            result.splice(result.end(), ReadCertificates(name.get<std::string>()));
        }
        return result;
    }();
    return trusted;
}

std::string Read(const Row& row)
{
    return ReadTestData(row.folder + "/" + row.file);
}

std::string DescribeFacts(const VerifiedAssertion& assertion)
{
    const AssertionFacts& facts = assertion.GetFacts();
    const auto accepted = &assertion.GetConfirmation() - facts.confirmations.data();
    return Json{
        {"id", facts.id},
        {"issueInstant", facts.issueInstant.GetUtcTime()},
        {"issuer", Describe(facts.issuer)},
        {"subject", Describe(facts.subject)},
        {"confirmations", DescribeAll(facts.confirmations)},
        {"conditions", Describe(facts.conditions)},
        {"advice", DescribeAll(facts.advice)},
        {"authentications", DescribeAll(facts.authentications)},
        {"attributes", DescribeAll(facts.attributes)},
        {"confirmation", accepted},
        {"start", assertion.GetStartDate().GetUtcTime()},
        {"end", assertion.GetEndDate().GetUtcTime()}}
        .dump(1);
}

boost::shared_ptr<const VerifiedAssertion> Verify(const Row& row)
{
    return Verify(Read(row), row.rules);
}

boost::shared_ptr<const VerifiedAssertion> Verify(
    const std::string& xml, const AssertionRules& rules)
{
    const FixedClock clock(GetNow());
    return VerifyAssertion(xml, GetTrusted(), rules);
}

} // namespace AssertionTable
