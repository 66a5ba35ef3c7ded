#include "Harness.h"
#include "Requests.h"
#include "SignedRequests.h"

namespace DevStsTests {

namespace {

std::string HolderOfKeyBody(const std::string& extras = "")
{
    return IssueBody("PublicKey", extras + UseKey);
}

std::string CertificateRequest()
{
    return Sign(CertificateTemplate("", HolderOfKeyBody()));
}

constexpr const char* ConfirmationCertificate =
    "//saml:SubjectConfirmation[@Method='urn:oasis:names:tc:SAML:2.0:cm:holder-of-key']"
    "/saml:SubjectConfirmationData[@xsi:type='saml:KeyInfoConfirmationDataType']"
    "/ds:KeyInfo/ds:X509Data/ds:X509Certificate";

using IssueByCertificate = ServerTest;

TEST_F(IssueByCertificate, KnownCertificateGetsTokenBoundToIt)
{
    const HttpResult result = PostIssue(CertificateRequest());
    ASSERT_EQ(result.status, 200) << result.body;
    EXPECT_EQ(FindOne(result.body, "//saml:Subject/saml:NameID"), "service@example.test");
    EXPECT_EQ(FindOne(result.body, ConfirmationCertificate), Base64Of(Client()));
    EXPECT_EQ(
        FindOne(result.body, "//saml:AuthnContextClassRef"),
        "urn:oasis:names:tc:SAML:2.0:ac:classes:X509");
    EXPECT_TRUE(VerifiesWithXmlSec(AssertionIn(result.body)));
}

TEST_F(IssueByCertificate, HolderOfKeyDataHasNoOtherAttribute)
{
    const std::string reply = PostIssue(CertificateRequest()).body;
    EXPECT_EQ(
        Find(reply, "//saml:SubjectConfirmationData/@*"),
        std::vector<std::string>{"saml:KeyInfoConfirmationDataType"});
}

TEST_F(IssueByCertificate, UnknownCertificateIsFailedAuthentication)
{
    const HttpResult result =
        PostIssue(Sign(CertificateTemplate("", HolderOfKeyBody(), Stranger()), Stranger()));
    EXPECT_EQ(
        FaultText(result, "wst:FailedAuthentication"), "The certificate belongs to no known user");
}

TEST_F(IssueByCertificate, BorrowedCertificateIsFailedCheck)
{
    const HttpResult result =
        PostIssue(Sign(CertificateTemplate("", HolderOfKeyBody(), Client()), Stranger()));
    EXPECT_EQ(
        FaultText(result, "wsse:FailedCheck"), "The signature of the message does not verify");
}

TEST_F(IssueByCertificate, ChangedBodyIsFailedCheck)
{
    const HttpResult result =
        PostIssue(Replaced(CertificateRequest(), "Delegatable>false", "Delegatable>true"));
    EXPECT_EQ(
        FaultText(result, "wsse:FailedCheck"), "The signature of the message does not verify");
}

TEST_F(IssueByCertificate, ChangedTimestampIsFailedCheck)
{
    const HttpResult result =
        PostIssue(Replaced(CertificateRequest(), "12:10:00.000Z", "12:20:00.000Z"));
    EXPECT_EQ(
        FaultText(result, "wsse:FailedCheck"), "The signature of the message does not verify");
}

TEST_F(IssueByCertificate, GarbageCertificateIsFailedCheck)
{
    const std::string request = Replaced(
        CertificateTemplate("", HolderOfKeyBody()), Base64Of(Client()), "bm90IGEgY2VydGlmaWNhdGU=");
    EXPECT_EQ(
        FaultText(PostIssue(Sign(request)), "wsse:FailedCheck"),
        "The signature of the message does not verify");
}

TEST_F(IssueByCertificate, RepeatedMessageIsRefused)
{
    const std::string request = CertificateRequest();
    EXPECT_EQ(PostIssue(request).status, 200);
    EXPECT_EQ(
        FaultText(PostIssue(request), "wst:InvalidRequest"),
        "The message has been received before");
}

TEST_F(IssueByCertificate, SameContentSignedByAnotherIsRefused)
{
    const std::string body = IssueBody("Bearer");
    EXPECT_EQ(PostIssue(Sign(CertificateTemplate(AlicesPassword(), body))).status, 200);
    const std::string again =
        Sign(CertificateTemplate(AlicesPassword(), body, Stranger()), Stranger());
    EXPECT_EQ(
        FaultText(PostIssue(again), "wst:InvalidRequest"), "The message has been received before");
}

TEST_F(IssueByCertificate, RefusedMessageIsNotRemembered)
{
    const std::string request = CertificateRequest();
    const HttpResult forged = PostIssue(Replaced(request, "Allow=\"false\"", "Allow=\"true\""));
    FaultText(forged, "wsse:FailedCheck");
    EXPECT_EQ(PostIssue(request).status, 200);
}

TEST_F(IssueByCertificate, RepeatedMessageStaysRefusedUntilStale)
{
    const std::string request = CertificateRequest();
    EXPECT_EQ(PostIssue(request).status, 200);
    _now = StartTime() + std::chrono::minutes(15) - std::chrono::milliseconds(1);
    EXPECT_EQ(
        FaultText(PostIssue(request), "wst:InvalidRequest"),
        "The message has been received before");
    _now = StartTime() + std::chrono::minutes(15);
    EXPECT_EQ(
        FaultText(PostIssue(request), "wst:ExpiredData"),
        "The message created at 2026-11-20T12:00:00.000Z has expired");
}

TEST_F(IssueByCertificate, LongTimestampIsStaleAfterAnHour)
{
    const std::string request = Sign(Replaced(
        CertificateTemplate("", HolderOfKeyBody()),
        "<wsu:Expires>2026-11-20T12:10:00.000Z",
        "<wsu:Expires>2036-11-20T12:10:00.000Z"));
    _now = StartTime() + std::chrono::minutes(65);
    EXPECT_EQ(
        FaultText(PostIssue(request), "wst:ExpiredData"),
        "The message created at 2026-11-20T12:00:00.000Z has expired");
}

TEST_F(IssueByCertificate, BearerBodyGetsBearerToken)
{
    const HttpResult result = PostIssue(Sign(CertificateTemplate("", IssueBody("Bearer"))));
    EXPECT_EQ(
        FindOne(result.body, "//saml:SubjectConfirmation/@Method"),
        "urn:oasis:names:tc:SAML:2.0:cm:bearer");
}

using IssueHolderOfKeyByPassword = ServerTest;

TEST_F(IssueHolderOfKeyByPassword, SignedRequestGetsTokenBoundToTheSigner)
{
    const HttpResult result = PostIssue(
        Sign(CertificateTemplate(AlicesPassword(), HolderOfKeyBody(), Stranger()), Stranger()));
    ASSERT_EQ(result.status, 200) << result.body;
    EXPECT_EQ(FindOne(result.body, "//saml:Subject/saml:NameID"), "alice@example.test");
    EXPECT_EQ(FindOne(result.body, ConfirmationCertificate), Base64Of(Stranger()));
}

TEST_F(IssueHolderOfKeyByPassword, UnsignedRequestIsRefused)
{
    const HttpResult result = PostIssue(Envelope(AlicesPassword(), HolderOfKeyBody()));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidRequest"), "A holder-of-key token needs a signed request");
}

TEST_F(IssueHolderOfKeyByPassword, WrongPasswordIsRefusedInSpiteOfTheSignature)
{
    const HttpResult result = PostIssue(
        Sign(CertificateTemplate(UsernameToken("alice@example.test", "x"), HolderOfKeyBody())));
    EXPECT_EQ(FaultText(result, "wst:FailedAuthentication"), "Invalid user name or password");
}

TEST_F(IssueHolderOfKeyByPassword, MissingUseKeyIsRefused)
{
    const HttpResult result =
        PostIssue(Sign(CertificateTemplate(AlicesPassword(), IssueBody("PublicKey"))));
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), "A holder-of-key token needs a UseKey");
}

TEST_F(IssueHolderOfKeyByPassword, UseKeyOfAnotherSignatureIsRefused)
{
    const HttpResult result = PostIssue(Sign(Replaced(
        CertificateTemplate(AlicesPassword(), HolderOfKeyBody()),
        "Sig=\"holderOfKeyProofSignature\"",
        "Sig=\"other\"")));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidRequest"),
        "UseKey names the signature 'other', but there is 'holderOfKeyProofSignature'");
}

TEST_F(IssueHolderOfKeyByPassword, UseKeyForBearerTokenIsRefused)
{
    const HttpResult result =
        PostIssue(Sign(CertificateTemplate(AlicesPassword(), IssueBody("Bearer", UseKey))));
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), "A bearer token uses no key");
}

TEST_F(IssueHolderOfKeyByPassword, UnsignedDelegationIsBoundToTheDelegate)
{
    const HttpResult result = PostIssue(
        Envelope(AlicesPassword(), IssueBody("PublicKey", DelegateTo("service@example.test"))));
    ASSERT_EQ(result.status, 200) << result.body;
    EXPECT_EQ(FindOne(result.body, ConfirmationCertificate), Base64Of(Client()));
    EXPECT_EQ(
        FindOne(result.body, "//saml:SubjectConfirmation/saml:NameID"), "service@example.test");
}

TEST_F(IssueHolderOfKeyByPassword, DelegationToOneWithoutKeyIsRefused)
{
    const HttpResult result = PostIssue(
        Envelope(AlicesPassword(), IssueBody("PublicKey", DelegateTo("bob@example.test"))));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidRequest"),
        "A holder-of-key token for the delegate 'bob@example.test' needs a solution user whose "
        "certificate is known");
}

TEST_F(IssueHolderOfKeyByPassword, UseKeyAndDelegateAreRefused)
{
    const HttpResult result = PostIssue(Sign(CertificateTemplate(
        AlicesPassword(), HolderOfKeyBody(DelegateTo("service@example.test")))));
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), "UseKey and DelegateTo exclude each other");
}

} // namespace

} // namespace DevStsTests
