#include "AssertionPage.h"

#include "Explanation.h"
#include "html.h"

using namespace SsoClient;
using Quillon::System::DateTime;
using Quillon::Xml::QName;

namespace {

/** Names and values. What is absent or an empty list has no row: there is no fact in it. */
class Rows
{
public:
    template <class T>
    Rows& Add(const std::string& name, const T& value);
    template <class T>
    Rows& Add(const std::string& name, const boost::optional<T>& value);
    template <class T>
    Rows& Add(const std::string& name, const std::vector<T>& values);

    std::string ToMarkup() const { return _rows.empty() ? "" : "<dl>\n" + _rows + "</dl>\n"; }

private:
    void AddRow(const std::string& name, const std::string& markup)
    {
        _rows += "<dt>" + EscapeForHtml(name) + "</dt><dd>" + markup + "</dd>\n";
    }

    std::string _rows;
};

/** An empty text is not the same as none. */
std::string ToMarkup(const std::string& text)
{
    return text.empty() ? "<i>empty</i>" : EscapeForHtml(text);
}

std::string ToMarkup(bool isSo)
{
    return isSo ? "yes" : "no";
}

std::string ToMarkup(unsigned long long count)
{
    return std::to_string(count);
}

std::string ToMarkup(const DateTime& time)
{
    return time.ToString();
}

std::string ToMarkup(const QName& name)
{
    return EscapeForHtml(name.ToString());
}

// What holds others comes after all that it may hold; trees hold themselves.
std::string ToMarkup(const AssertionAudience& audience);
std::string ToMarkup(const AssertionXmlAttribute& attribute);
std::string ToMarkup(const AssertionXml& xml);
std::string ToMarkup(const AssertionNameId& id);
std::string ToMarkup(const CertificateReference& reference);
std::string ToMarkup(const AssertionProxyRestriction& restriction);
std::string ToMarkup(const AssertionRenewRestriction& restriction);
std::string ToMarkup(const Quillon::Ref<const Quillon::Crypto::Certificate>& certificate);
std::string ToMarkup(const AssertionKey& key);
std::string ToMarkup(const AssertionDelegate& delegate);
std::string ToMarkup(const AssertionAttributeValue& value);

template <class Items>
std::string WriteItems(const Items& items)
{
    std::string list;
    for (const auto& item : items) {
        list += "<li>" + ToMarkup(item) + "</li>";
    }
    return list;
}

template <class T>
std::string ToMarkup(const std::vector<T>& items)
{
    return items.size() == 1 ? ToMarkup(items.front()) : "<ol>" + WriteItems(items) + "</ol>";
}

template <class T>
Rows& Rows::Add(const std::string& name, const T& value)
{
    AddRow(name, ::ToMarkup(value));
    return *this;
}

template <class T>
Rows& Rows::Add(const std::string& name, const boost::optional<T>& value)
{
    return value ? Add(name, *value) : *this;
}

template <class T>
Rows& Rows::Add(const std::string& name, const std::vector<T>& values)
{
    if (!values.empty()) {
        AddRow(name, ::ToMarkup(values));
    }
    return *this;
}

std::string ToMarkup(const AssertionAudience& audience)
{
    return "<ul>" + WriteItems(audience) + "</ul>";
}

std::string ToMarkup(const AssertionXmlAttribute& attribute)
{
    return ToMarkup(attribute.name) + "=&quot;" + EscapeForHtml(attribute.value) + "&quot;";
}

std::string ToMarkup(const AssertionXml& xml)
{
    if (!xml.IsElement()) {
        return EscapeForHtml(xml.text);
    }
    std::string start = ToMarkup(xml.name);
    for (const AssertionXmlAttribute& attribute : xml.attributes) {
        start += " " + ToMarkup(attribute);
    }
    const std::string children =
        xml.children.empty() ? "" : "<ul>" + WriteItems(xml.children) + "</ul>";
    return "<code>" + start + "</code>" + children;
}

std::string ToMarkup(const AssertionNameId& id)
{
    const std::string details = Rows()
                                    .Add("format", id.format)
                                    .Add("name qualifier", id.nameQualifier)
                                    .Add("SP name qualifier", id.spNameQualifier)
                                    .Add("SP provided ID", id.spProvidedId)
                                    .ToMarkup();
    return ToMarkup(id.value) + details;
}

std::string ToMarkup(const CertificateReference& reference)
{
    return Rows()
        .Add("issuer", reference.issuerName)
        .Add("serial number", reference.serialNumber)
        .ToMarkup();
}

std::string ToMarkup(const AssertionProxyRestriction& restriction)
{
    Rows rows;
    rows.Add("count", restriction.count);
    if (!restriction.audience.empty()) {
        rows.Add("audience", restriction.audience);
    }
    return rows.ToMarkup();
}

std::string ToMarkup(const AssertionRenewRestriction& restriction)
{
    return Rows()
        .Add("count", restriction.count)
        .Add("postdatable", restriction.postdatable)
        .Add("once expired", restriction.renewExpired)
        .ToMarkup();
}

std::string ToMarkup(const Quillon::Ref<const Quillon::Crypto::Certificate>& certificate)
{
    return EscapeForHtml(DescribeCertificate(*certificate));
}

std::string ToMarkup(const AssertionKey& key)
{
    Rows rows;
    rows.Add("certificates", key.certificates);
    if (key.certificate) {
        rows.Add("certificate of the key", key.certificate);
    }
    if (key.publicKey) {
        rows.Add("key", key.publicKey->GetDescription());
    }
    return rows.Add("issuer and serial number", key.issuerSerial)
        .Add("subject name", key.subjectName)
        .Add("key name", key.keyName)
        .ToMarkup();
}

std::string ToMarkup(const AssertionDelegate& delegate)
{
    const std::string details = Rows()
                                    .Add("since", delegate.delegationInstant)
                                    .Add("confirmation", delegate.confirmationMethod)
                                    .ToMarkup();
    return ToMarkup(delegate.nameId) + details;
}

std::string ToMarkup(const AssertionAttributeValue& value)
{
    Rows details;
    details.Add("type", value.type).Add("attributes", value.attributes);
    if (value.isNil) {
        details.Add("nil", true);
    }
    const std::string shown =
        value.xml ? "<code>" + EscapeForHtml(*value.xml) + "</code>" : ToMarkup(value.text);
    return shown + details.ToMarkup();
}

std::string WriteSection(const std::string& heading, const std::string& content)
{
    return content.empty() ? "" : "<h2>" + heading + "</h2>\n" + content;
}

/** @param name  plain text. */
std::string WriteCard(const std::string& name, const Rows& rows)
{
    return "<article><h3>" + EscapeForHtml(name) + "</h3>\n" + rows.ToMarkup() + "</article>\n";
}

Rows Summarize(const VerifiedAssertion& assertion, const Quillon::Crypto::Certificate* signer)
{
    const AssertionFacts& facts = assertion.GetFacts();
    const DateTime& start = assertion.GetStartDate();
    const DateTime& end = assertion.GetEndDate();
    return Rows()
        .Add("validity", DescribeValidity(start, end))
        .Add("from", start)
        .Add("until", end)
        .Add("signed by", signer == nullptr ? "unknown" : DescribeCertificate(*signer))
        .Add("issuer", facts.issuer)
        .Add("issued", facts.issueInstant)
        .Add("subject", facts.subject)
        .Add("ID", facts.id);
}

Rows ListConfirmation(const AssertionConfirmation& confirmation)
{
    return Rows()
        .Add("method", confirmation.method)
        .Add("presented by", confirmation.nameId)
        .Add("not before", confirmation.notBefore)
        .Add("not on or after", confirmation.notOnOrAfter)
        .Add("recipient", confirmation.recipient)
        .Add("in response to", confirmation.inResponseTo)
        .Add("address", confirmation.address)
        .Add("keys", confirmation.keys);
}

std::string WriteConfirmations(const VerifiedAssertion& assertion)
{
    std::string cards;
    for (const AssertionConfirmation& confirmation : assertion.GetFacts().confirmations) {
        const bool isAccepted = &confirmation == &assertion.GetConfirmation();
        cards +=
            WriteCard(isAccepted ? "accepted" : "not accepted", ListConfirmation(confirmation));
    }
    return cards;
}

Rows ListConditions(const AssertionConditions& conditions)
{
    return Rows()
        .Add("not before", conditions.notBefore)
        .Add("not on or after", conditions.notOnOrAfter)
        .Add("audience restrictions", conditions.audienceRestrictions)
        .Add("one-time use", conditions.oneTimeUse)
        .Add("proxies", conditions.proxyRestriction)
        .Add("delegation", conditions.delegates)
        .Add("renewal", conditions.renewRestriction);
}

std::string WriteAuthentication(const AssertionAuthentication& authentication)
{
    const Rows rows = Rows()
                          .Add("session index", authentication.sessionIndex)
                          .Add("session ends", authentication.sessionNotOnOrAfter)
                          .Add("address", authentication.localityAddress)
                          .Add("DNS name", authentication.localityDnsName)
                          .Add("context class", authentication.contextClass)
                          .Add("declaration at", authentication.contextDeclarationRef)
                          .Add("declaration", authentication.contextDeclaration)
                          .Add("authorities", authentication.authorities);
    return WriteCard(authentication.authnInstant.ToString(), rows);
}

std::string WriteAttribute(const AssertionAttribute& attribute)
{
    const Rows rows = Rows()
                          .Add("values", attribute.values)
                          .Add("friendly name", attribute.friendlyName)
                          .Add("name format", attribute.nameFormat)
                          .Add("further attributes", attribute.otherAttributes);
    return WriteCard(attribute.name, rows);
}

template <class T>
std::string WriteEach(const std::vector<T>& items, std::string (*write)(const T& item))
{
    std::string written;
    for (const T& item : items) {
        written += write(item);
    }
    return written;
}

std::string MakeTitle(const AssertionFacts& facts)
{
    return "Assertion " + (facts.subject ? "about " + facts.subject->value : facts.id);
}

} // namespace

std::string WriteAssertionPage(
    const VerifiedAssertion& assertion, const Quillon::Crypto::Certificate* signer)
{
    const AssertionFacts& facts = assertion.GetFacts();
    const std::string advice =
        facts.advice.empty() ? "" : "<ul>" + WriteItems(facts.advice) + "</ul>\n";
    return WriteHtmlPage(
        MakeTitle(facts),
        Summarize(assertion, signer).ToMarkup()
            + WriteSection("Who may use it", WriteConfirmations(assertion))
            + WriteSection("Conditions", ListConditions(facts.conditions).ToMarkup())
            + WriteSection(
                "Authentications", WriteEach(facts.authentications, &WriteAuthentication))
            + WriteSection("Attributes", WriteEach(facts.attributes, &WriteAttribute))
            + WriteSection("Advice", advice));
}
