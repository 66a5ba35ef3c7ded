#include "ssoClient/message/xmlRequestBuilders.h"

#include "builderText.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"
#include "support/RunningClock.h"

#include <gmock/gmock.h>

#include <limits>

using namespace SsoClient;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;

namespace {

#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define WSSE "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"
#define WSU "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd"

constexpr char Lifetime300[] = "<wst:Lifetime xmlns:wsu=\"" WSU "\">"
                               "<wsu:Created>2011-07-05T09:03:07.042Z</wsu:Created>"
                               "<wsu:Expires>2011-07-05T09:08:07.042Z</wsu:Expires>"
                               "</wst:Lifetime>";

TokenSpec MinimalSpec()
{
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    return spec;
}

std::vector<std::string> GetChildNames(const XMLBuilderPtr& builder)
{
    std::vector<std::string> names;
    const auto element = Build(*builder);
    for (const auto* child = element->GetFirstChild(); child; child = child->GetNextSibling()) {
        names.emplace_back(Quillon::Xml::AsElement(child)->GetName());
    }
    return names;
}

} // namespace

TEST(WssuLifetimeBuilder, WritesCreationAndExpiry)
{
    const FixedClock clock(Now);
    EXPECT_EQ(ToText(WssuLifetimeBuilder(300)), Lifetime300);
}

TEST(WssuLifetimeBuilder, OfZeroSecondsExpiresAtCreation)
{
    const FixedClock clock(Now);
    EXPECT_EQ(
        ToText(WssuLifetimeBuilder(0)),
        "<wst:Lifetime xmlns:wsu=\"" WSU "\">"
        "<wsu:Created>2011-07-05T09:03:07.042Z</wsu:Created>"
        "<wsu:Expires>2011-07-05T09:03:07.042Z</wsu:Expires>"
        "</wst:Lifetime>");
}

TEST(WssuLifetimeBuilder, IsExactBeyond32BitsOfMicroseconds)
{
    const FixedClock clock(Now);
    // 3000000 s are 34 days, 17 hours and 20 minutes.
    EXPECT_THAT(
        ToText(WssuLifetimeBuilder(3'000'000)), HasSubstr("Expires>2011-08-09T02:23:07.042Z<"));
}

TEST(WssuLifetimeBuilder, KeepsTheTimeOfItsCreation)
{
    XMLBuilderPtr builder;
    {
        const FixedClock clock(Now);
        builder = WssuLifetimeBuilder(300);
    }
    const FixedClock later("2012-01-01T00:00:00Z");
    EXPECT_EQ(ToText(builder), Lifetime300);
}

TEST(WssuLifetimeBuilder, RefusesWhatNoDateCanHold)
{
    const FixedClock clock(Now);
    constexpr long long Max = std::numeric_limits<long long>::max();
    EXPECT_THROW(WssuLifetimeBuilder(Max), Quillon::InvalidArgumentException);
    EXPECT_THROW(WssuLifetimeBuilder(Max / 1'000'000), Quillon::InvalidArgumentException);
    // Wrapped to 64 bits, these would be 448384 microseconds.
    EXPECT_THROW(WssuLifetimeBuilder(18'446'744'073'710), Quillon::InvalidArgumentException);
    EXPECT_THROW(WssuLifetimeBuilder(-Max), Quillon::InvalidArgumentException);
}

TEST(WssuLifetimeBuilder, ReadsTheClockOnce)
{
    const RunningClock clock(Now);
    EXPECT_EQ(ToText(WssuLifetimeBuilder(300)), Lifetime300);
}

TEST(WstRenewingBuilder, NeverAsksForRenewalAfterExpiry)
{
    EXPECT_EQ(ToText(WstRenewingBuilder(true)), R"(<wst:Renewing Allow="true" OK="false"/>)");
    EXPECT_EQ(ToText(WstRenewingBuilder(false)), R"(<wst:Renewing Allow="false" OK="false"/>)");
}

TEST(WstDelegateToBuilder, HoldsUserNameWithoutPassword)
{
    EXPECT_EQ(
        ToText(WstDelegateToBuilder("proxy")),
        "<wst:DelegateTo><wsse:UsernameToken xmlns:wsse=\"" WSSE "\">"
        "<wsse:Username>proxy</wsse:Username></wsse:UsernameToken></wst:DelegateTo>");
}

TEST(WsaEndpointAddressReferenceBuilder, HoldsTheAddress)
{
    EXPECT_EQ(
        ToText(WsaEndpointAddressReferenceBuilder("urn:a")),
        "<wsa:EndpointReference><wsa:Address>urn:a</wsa:Address></wsa:EndpointReference>");
}

TEST(WstParticipantBuilder, HoldsTheReference)
{
    EXPECT_EQ(
        ToText(WstParticipantBuilder("urn:a")),
        "<wst:Participant><wsa:EndpointReference><wsa:Address>urn:a</wsa:Address>"
        "</wsa:EndpointReference></wst:Participant>");
}

// [WST13 9.5]
TEST(WstParticipantsBuilders, WritesParticipantsInStringOrder)
{
    EXPECT_EQ(
        ToText(WstParticipantsBuilders({"b", "a"})),
        "<wst:Participants xmlns:wsa=\"http://www.w3.org/2005/08/addressing\">"
        "<wst:Participant><wsa:EndpointReference><wsa:Address>a</wsa:Address>"
        "</wsa:EndpointReference></wst:Participant>"
        "<wst:Participant><wsa:EndpointReference><wsa:Address>b</wsa:Address>"
        "</wsa:EndpointReference></wst:Participant>"
        "</wst:Participants>");
}

TEST(RsaAttributeBuilder, WritesValuesInOrder)
{
    EXPECT_EQ(
        ToText(RsaAttributeBuilder({"urn:n", {"y", "x"}})),
        "<rsa-advice:Attribute Name=\"urn:n\">"
        "<rsa-advice:AttributeValue xsi:type=\"xs:string\">y</rsa-advice:AttributeValue>"
        "<rsa-advice:AttributeValue xsi:type=\"xs:string\">x</rsa-advice:AttributeValue>"
        "</rsa-advice:Attribute>");
}

TEST(RsaAttributeBuilder, WithoutValuesIsEmpty)
{
    EXPECT_EQ(ToText(RsaAttributeBuilder({"urn:n", {}})), "<rsa-advice:Attribute Name=\"urn:n\"/>");
}

TEST(RsaAdviceBuilder, WritesAttributesInOrder)
{
    EXPECT_EQ(
        ToText(RsaAdviceBuilder({"urn:s", {{"b", {}}, {"a", {}}}})),
        "<rsa-advice:Advice AdviceSource=\"urn:s\">"
        "<rsa-advice:Attribute Name=\"b\"/><rsa-advice:Attribute Name=\"a\"/>"
        "</rsa-advice:Advice>");
}

TEST(RsaAdviceSetBuilder, DeclaresItsNamespacesAndKeepsTheOrder)
{
    EXPECT_EQ(
        ToText(RsaAdviceSetBuilder({{"urn:2", {}}, {"urn:1", {}}})),
        "<rsa-advice:AdviceSet"
        " xmlns:rsa-advice=\"http://www.rsa.com/names/2009/12/std-ext/WS-Trust1.4/advice\""
        " xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\""
        " xmlns:xs=\"http://www.w3.org/2001/XMLSchema\""
        " xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\">"
        "<rsa-advice:Advice AdviceSource=\"urn:2\"/><rsa-advice:Advice AdviceSource=\"urn:1\"/>"
        "</rsa-advice:AdviceSet>");
}

// [WST13 4.1]
TEST(CommonAcquireSecurityTokenBuilder, OfMinimalSpecHasSixChildren)
{
    const FixedClock clock(Now);
    EXPECT_EQ(
        ToText(CommonAcquireSecurityTokenBuilder(SamlToken::CONFIRM_BEARER, MinimalSpec())),
        std::string("<wst:RequestSecurityToken xmlns:wst=\"" WST "\">"
                    "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
                    "<wst:RequestType>" WST "/Issue</wst:RequestType>"
                    "<wst:KeyType>" WST "/Bearer</wst:KeyType>")
            + Lifetime300
            + "<wst:Renewing Allow=\"false\" OK=\"false\"/>"
              "<wst:Delegatable>false</wst:Delegatable>"
              "</wst:RequestSecurityToken>");
}

TEST(CommonAcquireSecurityTokenBuilder, OfFullSpecKeepsTheOrder)
{
    TokenSpec spec = MinimalSpec();
    spec.renewable = true;
    spec.delegable = true;
    spec.delegateTo = "proxy";
    spec.audienceRestriction = {"aud"};
    spec.advice = {{"urn:s", {{"urn:n", {"v"}}}}};
    const FixedClock clock(Now);
    EXPECT_EQ(
        ToText(CommonAcquireSecurityTokenBuilder(SamlToken::CONFIRM_HOLDER_OF_KEY, spec)),
        std::string("<wst:RequestSecurityToken xmlns:wst=\"" WST "\">"
                    "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
                    "<wst:RequestType>" WST "/Issue</wst:RequestType>"
                    "<wst:KeyType>" WST "/PublicKey</wst:KeyType>")
            + Lifetime300
            + "<wst:Renewing Allow=\"true\" OK=\"false\"/>"
              "<wst:Delegatable>true</wst:Delegatable>"
              "<wst:DelegateTo><wsse:UsernameToken xmlns:wsse=\"" WSSE "\">"
              "<wsse:Username>proxy</wsse:Username></wsse:UsernameToken></wst:DelegateTo>"
              "<wst:Participants xmlns:wsa=\"http://www.w3.org/2005/08/addressing\">"
              "<wst:Participant><wsa:EndpointReference><wsa:Address>aud</wsa:Address>"
              "</wsa:EndpointReference></wst:Participant></wst:Participants>"
              "<rsa-advice:AdviceSet"
              " xmlns:rsa-advice=\"http://www.rsa.com/names/2009/12/std-ext/WS-Trust1.4/advice\""
              " xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\""
              " xmlns:xs=\"http://www.w3.org/2001/XMLSchema\""
              " xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\">"
              "<rsa-advice:Advice AdviceSource=\"urn:s\"><rsa-advice:Attribute Name=\"urn:n\">"
              "<rsa-advice:AttributeValue xsi:type=\"xs:string\">v</rsa-advice:AttributeValue>"
              "</rsa-advice:Attribute></rsa-advice:Advice></rsa-advice:AdviceSet>"
              "</wst:RequestSecurityToken>");
}

TEST(CommonAcquireSecurityTokenBuilderDeathTest, StopsTheProcessOnUnknownConfirmation)
{
    EXPECT_DEATH(
        CommonAcquireSecurityTokenBuilder(
            static_cast<SamlToken::ConfirmationType>(2), MinimalSpec()),
        StopsAt("false", "xmlRequestBuilders:379"));
}

TEST(AcquireSecurityTokenBuilder, OfHolderOfKeyEndsWithUseKey)
{
    TokenSpec spec = MinimalSpec();
    spec.advice = {{"urn:s", {}}};
    const std::string text =
        ToText(AcquireSecurityTokenBuilder(SamlToken::CONFIRM_HOLDER_OF_KEY, spec));
    EXPECT_THAT(
        text,
        testing::EndsWith("</rsa-advice:AdviceSet>"
                          "<wst:UseKey Sig=\"holderOfKeyProofSignature\"/>"
                          "</wst:RequestSecurityToken>"));
}

TEST(AcquireSecurityTokenBuilder, OfDelegatedHolderOfKeyHasNoUseKey)
{
    TokenSpec spec = MinimalSpec();
    spec.delegateTo = "proxy";
    EXPECT_THAT(
        GetChildNames(AcquireSecurityTokenBuilder(SamlToken::CONFIRM_HOLDER_OF_KEY, spec)),
        ElementsAre(
            "wst:TokenType",
            "wst:RequestType",
            "wst:KeyType",
            "wst:Lifetime",
            "wst:Renewing",
            "wst:Delegatable",
            "wst:DelegateTo"));
}

// Whether there is a delegate decides, not whether it has a name.
TEST(AcquireSecurityTokenBuilder, OfEmptyDelegateIsDelegated)
{
    TokenSpec spec = MinimalSpec();
    spec.delegateTo = "";
    const auto request =
        Build(*AcquireSecurityTokenBuilder(SamlToken::CONFIRM_HOLDER_OF_KEY, spec));
    ASSERT_NE(request->FindChildElement("DelegateTo"), nullptr);
    EXPECT_EQ(
        ToText(*request->FindChildElement("DelegateTo")),
        "<wst:DelegateTo><wsse:UsernameToken xmlns:wsse=\"" WSSE "\">"
        "<wsse:Username></wsse:Username></wsse:UsernameToken></wst:DelegateTo>");
    EXPECT_EQ(request->FindChildElement("UseKey"), nullptr);
}

TEST(AcquireSecurityTokenBuilder, OfBearerHasNoUseKey)
{
    EXPECT_THAT(
        GetChildNames(AcquireSecurityTokenBuilder(SamlToken::CONFIRM_BEARER, MinimalSpec())),
        ElementsAre(
            "wst:TokenType",
            "wst:RequestType",
            "wst:KeyType",
            "wst:Lifetime",
            "wst:Renewing",
            "wst:Delegatable"));
}

TEST(ExchangeSecurityTokenBuilder, OfHolderOfKeyHasNoUseKey)
{
    const auto element =
        Build(*ExchangeSecurityTokenBuilder(SamlToken::CONFIRM_HOLDER_OF_KEY, MinimalSpec()));
    EXPECT_EQ(element->FindChildElement("UseKey"), nullptr);
    EXPECT_EQ(
        ToText(*element->FindChildElement("KeyType")),
        "<wst:KeyType>" WST "/PublicKey</wst:KeyType>");
}

// [WST13 5]
TEST(RenewSecurityTokenBuilder, HoldsTheToken)
{
    FakeSamlToken token;
    token.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
    token.xml = "<a:A xmlns:a=\"urn:a\"/>";
    const FixedClock clock(Now);
    EXPECT_EQ(
        ToText(RenewSecurityTokenBuilder(token, 300)),
        std::string("<wst:RequestSecurityToken xmlns:wst=\"" WST "\">"
                    "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
                    "<wst:RequestType>" WST "/Renew</wst:RequestType>")
            + Lifetime300
            + "<wst:RenewTarget><a:A xmlns:a=\"urn:a\"/></wst:RenewTarget>"
              "</wst:RequestSecurityToken>");
}

TEST(RenewSecurityTokenBuilder, RefusesTokenThatIsNotXml)
{
    FakeSamlToken token;
    token.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
    token.xml = "not XML";
    EXPECT_THROW(RenewSecurityTokenBuilder(token, 300), Quillon::Xml::XMLParseException);
}

TEST(RenewSecurityTokenBuilderDeathTest, StopsTheProcessOnBearerToken)
{
    FakeSamlToken token;
    token.xml = "<A/>";
    EXPECT_DEATH(
        RenewSecurityTokenBuilder(token, 300),
        StopsAt(
            "token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY",
            "xmlRequestBuilders:513"));
}

// [WST13 7]
TEST(ValidateSecurityTokenBuilder, HoldsTheToken)
{
    FakeSamlToken token;
    token.xml = "<a:A xmlns:a=\"urn:a\"/>";
    EXPECT_EQ(
        ToText(ValidateSecurityTokenBuilder(token)),
        "<wst:RequestSecurityToken xmlns:wst=\"" WST "\">"
        "<wst:TokenType>" WST "/RSTR/Status</wst:TokenType>"
        "<wst:RequestType>" WST "/Validate</wst:RequestType>"
        "<wst:ValidateTarget><a:A xmlns:a=\"urn:a\"/></wst:ValidateTarget>"
        "</wst:RequestSecurityToken>");
}
