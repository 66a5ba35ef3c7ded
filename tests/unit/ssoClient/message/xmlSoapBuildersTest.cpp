#include "ssoClient/message/xmlSoapBuilders.h"

#include "builderText.h"
#include "ssoClient/message/xmlSecurityBuilders.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "support/Xmlsec1.h"

#include <gmock/gmock.h>

#include <regex>
#include <set>

using namespace SsoClient;
using Quillon::Ref;
using Quillon::Xml::ElementNode;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;

namespace {

#define SOAP "http://schemas.xmlsoap.org/soap/envelope/"
#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define WSS "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-"
#define WSSE "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"
#define WSU "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd"

Ref<const Quillon::Crypto::Certificate> GetClientCertificate()
{
    return GetTestCertificates("client").front();
}

/** Whatever differs from one signature to the next, replaced by its kind. */
std::string Neutralize(std::string text)
{
    const char uuid[] = "[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}";
    text = std::regex_replace(text, std::regex(uuid), "UUID");
    text = std::regex_replace(
        text, std::regex("<ds:DigestValue>[A-Za-z0-9+/]{43}=<"), "<ds:DigestValue>DIGEST<");
    return std::regex_replace(
        text,
        std::regex("<ds:SignatureValue>[A-Za-z0-9+/]{342}==<"),
        "<ds:SignatureValue>SIGNATURE<");
}

std::vector<std::string> GetChildNames(const ElementNode& element)
{
    std::vector<std::string> names;
    for (const auto* child = element.GetFirstChild(); child; child = child->GetNextSibling()) {
        names.emplace_back(Quillon::Xml::AsElement(child)->GetName());
    }
    return names;
}

ElementNode* GetSecurity(const ElementNode& envelope)
{
    return envelope.FindChildElement("Header")->FindChildElement("Security");
}

ElementNode* GetSignature(const ElementNode& envelope)
{
    return GetSecurity(envelope)->FindChildElement("Signature");
}

std::string GetAttribute(const ElementNode* element, const char* name)
{
    std::string value = "(none)";
    element->GetAttribute(name, value);
    return value;
}

std::vector<std::string> GetReferenceUris(const ElementNode& envelope)
{
    std::vector<std::string> uris;
    const ElementNode* const signedInfo = GetSignature(envelope)->FindChildElement("SignedInfo");
    for (const auto* child = signedInfo->GetFirstChild(); child; child = child->GetNextSibling()) {
        const ElementNode* const element = Quillon::Xml::AsElement(child);
        if (element->GetLocalName() == "Reference") {
            uris.push_back(GetAttribute(element, "URI"));
        }
    }
    return uris;
}

/** A builder of an envelope that is signed without saying by whom. */
class PlainlySigned
{
public:
    Ref<ElementNode> Build() const { return ::Build(_builder); }

private:
    Ref<const Quillon::Crypto::PrivateKey> _key = GetTestKey("client");
    XMLSignedSoapBuilder _builder{
        WsSecurityHeaderBuilder(10), ElementBuilder("wst", "Request"), _key.get(), nullptr};
};

} // namespace

TEST(SoapBuilder, WrapsHeaderAndBody)
{
    EXPECT_EQ(
        ToText(SoapBuilder(ElementBuilder("p", "h"), ElementBuilder("p", "b"))),
        "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\">"
        "<soapenv:Header><p:h/></soapenv:Header>"
        "<soapenv:Body xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\"><p:b/>"
        "</soapenv:Body></soapenv:Envelope>");
}

TEST(SoapBuilder, LeavesElementsEmptyWithoutTheirParts)
{
    EXPECT_EQ(
        ToText(SoapBuilder(nullptr, nullptr)),
        "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\">"
        "<soapenv:Header/>"
        "<soapenv:Body xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\"/>"
        "</soapenv:Envelope>");
}

TEST(CreateWssuId, GivesNewUuidToElementWithoutId)
{
    const Ref<ElementNode> element = Build(*ElementBuilder("p", "e", {{"Id", "other"}}));
    const std::string id = CreateWssuId(element.get());
    EXPECT_THAT(id, testing::SizeIs(36));
    EXPECT_EQ(ToText(*element), "<p:e Id=\"other\" xmlns:wsu=\"" WSU "\" wsu:Id=\"" + id + "\"/>");
    EXPECT_EQ(CreateWssuId(element.get()), id);
}

// [XML Schema Part 2, 3.3.8]: an xs:ID is a name. Of plain UUIDs, ten in sixteen are none. The rest
// of them stays random, its version and variant marks included.
TEST(CreateWssuId, GivesIdsThatAreNames)
{
    std::set<std::string> ids;
    for (int i = 0; i < 100; ++i) {
        Ref<ElementNode> element;
        CreateElementNode("e", "Element", element);
        const std::string id = CreateWssuId(element.get());
        EXPECT_TRUE(std::regex_match(
            id, std::regex("a[0-9a-f]{7}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}")))
            << id;
        ids.insert(id);
    }
    EXPECT_EQ(ids.size(), 100U);
}

TEST(CreateWssuId, KeepsIdUnderAnyPrefix)
{
    const Ref<ElementNode> element =
        Build(*ElementBuilder("p", "e", {{"u:Id", "mine"}, {"xmlns:u", WSU}}));
    EXPECT_EQ(CreateWssuId(element.get()), "mine");
    EXPECT_EQ(element->GetAttributes().size(), 2U);
}

// [SOAP Message Security 1.0, 8]
TEST(XMLSignedSoapBuilder, SignsBodyThenTimestamp)
{
    const FixedClock clock(Now);
    EXPECT_EQ(
        Neutralize(ToText(*PlainlySigned().Build())),
        "<soapenv:Envelope xmlns:soapenv=\"" SOAP "\"><soapenv:Header>"
        "<wsse:Security xmlns:wsse=\"" WSSE "\">"
        "<wsu:Timestamp xmlns:wsu=\"" WSU "\" wsu:Id=\"UUID\">"
        "<wsu:Created>2011-07-05T09:03:07.042Z</wsu:Created>"
        "<wsu:Expires>2011-07-05T09:13:07.042Z</wsu:Expires></wsu:Timestamp>"
        "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\""
        " Id=\"holderOfKeyProofSignature\"><ds:SignedInfo>"
        "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
        "<ds:SignatureMethod"
        " Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/>"
        "<ds:Reference URI=\"#UUID\"><ds:Transforms>"
        "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
        "</ds:Transforms><ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
        "<ds:DigestValue>DIGEST</ds:DigestValue></ds:Reference>"
        "<ds:Reference URI=\"#UUID\"><ds:Transforms>"
        "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
        "</ds:Transforms><ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
        "<ds:DigestValue>DIGEST</ds:DigestValue></ds:Reference>"
        "</ds:SignedInfo><ds:SignatureValue>SIGNATURE</ds:SignatureValue></ds:Signature>"
        "</wsse:Security></soapenv:Header>"
        "<soapenv:Body xmlns:wst=\"" WST "\" xmlns:wsu=\"" WSU "\" wsu:Id=\"UUID\">"
        "<wst:Request/></soapenv:Body></soapenv:Envelope>");
}

TEST(XMLSignedSoapBuilder, RefersToBodyFirst)
{
    const Ref<ElementNode> envelope = PlainlySigned().Build();
    const std::string bodyId = GetAttribute(envelope->FindChildElement("Body"), "wsu:Id");
    const std::string timestampId =
        GetAttribute(GetSecurity(*envelope)->FindChildElement("Timestamp"), "wsu:Id");
    EXPECT_NE(bodyId, timestampId);
    EXPECT_THAT(GetReferenceUris(*envelope), ElementsAre("#" + bodyId, "#" + timestampId));
}

TEST(XMLSignedSoapBuilder, VerifiesElsewhere)
{
    EXPECT_TRUE(Xmlsec1Verifies(ToText(*PlainlySigned().Build()), "client", RequestSignature));
}

TEST(XMLSignedSoapBuilder, DoesNotVerifyElsewhereOnceChanged)
{
    const std::string signedText = ToText(*PlainlySigned().Build());
    EXPECT_FALSE(Xmlsec1Verifies(signedText, "foreign", RequestSignature));
    for (const std::string part : {"<wst:Request/>", "</wsu:Created>", "</wsu:Expires>"}) {
        std::string changed = signedText;
        changed.insert(changed.find(part), " ");
        EXPECT_FALSE(Xmlsec1Verifies(changed, "client", RequestSignature)) << part;
    }
}

TEST(XMLSignedSoapBuilder, SignsAnewEachTime)
{
    const PlainlySigned builder;
    const Ref<ElementNode> first = builder.Build();
    const Ref<ElementNode> second = builder.Build();
    EXPECT_NE(GetReferenceUris(*first), GetReferenceUris(*second));
    EXPECT_NE(
        ToText(*GetSignature(*first)->FindChildElement("SignatureValue")),
        ToText(*GetSignature(*second)->FindChildElement("SignatureValue")));
}

TEST(XMLSignedSoapBuilder, WithoutBodySignsTheEmptyOne)
{
    const auto key = GetTestKey("client");
    const XMLSignedSoapBuilder builder(WsSecurityHeaderBuilder(10), nullptr, key.get(), nullptr);
    EXPECT_TRUE(Xmlsec1Verifies(ToText(*Build(builder)), "client", RequestSignature));
}

TEST(XMLSignedSoapBuilderDeathTest, StopsTheProcessWithoutHeader)
{
    EXPECT_DEATH(
        XMLSignedSoapBuilder(nullptr, nullptr, nullptr, nullptr),
        StopsAt("headerBuilder != __null", "xmlSoapBuilders:339"));
}

// Only the header is needed to make one; the key only when it is built.
TEST(XMLSignedSoapBuilder, ChecksNothingElseWhenItIsMade)
{
    const XMLSignedSoapBuilder builder(WsSecurityHeaderBuilder(10), nullptr, nullptr, nullptr);
    EXPECT_THROW(Build(builder), Quillon::InvalidArgumentException);
}

TEST(SignSoapMessage, KeepsIdsThatAreThere)
{
    const auto key = GetTestKey("client");
    const Ref<ElementNode> envelope =
        Build(*SoapBuilder(WsSecurityHeaderBuilder(10), ElementBuilder("wst", "Request")));
    ElementNode* const body = envelope->FindChildElement("Body");
    body->DefineAttribute("xmlns:wsu", WSU);
    body->DefineAttribute("wsu:Id", "theBody");
    SignSoapMessage(key.get(), nullptr, envelope.get());
    EXPECT_EQ(GetAttribute(body, "wsu:Id"), "theBody");
    EXPECT_EQ(GetReferenceUris(*envelope).front(), "#theBody");
    EXPECT_TRUE(Xmlsec1Verifies(ToText(*envelope), "client", RequestSignature));
}

TEST(SignSoapMessage, KeepsTheIdOfATimestampThatHasOne)
{
    const auto key = GetTestKey("client");
    const XMLBuilderPtr timestamp =
        ElementBuilder("u", "Timestamp", {{"xmlns:u", WSU}, {"u:Id", "theTimestamp"}});
    const XMLBuilderPtr security =
        Composite(ElementBuilder("wsse", "Security", {{"xmlns:wsse", WSSE}}), {timestamp});
    const Ref<ElementNode> envelope = Build(*SoapBuilder(security, nullptr));
    SignSoapMessage(key.get(), nullptr, envelope.get());
    const ElementNode* const signedOne = GetSecurity(*envelope)->FindChildElement("Timestamp");
    EXPECT_EQ(signedOne->GetAttributes().size(), 2U);
    EXPECT_EQ(GetReferenceUris(*envelope).back(), "#theTimestamp");
    EXPECT_TRUE(Xmlsec1Verifies(ToText(*envelope), "client", RequestSignature));
}

TEST(SignSoapMessage, SignsTheTimestampAndTheBodyOfTheRightNamespaces)
{
    const auto key = GetTestKey("client");
    const Ref<ElementNode> envelope = Build(*Composite(
        ElementBuilder("s", "Envelope", {{"xmlns:s", SOAP}, {"xmlns:x", "urn:x"}}),
        {ElementBuilder("x", "Header"),
         ElementBuilder("x", "Body", {{"Id", "wrongBody"}}),
         Composite(
             ElementBuilder("s", "Header"),
             {ElementBuilder("x", "Security"),
              Composite(
                  ElementBuilder("w", "Security", {{"xmlns:w", WSSE}, {"xmlns:u", WSU}}),
                  {ElementBuilder("x", "Timestamp", {{"u:Id", "wrongTimestamp"}}),
                   ElementBuilder("u", "Timestamp", {{"u:Id", "theTimestamp"}})})}),
         ElementBuilder("s", "Body", {{"xmlns:u", WSU}, {"u:Id", "theBody"}})}));
    SignSoapMessage(key.get(), nullptr, envelope.get());
    const ElementNode* const header = envelope->FindChildElement("Header", SOAP);
    const ElementNode* const security = header->FindChildElement("Security", WSSE);
    EXPECT_THAT(
        GetChildNames(*security), ElementsAre("x:Timestamp", "u:Timestamp", "ds:Signature"));
    const std::string text = ToText(*security->FindChildElement("Signature"));
    EXPECT_LT(text.find("URI=\"#theBody\""), text.find("URI=\"#theTimestamp\""));
    EXPECT_NE(text.find("URI=\"#theTimestamp\""), std::string::npos);
    EXPECT_EQ(text.find("wrong"), std::string::npos);
    EXPECT_TRUE(Xmlsec1Verifies(ToText(*envelope), "client", RequestSignature));
}

// Without a key that is asked for, a message would go out unsigned.
TEST(SignSoapMessage, RefusesToSignWithoutAKey)
{
    const Ref<ElementNode> envelope = Build(*SoapBuilder(WsSecurityHeaderBuilder(10), nullptr));
    EXPECT_THROW(
        SignSoapMessage(nullptr, nullptr, envelope.get()), Quillon::InvalidArgumentException);
    EXPECT_EQ(GetSignature(*envelope), nullptr);
}

TEST(SignSoapMessage, WithoutKeyInfoWritesNone)
{
    EXPECT_EQ(GetSignature(*PlainlySigned().Build())->FindChildElement("KeyInfo"), nullptr);
}

TEST(SignSoapMessage, RefusesKeyThatDoesNotFitTheMethod)
{
    const auto key = GetTestKey("sts-p256");
    const XMLSignedSoapBuilder builder(WsSecurityHeaderBuilder(10), nullptr, key.get(), nullptr);
    EXPECT_THROW(Build(builder), Quillon::Xml::Security::XmlSecurityException);
}

TEST(SignSoapMessageDeathTest, StopsTheProcessOnMissingPart)
{
    const auto expectDeath =
        [](const XMLBuilderPtr& envelope, const char* expression, const char* line) {
            const Ref<ElementNode> element = Build(*envelope);
            EXPECT_DEATH(
                SignSoapMessage(nullptr, nullptr, element.get()),
                StopsAt(expression, std::string("xmlSoapBuilders:") + line));
        };
    const AttributeMap soap{{"xmlns:s", SOAP}};
    expectDeath(
        Composite(
            ElementBuilder("s", "E", soap),
            {ElementBuilder("s", "Header"), ElementBuilder("x", "Body")}),
        "soapBody != __null",
        "169");
    expectDeath(
        Composite(
            ElementBuilder("s", "E", soap),
            {ElementBuilder("s", "Body"), ElementBuilder("x", "Header")}),
        "soapHeader != __null",
        "173");
    // Of several that are missing, the first in this order is reported.
    expectDeath(ElementBuilder("s", "E", soap), "soapBody != __null", "169");
    expectDeath(
        Composite(ElementBuilder("s", "E", soap), {ElementBuilder("s", "Body")}),
        "soapHeader != __null",
        "173");

    expectDeath(SoapBuilder(nullptr, nullptr), "wsseSecurity != __null", "177");
    expectDeath(
        SoapBuilder(ElementBuilder("x", "Security"), nullptr), "wsseSecurity != __null", "177");
}

TEST(CertRefSignedSoapBuilder, CarriesTheCertificateAndRefersToIt)
{
    const auto key = GetTestKey("client");
    const Ref<ElementNode> envelope = Build(*CertRefSignedSoapBuilder(
        WsSecurityHeaderBuilder(10), nullptr, key.get(), GetClientCertificate().get()));
    const ElementNode* const security = GetSecurity(*envelope);
    EXPECT_THAT(
        GetChildNames(*security),
        ElementsAre("wsu:Timestamp", "wsse:BinarySecurityToken", "ds:Signature"));
    EXPECT_EQ(
        GetAttribute(security->FindChildElement("BinarySecurityToken"), "wsu:Id"),
        "holderOfKeyCertificate");
    EXPECT_EQ(
        ToText(*GetSignature(*envelope)->FindChildElement("KeyInfo")),
        "<ds:KeyInfo><wsse:SecurityTokenReference xmlns:wsse=\"" WSSE "\">"
        "<wsse:Reference URI=\"#holderOfKeyCertificate\""
        " ValueType=\"" WSS "x509-token-profile-1.0#X509v3\"/>"
        "</wsse:SecurityTokenReference></ds:KeyInfo>");
    EXPECT_TRUE(Xmlsec1Verifies(ToText(*envelope), "client", RequestSignature));
}

TEST(CertRefSignedSoapBuilder, CarriesTheCertificateOfThePemFile)
{
    const auto key = GetTestKey("client");
    const std::string text = ToText(*Build(*CertRefSignedSoapBuilder(
        WsSecurityHeaderBuilder(10), nullptr, key.get(), GetClientCertificate().get())));
    std::string pem = ReadTestData("keys/client-cert.pem");
    pem = std::regex_replace(pem, std::regex("-----[A-Z ]+-----|\\s"), "");
    EXPECT_THAT(text, HasSubstr(">" + pem + "</wsse:BinarySecurityToken>"));
}

TEST(CertRefSignedSoapBuilderDeathTest, StopsTheProcessWithoutHeader)
{
    EXPECT_DEATH(
        CertRefSignedSoapBuilder(nullptr, nullptr, nullptr, nullptr),
        StopsAt("headerBuilder != __null", "xmlSoapBuilders:376"));
}

TEST(SamlRefSignedSoapBuilder, RefersToTheAssertion)
{
    const auto key = GetTestKey("client");
    const Ref<ElementNode> envelope = Build(*SamlRefSignedSoapBuilder(
        WsSecurityHeaderBuilder(10), nullptr, key.get(), "_the <assertion>"));
    EXPECT_THAT(
        GetChildNames(*GetSecurity(*envelope)), ElementsAre("wsu:Timestamp", "ds:Signature"));
    EXPECT_EQ(
        ToText(*GetSignature(*envelope)->FindChildElement("KeyInfo")),
        "<ds:KeyInfo><wsse:SecurityTokenReference wsse11:TokenType=\"http://docs.oasis-open.org/"
        "wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0\" xmlns:wsse=\"" WSSE
        "\" xmlns:wsse11=\"http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd\">"
        "<wsse:KeyIdentifier ValueType=\"http://docs.oasis-open.org/wss/"
        "oasis-wss-saml-token-profile-1.1#SAMLID\">_the &lt;assertion&gt;</wsse:KeyIdentifier>"
        "</wsse:SecurityTokenReference></ds:KeyInfo>");
    EXPECT_TRUE(Xmlsec1Verifies(ToText(*envelope), "client", RequestSignature));
}
