#include "Harness.h"
#include "Requests.h"
#include "SignedRequests.h"

namespace DevStsTests {

namespace {

using Texts = std::vector<std::string>;

std::string Body(const std::string& extras = "", const std::string& keyType = "PublicKey")
{
    return IssueBody(keyType, extras);
}

std::string Delegable(const std::string& body)
{
    return Replaced(body, "Delegatable>false", "Delegatable>true");
}

std::string Renewable(const std::string& body)
{
    return Replaced(body, "Allow=\"false\"", "Allow=\"true\"");
}

std::string Participants(const std::string& address)
{
    return "<wst:Participants xmlns:wsa=\"http://www.w3.org/2005/08/addressing\">"
           "<wst:Participant><wsa:EndpointReference><wsa:Address>"
           + address
           + "</wsa:Address></wsa:EndpointReference></wst:Participant></wst:Participants>";
}

std::string ExchangeTemplate(const std::string& assertion, const std::string& body)
{
    return SignatureTemplate(
        assertion, body, SamlReference(FindOne(assertion, "/saml:Assertion/@ID")));
}

class ExchangeToken : public ServerTest
{
protected:
    /** Alice's token, bound to the key of `identity`. */
    std::string HolderOfKeyToken(const std::string& body, const Identity& identity = Client())
    {
        const std::string request = Replaced(
            CertificateTemplate(AlicesPassword(), body, identity),
            "</wst:RequestSecurityToken>",
            std::string(UseKey) + "</wst:RequestSecurityToken>");
        return AssertionIn(PostIssue(Sign(request, identity)).body);
    }

    std::string BearerToken(const std::string& body)
    {
        return AssertionIn(PostIssue(Envelope(AlicesPassword(), body)).body);
    }

    HttpResult Exchange(
        const std::string& assertion, const std::string& body, const Identity& identity = Client())
    {
        return PostIssue(Sign(ExchangeTemplate(assertion, body), identity));
    }
};

TEST_F(ExchangeToken, HolderGetsTokenBoundToTheSameKey)
{
    const std::string token = HolderOfKeyToken(Body(), Stranger());
    const HttpResult result = Exchange(token, Body(), Stranger());
    ASSERT_EQ(result.status, 200) << result.body;
    const std::string fresh = AssertionIn(result.body);
    EXPECT_EQ(FindOne(fresh, "//saml:Subject/saml:NameID"), "alice@example.test");
    EXPECT_EQ(
        FindOne(fresh, "//saml:SubjectConfirmationData//ds:X509Certificate"), Base64Of(Stranger()));
    EXPECT_NE(FindOne(fresh, "/saml:Assertion/@ID"), FindOne(token, "/saml:Assertion/@ID"));
    EXPECT_TRUE(VerifiesWithXmlSec(fresh));
}

TEST_F(ExchangeToken, AnotherKeyIsFailedCheck)
{
    const std::string token = HolderOfKeyToken(Body(), Stranger());
    EXPECT_EQ(
        FaultText(Exchange(token, Body(), Client()), "wsse:FailedCheck"),
        "The signature of the message does not verify");
}

TEST_F(ExchangeToken, UnsignedRequestIsRefused)
{
    const HttpResult result = PostIssue(Envelope(HolderOfKeyToken(Body()), Body()));
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), "Presenting a token needs a signed request");
}

TEST_F(ExchangeToken, ChangedTokenIsInvalidSecurityToken)
{
    const std::string token =
        Replaced(HolderOfKeyToken(Body()), ">alice@example.test<", ">bob@example.test<");
    EXPECT_EQ(
        FaultText(Exchange(token, Body()), "wst:InvalidSecurityToken"),
        "The presented token is refused: The signature of the token does not verify");
}

TEST_F(ExchangeToken, SelfMadeTokenIsInvalidSecurityToken)
{
    // Signed as a token of the STS is, but by the client's own key.
    const TempDir dir;
    const std::string honest = HolderOfKeyToken(Body());
    WriteText(dir.Path() / "token.xml", honest);
    const CommandResult resigned = RunCommand(
        std::string(XMLSEC1_PROGRAM) + " --sign --privkey-pem " + Client().key.string()
        + " --id-attr:ID " + Ns::Saml + ":Assertion --output "
        + (dir.Path() / "forged.xml").string() + " " + (dir.Path() / "token.xml").string());
    ASSERT_EQ(resigned.exitCode, 0) << resigned.output;
    const std::string forged = AssertionIn(ReadText(dir.Path() / "forged.xml"));
    ASSERT_NE(FindOne(forged, "//ds:SignatureValue"), FindOne(honest, "//ds:SignatureValue"));
    EXPECT_EQ(
        FaultText(Exchange(forged, Body()), "wst:InvalidSecurityToken"),
        "The presented token is refused: The signature of the token does not verify");
}

TEST_F(ExchangeToken, UnsignedTokenIsInvalidSecurityToken)
{
    std::string token = HolderOfKeyToken(Body());
    const std::string end = "</ds:Signature>";
    const std::size_t from = token.find("<ds:Signature ");
    token.erase(from, token.find(end) + end.size() - from);
    EXPECT_EQ(
        FaultText(Exchange(token, Body()), "wst:InvalidSecurityToken"),
        "The presented token is refused: Expected element 'Signature' of namespace '"
            + std::string(Ns::Ds) + "' under 'Assertion', found 'Subject'");
}

TEST_F(ExchangeToken, ReferenceToAnotherTokenIsRefused)
{
    const std::string token = HolderOfKeyToken(Body());
    const HttpResult result =
        PostIssue(Sign(SignatureTemplate(token, Body(), SamlReference("_other"))));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidRequest"),
        "The signature names the assertion '_other', not the presented '"
            + FindOne(token, "/saml:Assertion/@ID") + "'");
}

TEST_F(ExchangeToken, CertificateReferenceIsRefused)
{
    const HttpResult result = PostIssue(Sign(SignatureTemplate(
        HolderOfKeyToken(Body()) + BinaryToken(Client()), Body(), CertificateReference())));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidRequest"),
        "Element 'SecurityTokenReference' has no attribute 'TokenType'");
}

TEST_F(ExchangeToken, ExpiredTokenIsInvalidSecurityToken)
{
    const std::string token = HolderOfKeyToken(Replaced(Body(), "13:00:00.001Z", "12:08:00Z"));
    _now = StartTime() + std::chrono::minutes(8);
    EXPECT_EQ(
        FaultText(Exchange(token, Body()), "wst:InvalidSecurityToken"),
        "The presented token is refused: The token has expired at 2026-11-20T12:08:00.000Z");
}

TEST_F(ExchangeToken, NewTokenEndsNoLater)
{
    const std::string token = HolderOfKeyToken(Replaced(Body(), "13:00:00.001Z", "12:30:00Z"));
    EXPECT_EQ(
        FindOne(Exchange(token, Body()).body, "//saml:Conditions/@NotOnOrAfter"),
        "2026-11-20T12:30:00.000Z");
}

TEST_F(ExchangeToken, DelegationChainGrowsAndCountShrinks)
{
    const std::string token = HolderOfKeyToken(Delegable(Body()));
    const std::string first =
        AssertionIn(Exchange(token, Delegable(Body(DelegateTo("service@example.test")))).body);
    const std::string delegates = "//del:Delegate/saml:NameID";
    EXPECT_EQ(Find(first, delegates), Texts{"service@example.test"});
    EXPECT_EQ(FindOne(first, "//saml:ProxyRestriction/@Count"), "9");

    const std::string second = AssertionIn(
        Exchange(first, Delegable(Body(DelegateTo("bob@example.test"), "Bearer"))).body);
    EXPECT_EQ(Find(second, delegates), (Texts{"service@example.test", "bob@example.test"}));
    EXPECT_EQ(FindOne(second, "//saml:SubjectConfirmation/saml:NameID"), "bob@example.test");
    EXPECT_EQ(FindOne(second, "//saml:ProxyRestriction/@Count"), "8");
    EXPECT_EQ(FindOne(second, "//saml:Subject/saml:NameID"), "alice@example.test");
}

TEST_F(ExchangeToken, ReissueKeepsTheChain)
{
    const std::string token = HolderOfKeyToken(Delegable(Body()));
    const std::string first =
        AssertionIn(Exchange(token, Body(DelegateTo("service@example.test"))).body);
    const std::string second = AssertionIn(Exchange(first, Body()).body);
    EXPECT_EQ(Find(second, "//del:Delegate/saml:NameID"), Texts{"service@example.test"});
    EXPECT_EQ(FindOne(second, "//saml:SubjectConfirmation/saml:NameID"), "service@example.test");
}

TEST_F(ExchangeToken, TokenThatIsNotDelegableIsNotDelegated)
{
    const HttpResult result =
        Exchange(HolderOfKeyToken(Body()), Body(DelegateTo("service@example.test")));
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), "The presented token may not be delegated");
}

TEST_F(ExchangeToken, RightsOfThePresentedTokenDoNotGrow)
{
    const HttpResult result = Exchange(HolderOfKeyToken(Body()), Renewable(Delegable(Body())));
    ASSERT_EQ(result.status, 200) << result.body;
    EXPECT_TRUE(Find(result.body, "//saml:ProxyRestriction").empty());
    EXPECT_TRUE(Find(result.body, "//saml:Condition").empty());
}

TEST_F(ExchangeToken, RenewableTokenStaysRenewable)
{
    const HttpResult result = Exchange(HolderOfKeyToken(Renewable(Body())), Renewable(Body()));
    EXPECT_EQ(FindOne(result.body, "//saml:Condition/@Count"), "10");
}

TEST_F(ExchangeToken, AudienceIsKept)
{
    const HttpResult result =
        Exchange(HolderOfKeyToken(Body(Participants("https://a.test"))), Body());
    EXPECT_EQ(FindOne(result.body, "//saml:Audience"), "https://a.test");
}

TEST_F(ExchangeToken, WiderAudienceIsRefused)
{
    const HttpResult result = Exchange(
        HolderOfKeyToken(Body(Participants("https://a.test"))),
        Body(Participants("https://b.test")));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidScope"),
        "The audience goes beyond that of the presented token");
}

TEST_F(ExchangeToken, BearerTokenIsTakenFromKnownSolutionUser)
{
    const HttpResult result = Exchange(BearerToken(Body("", "Bearer")), Body());
    ASSERT_EQ(result.status, 200) << result.body;
    EXPECT_EQ(
        FindOne(result.body, "//saml:SubjectConfirmationData//ds:X509Certificate"),
        Base64Of(Client()));
}

TEST_F(ExchangeToken, BearerTokenIsNotTakenFromStranger)
{
    const HttpResult result = Exchange(BearerToken(Body("", "Bearer")), Body(), Stranger());
    EXPECT_EQ(
        FaultText(result, "wsse:FailedCheck"),
        "The message is not signed by any user whose certificate is known");
}

TEST_F(ExchangeToken, BearerTokenForAnotherDelegateIsRefused)
{
    const HttpResult result =
        Exchange(BearerToken(Body(DelegateTo("bob@example.test"), "Bearer")), Body());
    EXPECT_EQ(
        FaultText(result, "wst:FailedAuthentication"),
        "The token is for 'bob@example.test', not for 'service@example.test'");
}

TEST_F(ExchangeToken, PasswordBesideTokenIsRefused)
{
    const std::string token = HolderOfKeyToken(Body());
    const HttpResult result = PostIssue(Sign(SignatureTemplate(
        AlicesPassword() + token, Body(), SamlReference(FindOne(token, "/saml:Assertion/@ID")))));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidRequest"), "The request carries both a password and a token");
}

} // namespace

} // namespace DevStsTests
