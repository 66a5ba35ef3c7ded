#include "Harness.h"
#include "Requests.h"

namespace DevStsTests {

namespace {

using IssuedToken = ServerTest;
using Texts = std::vector<std::string>;

constexpr const char* Upn = SSOCLIENT_CLAIMS_AUTHORITY "/claims/UPN";

std::string AttributeValues(const std::string& name)
{
    return "//saml:AttributeStatement/saml:Attribute[@Name='" + name + "']/saml:AttributeValue";
}

TEST_F(IssuedToken, RootCarriesVersionIdAndInstantOnly)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_EQ(Find(assertion, "/saml:Assertion/@*").size(), 3U);
    EXPECT_EQ(FindOne(assertion, "/saml:Assertion/@Version"), "2.0");
    EXPECT_EQ(FindOne(assertion, "/saml:Assertion/@IssueInstant"), "2026-11-20T12:00:00.000Z");
    EXPECT_EQ(FindOne(assertion, "/saml:Assertion/@ID").size(), 33U);
    EXPECT_EQ(FindOne(assertion, "/saml:Assertion/@ID").front(), '_');
}

TEST_F(IssuedToken, IdsDiffer)
{
    const std::string first = PostIssue(PasswordRequest()).body;
    const std::string second = PostIssue(PasswordRequest()).body;
    EXPECT_NE(FindOne(first, "//saml:Assertion/@ID"), FindOne(second, "//saml:Assertion/@ID"));
}

TEST_F(IssuedToken, PartsStandInOrder)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_EQ(
        Find(
            assertion,
            "/saml:Assertion[saml:Issuer/following-sibling::*[1][self::ds:Signature]"
            "/following-sibling::*[1][self::saml:Subject]"
            "/following-sibling::*[1][self::saml:Conditions]"
            "/following-sibling::*[1][self::saml:AuthnStatement]"
            "/following-sibling::*[1][self::saml:AttributeStatement][not(following-sibling::*)]]")
            .size(),
        1U);
}

TEST_F(IssuedToken, SignatureUsesTheNarrowProfile)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    const std::string info = "/saml:Assertion/ds:Signature/ds:SignedInfo";
    EXPECT_EQ(
        FindOne(assertion, info + "/ds:CanonicalizationMethod/@Algorithm"),
        "http://www.w3.org/2001/10/xml-exc-c14n#");
    EXPECT_EQ(
        FindOne(assertion, info + "/ds:SignatureMethod/@Algorithm"),
        "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256");
    EXPECT_EQ(
        FindOne(assertion, info + "/ds:Reference/@URI"),
        "#" + FindOne(assertion, "/saml:Assertion/@ID"));
    EXPECT_EQ(
        Find(assertion, info + "/ds:Reference/ds:Transforms/ds:Transform/@Algorithm"),
        (Texts{
            "http://www.w3.org/2000/09/xmldsig#enveloped-signature",
            "http://www.w3.org/2001/10/xml-exc-c14n#"}));
    EXPECT_EQ(
        FindOne(assertion, info + "/ds:Reference/ds:DigestMethod/@Algorithm"),
        "http://www.w3.org/2001/04/xmlenc#sha256");
    EXPECT_EQ(
        Find(assertion, "/saml:Assertion/ds:Signature/ds:KeyInfo/ds:X509Data/ds:X509Certificate")
            .size(),
        1U);
}

TEST_F(IssuedToken, BearerSubjectIsConfirmedUntilTheEnd)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_EQ(FindOne(assertion, "//saml:Subject/saml:NameID"), "alice@example.test");
    EXPECT_EQ(FindOne(assertion, "//saml:Subject/saml:NameID/@Format"), Upn);
    const std::string confirmation = "//saml:Subject/saml:SubjectConfirmation";
    EXPECT_EQ(
        FindOne(assertion, confirmation + "/@Method"), "urn:oasis:names:tc:SAML:2.0:cm:bearer");
    EXPECT_EQ(
        Find(assertion, confirmation + "/saml:SubjectConfirmationData/@*"),
        Texts{"2026-11-20T13:00:00.001Z"});
    EXPECT_TRUE(Find(assertion, confirmation + "/saml:NameID").empty());
}

TEST_F(IssuedToken, PlainRequestGetsValidityOnly)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_EQ(
        Find(assertion, "//saml:Conditions/@*"),
        (Texts{"2026-11-20T12:00:00.001Z", "2026-11-20T13:00:00.001Z"}));
    EXPECT_TRUE(Find(assertion, "//saml:Conditions/*").empty());
    EXPECT_TRUE(Find(assertion, "//saml:Advice").empty());
}

TEST_F(IssuedToken, RenewableTokenCountsRenewals)
{
    const std::string assertion = AssertionIn(
        PostIssue(Replaced(PasswordRequest(), "Allow=\"false\"", "Allow=\"true\"")).body);
    EXPECT_EQ(
        FindOne(assertion, "//saml:Condition[@xsi:type='rsa:RenewRestrictionType']/@Count"), "10");
}

TEST_F(IssuedToken, DelegableTokenCountsDelegations)
{
    const std::string assertion = AssertionIn(
        PostIssue(Replaced(PasswordRequest(), "Delegatable>false", "Delegatable>true")).body);
    EXPECT_EQ(FindOne(assertion, "//saml:ProxyRestriction/@Count"), "10");
}

TEST_F(IssuedToken, DelegateStandsInRestrictionAndConfirmation)
{
    const std::string assertion =
        AssertionIn(PostIssue(PasswordRequest(DelegateTo("bob@example.test"))).body);
    const std::string delegate =
        "//saml:Condition[@xsi:type='del:DelegationRestrictionType']/del:Delegate";
    EXPECT_EQ(FindOne(assertion, delegate + "/saml:NameID"), "bob@example.test");
    EXPECT_EQ(FindOne(assertion, delegate + "/saml:NameID/@Format"), Upn);
    EXPECT_EQ(Find(assertion, delegate + "/@*"), Texts{"2026-11-20T12:00:00.000Z"});
    EXPECT_EQ(FindOne(assertion, "//saml:SubjectConfirmation/saml:NameID"), "bob@example.test");
}

TEST_F(IssuedToken, ParticipantsBecomeTheAudience)
{
    const auto participant = [](const std::string& address) {
        return "<wst:Participant><wsa:EndpointReference><wsa:Address>" + address
               + "</wsa:Address></wsa:EndpointReference></wst:Participant>";
    };
    const std::string assertion = AssertionIn(
        PostIssue(PasswordRequest(
                      "<wst:Participants xmlns:wsa=\"http://www.w3.org/2005/08/addressing\">"
                      + participant("https://a.test/x") + participant("https://b.test/&amp;y")
                      + "</wst:Participants>"))
            .body);
    EXPECT_EQ(
        Find(assertion, "//saml:AudienceRestriction/saml:Audience"),
        (Texts{"https://a.test/x", "https://b.test/&y"}));
}

TEST_F(IssuedToken, AdviceIsCopied)
{
    const std::string advice =
        "<rsa-advice:AdviceSet xmlns:rsa-advice=\"" SSOCLIENT_RSA_AUTHORITY
        "/names/2009/12/std-ext/WS-Trust1.4/advice\" "
        "xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\" "
        "xmlns:xs=\"http://www.w3.org/2001/XMLSchema\" "
        "xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\">"
        "<rsa-advice:Advice AdviceSource=\"source-1\">"
        "<rsa-advice:Attribute Name=\"urn:a\">"
        "<rsa-advice:AttributeValue xsi:type=\"xs:string\"> one </rsa-advice:AttributeValue>"
        "<rsa-advice:AttributeValue xsi:type=\"xs:string\"></rsa-advice:AttributeValue>"
        "</rsa-advice:Attribute>"
        "<rsa-advice:Attribute Name=\"urn:b\"/>"
        "</rsa-advice:Advice></rsa-advice:AdviceSet>";
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest(advice)).body);
    const std::string element =
        "//saml:Conditions/following-sibling::*[1][self::saml:Advice]/rsa:RSAAdvice";
    EXPECT_EQ(Find(assertion, element + "/@*"), Texts{"source-1"});
    EXPECT_EQ(Find(assertion, element + "/saml:Attribute/@Name"), (Texts{"urn:a", "urn:b"}));
    EXPECT_EQ(
        Find(assertion, element + "/saml:Attribute[1]/saml:AttributeValue"), (Texts{" one ", ""}));
    EXPECT_TRUE(VerifiesWithXmlSec(assertion));
}

TEST_F(IssuedToken, StatementsTellWhoLoggedOn)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_EQ(Find(assertion, "//saml:AuthnStatement/@*"), Texts{"2026-11-20T12:00:00.000Z"});
    EXPECT_EQ(
        FindOne(assertion, "//saml:AuthnStatement/saml:AuthnContext/saml:AuthnContextClassRef"),
        "urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport");
    EXPECT_EQ(
        Find(
            assertion,
            AttributeValues(SSOCLIENT_RSA_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity")),
        (Texts{"EXAMPLE\\Administrators", "EXAMPLE\\Users"}));
    EXPECT_EQ(
        FindOne(
            assertion,
            AttributeValues(SSOCLIENT_CLAIMS_AUTHORITY "/ws/2005/05/identity/claims/givenname")),
        "Alice");
    EXPECT_EQ(
        FindOne(
            assertion,
            AttributeValues(SSOCLIENT_CLAIMS_AUTHORITY "/ws/2005/05/identity/claims/surname")),
        "Archer");
    EXPECT_EQ(
        FindOne(
            assertion,
            AttributeValues(SSOCLIENT_ISSUER_AUTHORITY "/schemas/attr-names/2011/07/isSolution")),
        "false");
    EXPECT_TRUE(Find(assertion, "//saml:Attribute[not(@NameFormat)]").empty());
}

TEST_F(IssuedToken, SolutionUserIsMarked)
{
    const HttpResult result =
        PostIssue(Envelope(UsernameToken("service@example.test", "service-secret"), IssueBody()));
    EXPECT_EQ(
        FindOne(
            result.body,
            AttributeValues(SSOCLIENT_ISSUER_AUTHORITY "/schemas/attr-names/2011/07/isSolution")),
        "true");
}

} // namespace

} // namespace DevStsTests
