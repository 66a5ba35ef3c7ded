#include "NegotiationHarness.h"
#include "Requests.h"
#include "SignedRequests.h"

#include <future>
#include <regex>

namespace DevStsTests {

namespace {

using Negotiate = NegotiationTest;

const char* const ResponsePath =
    "/soapenv:Envelope/soapenv:Body/wst:RequestSecurityTokenResponseCollection"
    "/wst:RequestSecurityTokenResponse";

const char* const LegPath = "/soapenv:Envelope/soapenv:Body/wst:RequestSecurityTokenResponse";

TEST_F(Negotiate, OneLegGetsTokenWithLastLegBeside)
{
    Initiator alice = Alice();
    const HttpResult reply = PostIssue(FirstRequest(alice.Step()));
    EXPECT_EQ(reply.status, 200);
    EXPECT_EQ(FindOne(reply.body, ResponsePath + std::string("/wst:TokenType")), Ns::Saml);
    EXPECT_EQ(
        FindOne(reply.body, ResponsePath + std::string("/wst:Lifetime/wsu:Expires")),
        "2026-11-20T13:00:00.001Z");
    EXPECT_EQ(
        Find(reply.body, ResponsePath + std::string("/wst:RequestedSecurityToken/saml:Assertion"))
            .size(),
        1U);
    EXPECT_EQ(
        Find(reply.body, ResponsePath + std::string("/wst:BinaryExchange/@ValueType")),
        std::vector<std::string>{"http://schemas.xmlsoap.org/ws/2005/02/trust/spnego"});
    EXPECT_EQ(
        Find(reply.body, ResponsePath + std::string("/wst:BinaryExchange/@EncodingType")),
        std::vector<std::string>{"http://docs.oasis-open.org/wss/2004/01/"
                                 "oasis-200401-wss-soap-message-security-1.0#Base64Binary"});
    EXPECT_TRUE(VerifiesWithXmlSec(AssertionIn(reply.body)));
}

TEST_F(Negotiate, PrincipalIsTheUserOfThatNameInAnyLetterCase)
{
    Initiator alice = Alice();
    const std::string assertion = AssertionIn(PostIssue(FirstRequest(alice.Step())).body);
    EXPECT_EQ(FindOne(assertion, "//saml:Subject/saml:NameID"), "alice@example.test");
    EXPECT_EQ(
        FindOne(assertion, "//saml:AuthnContextClassRef"),
        "urn:oasis:names:tc:SAML:2.0:ac:classes:Kerberos");
    EXPECT_EQ(
        FindOne(assertion, "//saml:AuthnStatement/@AuthnInstant"), "2026-11-20T12:00:00.000Z");
    EXPECT_EQ(
        FindOne(assertion, "//saml:SubjectConfirmation/@Method"),
        "urn:oasis:names:tc:SAML:2.0:cm:bearer");
}

TEST_F(Negotiate, LastLegProvesTheServiceToTheClient)
{
    Initiator alice = Alice();
    const HttpResult reply = PostIssue(FirstRequest(alice.Step()));
    EXPECT_FALSE(alice.IsComplete());
    EXPECT_EQ(alice.Step(LegOf(reply)), "");
    EXPECT_TRUE(alice.IsMutual());
}

TEST_F(Negotiate, ChangedLastLegProvesNothing)
{
    Initiator alice = Alice();
    std::string leg = LegOf(PostIssue(FirstRequest(alice.Step())));
    leg.back() = static_cast<char>(leg.back() ^ 1);
    EXPECT_THROW(alice.Step(leg), std::runtime_error);
    EXPECT_FALSE(alice.IsMutual());
}

// In DCE's style the client answers the service's leg once more: only that third leg proves the
// client to the service.
TEST_F(Negotiate, SecondLegIsAnsweredUnderTheSameContext)
{
    Initiator alice = Alice(GSS_C_MUTUAL_FLAG | GSS_C_DCE_STYLE);
    const HttpResult first = PostIssue(FirstRequest(alice.Step()));
    EXPECT_EQ(first.status, 200);
    EXPECT_EQ(Find(first.body, LegPath).size(), 1U);
    EXPECT_EQ(Find(first.body, LegPath + std::string("/*")).size(), 1U);

    const HttpResult second = PostNext(ContextOf(first), alice.Step(LegOf(first)), CookieOf(first));
    EXPECT_EQ(second.status, 200);
    EXPECT_EQ(ContextOf(second), ContextOf(first));
    EXPECT_EQ(Find(second.body, ResponsePath).size(), 1U);
    EXPECT_EQ(
        FindOne(AssertionIn(second.body), "//saml:Subject/saml:NameID"), "alice@example.test");
    EXPECT_TRUE(VerifiesWithXmlSec(AssertionIn(second.body)));
    EXPECT_FALSE(alice.IsComplete());
    EXPECT_EQ(alice.Step(LegOf(second)), "");
    EXPECT_TRUE(alice.IsMutual());
}

TEST_F(Negotiate, WithoutMutualAuthenticationTheTokenComesToo)
{
    Initiator alice = Alice(0);
    const HttpResult reply = PostIssue(FirstRequest(alice.Step()));
    EXPECT_TRUE(VerifiesWithXmlSec(AssertionIn(reply.body)));
}

// NegTokenResp with a responseToken. [RFC4178 4.2.2]
std::string Wrapped(const std::string& kerberosLeg)
{
    const auto element = [](char tag, const std::string& content) {
        const auto byte = [&](unsigned shift) {
            return static_cast<char>(content.size() >> shift & 0xffU);
        };
        return std::string{tag, '\x82', byte(8), byte(0)} + content;
    };
    return element('\xa1', element('\x30', element('\xa2', element('\x04', kerberosLeg))));
}

TEST_F(Negotiate, OfferWithoutTicketIsAskedForOne)
{
    const HttpResult first = BeginToWait();
    EXPECT_EQ(first.status, 200);
    EXPECT_EQ(Find(first.body, LegPath).size(), 1U);

    Initiator alice(
        Realm::Shared().Tickets("alice"), ServicePrincipal, GSS_C_MUTUAL_FLAG, Mechanism::KERBEROS);
    const HttpResult second = PostNext(ContextOf(first), Wrapped(alice.Step()), CookieOf(first));
    EXPECT_EQ(second.status, 200);
    EXPECT_TRUE(VerifiesWithXmlSec(AssertionIn(second.body)));
}

TEST_F(Negotiate, ContextIsMadeByTheServiceAndNeverTwice)
{
    const std::string first = ContextOf(BeginToWait());
    const std::string second = ContextOf(BeginToWait());
    const std::regex uuid(
        "urn:uuid:[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}");
    EXPECT_TRUE(std::regex_match(first, uuid)) << first;
    EXPECT_TRUE(std::regex_match(second, uuid)) << second;
    EXPECT_NE(first, second);
}

TEST_F(Negotiate, CookieIsForTheServiceAlone)
{
    const HttpResult first = BeginToWait();
    EXPECT_TRUE(std::regex_match(
        first.headers.find("Set-Cookie")->second,
        std::regex("devsts-negotiation=[0-9a-f]{32}; Path=/sts; HttpOnly")));
    EXPECT_NE(CookieOf(first), CookieOf(BeginToWait()));
}

TEST_F(Negotiate, CookieAmongOthersIsFound)
{
    Initiator alice = Alice(GSS_C_MUTUAL_FLAG | GSS_C_DCE_STYLE);
    const HttpResult first = PostIssue(FirstRequest(alice.Step()));
    const HttpResult second =
        PostNext(ContextOf(first), alice.Step(LegOf(first)), "a=b; " + CookieOf(first) + "; c=d");
    EXPECT_EQ(second.status, 200);
}

TEST_F(Negotiate, SignedFirstLegGetsHolderOfKeyToken)
{
    Initiator alice = Alice();
    const HttpResult reply =
        PostIssue(Sign(CertificateTemplate("", FirstBody(alice.Step(), "PublicKey", UseKey))));
    EXPECT_EQ(reply.status, 200);
    EXPECT_EQ(FindOne(reply.body, "//saml:Subject/saml:NameID"), "alice@example.test");
    EXPECT_EQ(
        FindOne(reply.body, "//saml:SubjectConfirmationData//ds:X509Certificate"),
        Base64Of(Client()));
}

TEST_F(Negotiate, SignedFirstLegOfSeveralGetsHolderOfKeyToken)
{
    Initiator alice = Alice(GSS_C_MUTUAL_FLAG | GSS_C_DCE_STYLE);
    const HttpResult first =
        PostIssue(Sign(CertificateTemplate("", FirstBody(alice.Step(), "PublicKey", UseKey))));
    const HttpResult second = PostNext(ContextOf(first), alice.Step(LegOf(first)), CookieOf(first));
    EXPECT_EQ(
        FindOne(second.body, "//saml:SubjectConfirmationData//ds:X509Certificate"),
        Base64Of(Client()));
}

TEST_F(Negotiate, UnsignedFirstLegGetsNoHolderOfKeyToken)
{
    Initiator alice = Alice();
    const HttpResult reply = PostIssue(Envelope("", FirstBody(alice.Step(), "PublicKey", UseKey)));
    EXPECT_EQ(
        FaultText(reply, "wst:InvalidRequest"), "A holder-of-key token needs a signed request");
}

TEST_F(Negotiate, UseKeyOfAnotherSignatureIsRefused)
{
    Initiator alice = Alice();
    const HttpResult reply = PostIssue(Sign(CertificateTemplate(
        "", FirstBody(alice.Step(), "PublicKey", "<wst:UseKey Sig=\"other\"/>"))));
    EXPECT_EQ(
        FaultText(reply, "wst:InvalidRequest"),
        "UseKey names the signature 'other', but there is 'holderOfKeyProofSignature'");
}

TEST_F(Negotiate, FirstLegSignedByAnotherKeyIsRefused)
{
    Initiator alice = Alice();
    const HttpResult reply = PostIssue(
        Sign(CertificateTemplate("", FirstBody(alice.Step(), "PublicKey", UseKey)), Stranger()));
    EXPECT_EQ(FaultText(reply, "wsse:FailedCheck"), "The signature of the message does not verify");
}

TEST_F(Negotiate, ManyClientsNegotiateAtOnce)
{
    std::vector<std::future<int>> replies(24);
    for (std::future<int>& reply : replies) {
        reply = std::async(std::launch::async, [this] {
            Initiator alice = Alice(GSS_C_MUTUAL_FLAG | GSS_C_DCE_STYLE);
            const HttpResult first = PostIssue(FirstRequest(alice.Step()));
            return PostNext(ContextOf(first), alice.Step(LegOf(first)), CookieOf(first)).status;
        });
    }
    for (std::future<int>& reply : replies) {
        EXPECT_EQ(reply.get(), 200);
    }
}

} // namespace

} // namespace DevStsTests
