#include "ssoClient/protocol/xmlSpnego.h"

#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Failure.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "support/Xmlsec1.h"
#include "unit/ssoClient/message/builderText.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::HasSubstr;
using testing::MatchesRegex;
using testing::StartsWith;

namespace {

#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define WSS "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-"
#define EXCHANGE                                                                                   \
    "<wst:BinaryExchange EncodingType=\"" WSS "soap-message-security-1.0#Base64Binary\" "          \
    "ValueType=\"http://schemas.xmlsoap.org/ws/2005/02/trust/spnego\">"

constexpr char SamlType[] = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr char UnexpectedXml[] = "SsoException: Unexpected XML format";

const Leg Hello{'h', 'e', 'l', 'l', 'o'};

TokenSpec MakeSpec()
{
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    return spec;
}

std::string BuildInitial(SamlToken::ConfirmationType confirmation, const TokenSpec& spec)
{
    return ToText(*Build(XMLBodyBuilderInitialSPNego(confirmation, spec, Hello)));
}

std::string GetContext(const std::string& request)
{
    const std::string before = " Context=\"";
    const std::size_t start = request.find(before) + before.size();
    return request.substr(start, request.find('"', start) - start);
}

std::string Replaced(std::string text, const std::string& from, const std::string& to)
{
    return text.replace(text.find(from), from.size(), to);
}

} // namespace

// [WST13 8.4]
TEST(WstSPNegoBinExchangeBuilder, WritesTheLegInBase64)
{
    EXPECT_EQ(ToText(WstSPNegoBinExchangeBuilder(Hello)), EXCHANGE "aGVsbG8=</wst:BinaryExchange>");
}

TEST(WstSPNegoBinExchangeBuilder, WritesEveryByte)
{
    EXPECT_EQ(
        ToText(WstSPNegoBinExchangeBuilder(Leg{0x00, 0xff, 0x80, 0x3c})),
        EXCHANGE "AP+APA==</wst:BinaryExchange>");
}

TEST(WstSPNegoBinExchangeBuilder, WritesAnEmptyLegAsEmptyText)
{
    EXPECT_EQ(ToText(WstSPNegoBinExchangeBuilder(Leg())), EXCHANGE "</wst:BinaryExchange>");
}

TEST(XMLBodyBuilderInitialSPNego, AddsContextAndLegToTheIssueRequest)
{
    const FixedClock clock("2026-11-20T12:00:00Z");
    const std::string request = BuildInitial(SamlToken::CONFIRM_BEARER, MakeSpec());
    EXPECT_EQ(
        Replaced(request, GetContext(request), "ID"),
        "<wst:RequestSecurityToken xmlns:wst=\"" WST "\" Context=\"ID\">"
        "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
        "<wst:RequestType>" WST "/Issue</wst:RequestType>"
        "<wst:KeyType>" WST "/Bearer</wst:KeyType>"
        "<wst:Lifetime xmlns:wsu=\"" WSS "wssecurity-utility-1.0.xsd\">"
        "<wsu:Created>2026-11-20T12:00:00.000Z</wsu:Created>"
        "<wsu:Expires>2026-11-20T12:05:00.000Z</wsu:Expires></wst:Lifetime>"
        "<wst:Renewing Allow=\"false\" OK=\"false\"/>"
        "<wst:Delegatable>false</wst:Delegatable>" EXCHANGE
        "aGVsbG8=</wst:BinaryExchange></wst:RequestSecurityToken>");
}

TEST(XMLBodyBuilderInitialSPNego, PutsTheLegAfterTheReferenceToTheKey)
{
    EXPECT_THAT(
        BuildInitial(SamlToken::CONFIRM_HOLDER_OF_KEY, MakeSpec()),
        HasSubstr("<wst:UseKey Sig=\"holderOfKeyProofSignature\"/>" EXCHANGE "aGVsbG8="
                  "</wst:BinaryExchange></wst:RequestSecurityToken>"));
}

TEST(XMLBodyBuilderInitialSPNego, NamesItsNegotiationByAUuid)
{
    EXPECT_THAT(
        GetContext(BuildInitial(SamlToken::CONFIRM_BEARER, MakeSpec())),
        MatchesRegex("urn:uuid:[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-"
                     "[0-9a-f]{12}"));
}

TEST(XMLBodyBuilderInitialSPNego, NamesEveryBuildAnew)
{
    const XMLBodyBuilderInitialSPNego builder(SamlToken::CONFIRM_BEARER, MakeSpec(), Hello);
    EXPECT_NE(GetContext(ToText(*Build(builder))), GetContext(ToText(*Build(builder))));
}

// [WST13 8]
TEST(XMLBodyBuilderContinuedSPNego, SendsTheContextBackUnchanged)
{
    EXPECT_EQ(
        ToText(*Build(XMLBodyBuilderContinuedSPNego("a<b&\"c\" d", Hello))),
        "<wst:RequestSecurityTokenResponse Context=\"a&lt;b&amp;&quot;c&quot; d\">" EXCHANGE
        "aGVsbG8=</wst:BinaryExchange></wst:RequestSecurityTokenResponse>");
}

// ------------------------------------------------------------------------------------ the reply

namespace {

std::string Reply(const std::string& body)
{
    return "<S:Envelope xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\"><S:Body>" + body
           + "</S:Body></S:Envelope>";
}

std::string Response(const std::string& content, const std::string& context = " Context=\"ctx\"")
{
    return "<w:RequestSecurityTokenResponse xmlns:w=\"" WST "\"" + context + ">" + content
           + "</w:RequestSecurityTokenResponse>";
}

std::string Collection(const std::string& responses)
{
    return "<w:RequestSecurityTokenResponseCollection xmlns:w=\"" WST "\">" + responses
           + "</w:RequestSecurityTokenResponseCollection>";
}

std::string Exchange(const std::string& text)
{
    return "<w:BinaryExchange>" + text + "</w:BinaryExchange>";
}

std::string Token(const std::string& tokenType)
{
    return "<w:TokenType>" + tokenType
           + "</w:TokenType><w:RequestedSecurityToken><Assertion ID='_1'/>"
             "</w:RequestedSecurityToken>";
}

SPNegoResponse Handle(const std::string& reply)
{
    SPNegoResponse response;
    ResponseHandlerImpl().HandleSPNegoResponse(Quillon::CreateStringReader(reply).get(), response);
    return response;
}

std::string GetReplyFailure(const std::string& body)
{
    return GetFailure([&] { Handle(Reply(body)); });
}

constexpr char AssertionText[] = "<Assertion xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\" "
                                 "xmlns:w=\"" WST "\" ID=\"_1\"></Assertion>";

} // namespace

TEST(HandleSPNegoResponse, ReadsTheLegOfASingleResponse)
{
    const SPNegoResponse response = Handle(Reply(Response(Exchange("aGVsbG8="))));
    EXPECT_EQ(response.contextId, "ctx");
    EXPECT_EQ(response.leg, Hello);
    EXPECT_EQ(response.token, "");
}

TEST(HandleSPNegoResponse, ReadsTheLegOfACollection)
{
    const SPNegoResponse response = Handle(Reply(Collection(Response(Exchange("aGVsbG8=")))));
    EXPECT_EQ(response.contextId, "ctx");
    EXPECT_EQ(response.leg, Hello);
}

TEST(HandleSPNegoResponse, PrefersTheSingleResponse)
{
    const std::string other = Collection(Response(Exchange("b3RoZXI="), " Context=\"other\""));
    EXPECT_EQ(Handle(Reply(other + Response(Exchange("aGVsbG8=")))).contextId, "ctx");
    EXPECT_EQ(Handle(Reply(Response(Exchange("aGVsbG8=")) + other)).contextId, "ctx");
}

TEST(HandleSPNegoResponse, ReadsLegAndTokenTogether)
{
    const SPNegoResponse response =
        Handle(Reply(Collection(Response(Token(SamlType) + Exchange("aGVsbG8=")))));
    EXPECT_EQ(response.contextId, "ctx");
    EXPECT_EQ(response.leg, Hello);
    EXPECT_EQ(response.token, AssertionText);
}

TEST(HandleSPNegoResponse, ReadsATokenWithoutLeg)
{
    const SPNegoResponse response = Handle(Reply(Response(Token(SamlType))));
    EXPECT_TRUE(response.leg.empty());
    EXPECT_EQ(response.token, AssertionText);
}

TEST(HandleSPNegoResponse, KeepsAnEmptyContextForTheCallerToJudge)
{
    EXPECT_EQ(Handle(Reply(Response(Exchange("aGVsbG8="), " Context=\"\""))).contextId, "");
}

TEST(HandleSPNegoResponse, TakesAnEmptyExchangeForNoLeg)
{
    EXPECT_TRUE(Handle(Reply(Response("<w:BinaryExchange/>"))).leg.empty());
    EXPECT_TRUE(Handle(Reply(Response(Exchange("")))).leg.empty());
    EXPECT_TRUE(Handle(Reply(Response(Exchange("\n  \n")))).leg.empty());
}

TEST(HandleSPNegoResponse, SkipsWhiteSpaceInsideALeg)
{
    EXPECT_EQ(Handle(Reply(Response(Exchange("\n  aGVs\n  bG8=\n")))).leg, Hello);
}

TEST(HandleSPNegoResponse, ReplacesWhatTheResponseHeld)
{
    SPNegoResponse response{"old", {1}, "old"};
    ResponseHandlerImpl().HandleSPNegoResponse(
        Quillon::CreateStringReader(Reply(Response("<w:BinaryExchange/>"))).get(), response);
    EXPECT_EQ(response.contextId, "ctx");
    EXPECT_TRUE(response.leg.empty());
    EXPECT_EQ(response.token, "");
}

TEST(HandleSPNegoResponse, LeavesTheResponseAloneOnFailure)
{
    SPNegoResponse response{"old", {1}, "old"};
    EXPECT_THROW(
        ResponseHandlerImpl().HandleSPNegoResponse(
            Quillon::CreateStringReader(Reply(Response(Exchange("?")))).get(), response),
        Quillon::Exception);
    EXPECT_EQ(response.contextId, "old");
    EXPECT_EQ(response.leg, Leg{1});
    EXPECT_EQ(response.token, "old");
}

TEST(HandleSPNegoResponse, RefusesReplyWithoutResponse)
{
    EXPECT_EQ(GetReplyFailure(""), UnexpectedXml);
    EXPECT_EQ(GetReplyFailure(Collection("")), UnexpectedXml);
}

TEST(HandleSPNegoResponse, RefusesResponseWithoutContext)
{
    EXPECT_EQ(GetReplyFailure(Response(Exchange("aGVsbG8="), "")), UnexpectedXml);
    EXPECT_EQ(GetReplyFailure(Response(Exchange("aGVsbG8="), " w:Context=\"ctx\"")), UnexpectedXml);
}

TEST(HandleSPNegoResponse, RefusesResponseWithNeitherLegNorToken)
{
    EXPECT_EQ(GetReplyFailure(Response("<w:TokenType>x</w:TokenType>")), UnexpectedXml);
}

TEST(HandleSPNegoResponse, AcceptsARequestedTokenThatHoldsNoAssertion)
{
    EXPECT_EQ(Handle(Reply(Response("<w:RequestedSecurityToken/>"))).token, "");
}

TEST(HandleSPNegoResponse, RefusesLegThatIsNotBase64)
{
    for (const char* const text : {"aGVsbG8", "a", "aGVsbG8=x", "a?==", "aGVsbG9="}) {
        EXPECT_EQ(
            GetReplyFailure(Response(Exchange(text))), "SsoException: Base64 format exception")
            << text;
    }
}

TEST(HandleSPNegoResponse, TakesTheTextThatALegStartsWith)
{
    EXPECT_EQ(Handle(Reply(Response(Exchange("aGVsbG8=<!-- x -->")))).leg, Hello);
    EXPECT_EQ(Handle(Reply(Response(Exchange("aGVsbG8=<x/>b3RoZXI=")))).leg, Hello);
    EXPECT_EQ(Handle(Reply(Response(Exchange("aGVs<![CDATA[bG8=]]>")))).leg, Hello);
    EXPECT_EQ(
        GetReplyFailure(Response(Exchange("aGV<!-- x -->sbG8="))),
        "SsoException: Base64 format exception");
}

TEST(HandleSPNegoResponse, HasNoLegIfTheExchangeDoesNotStartWithText)
{
    for (const char* const content : {"<!-- x -->aGVsbG8=", "<x/>aGVsbG8=", "<x>?</x>"}) {
        EXPECT_TRUE(Handle(Reply(Response(Exchange(content)))).leg.empty()) << content;
    }
}

TEST(HandleSPNegoResponse, LooksAtTheFirstExchangeOnly)
{
    EXPECT_EQ(Handle(Reply(Response(Exchange("aGVsbG8=") + Exchange("b3RoZXI=")))).leg, Hello);
}

TEST(HandleSPNegoResponse, TakesALegOfAnyValueType)
{
    EXPECT_EQ(
        Handle(Reply(Response("<w:BinaryExchange ValueType='urn:foreign' EncodingType='urn:hex'>"
                              "aGVsbG8=</w:BinaryExchange>")))
            .leg,
        Hello);
}

TEST(HandleSPNegoResponse, TakesTheTextThatATokenTypeStartsWith)
{
    for (const char* const end : {"<!-- x -->", "<!-- x -->#other", "<x/>"}) {
        EXPECT_EQ(Handle(Reply(Response(Token(std::string(SamlType) + end)))).token, AssertionText)
            << end;
    }
    EXPECT_EQ(
        GetReplyFailure(Response(Token(std::string("<!-- x -->") + SamlType))),
        "SsoException: Invalid token type:  (expected: urn:oasis:names:tc:SAML:2.0:assertion");
}

TEST(HandleSPNegoResponse, RefusesAnyOtherTokenType)
{
    const std::string profile =
        "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0";
    EXPECT_EQ(
        GetReplyFailure(Response(Token(profile))),
        "SsoException: Invalid token type: " + profile
            + " (expected: urn:oasis:names:tc:SAML:2.0:assertion");
    EXPECT_THAT(
        GetReplyFailure(Response(Token(std::string(SamlType) + " "))),
        StartsWith("SsoException: Invalid token type: "));
    EXPECT_EQ(
        GetReplyFailure(
            Response("<w:RequestedSecurityToken><Assertion/></w:RequestedSecurityToken>")),
        "SsoException: Invalid token type:  (expected: urn:oasis:names:tc:SAML:2.0:assertion");
}

TEST(HandleSPNegoResponse, ChecksContextThenLegThenTokenType)
{
    EXPECT_EQ(GetReplyFailure(Response(Exchange("?") + Token("x"), "")), UnexpectedXml);
    EXPECT_EQ(
        GetReplyFailure(Response(Exchange("?") + Token("x"))),
        "SsoException: Base64 format exception");
}

TEST(HandleSPNegoResponse, LooksForAFaultFirst)
{
    EXPECT_EQ(
        GetReplyFailure(
            Response("")
            + "<S:Fault><faultcode xmlns:t=\"" WST
              "\">t:FailedAuthentication</faultcode><faultstring>no "
              "ticket</faultstring></S:Fault>"),
        "InvalidCredentialsException: Authentication failed: no ticket");
}

TEST(HandleSPNegoResponse, GivesAnAssertionWhoseSignatureStillVerifies)
{
    const std::string assertion = ReadTestData("tokens/accepted/bearer.xml");
    const SPNegoResponse response = Handle(Reply(Response(
        std::string("<w:TokenType>") + SamlType + "</w:TokenType><w:RequestedSecurityToken>"
        + assertion + "</w:RequestedSecurityToken>")));
    EXPECT_TRUE(Xmlsec1Verifies(response.token, "sts", AssertionSignature));
}
