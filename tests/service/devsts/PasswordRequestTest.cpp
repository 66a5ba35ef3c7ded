#include "Harness.h"
#include "Requests.h"

namespace DevStsTests {

namespace {

using IssueByPassword = ServerTest;

constexpr const char* AssertionPath =
    "/soapenv:Envelope/soapenv:Body/wst:RequestSecurityTokenResponseCollection"
    "/wst:RequestSecurityTokenResponse/wst:RequestedSecurityToken/saml:Assertion";

TEST_F(IssueByPassword, KnownUserGetsCollectionWithOneAssertion)
{
    const HttpResult result = PostIssue(PasswordRequest());
    EXPECT_EQ(result.status, 200);
    EXPECT_EQ(result.headers.find("Content-Type")->second, "text/xml");
    EXPECT_EQ(Find(result.body, AssertionPath).size(), 1U);
    EXPECT_EQ(FindOne(result.body, "//wst:RequestSecurityTokenResponse/wst:TokenType"), Ns::Saml);
    EXPECT_EQ(
        FindOne(result.body, "//wst:RequestSecurityTokenResponse/wst:Lifetime/wsu:Expires"),
        "2026-11-20T13:00:00.001Z");
}

TEST_F(IssueByPassword, AssertionVerifiesWithXmlSec)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_TRUE(VerifiesWithXmlSec(assertion));
}

TEST_F(IssueByPassword, ChangedAssertionDoesNotVerifyWithXmlSec)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_FALSE(
        VerifiesWithXmlSec(Replaced(assertion, ">alice@example.test<", ">admin@example.test<")));
}

// A prefix that stands only in values is protected because the signature lists it.
TEST_F(IssueByPassword, ReboundValuePrefixDoesNotVerifyWithXmlSec)
{
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_FALSE(VerifiesWithXmlSec(Replaced(
        assertion,
        std::string("xmlns:rsa=\"") + SSOCLIENT_RSA_AUTHORITY,
        "xmlns:rsa=\"http://other.test")));
}

TEST_F(IssueByPassword, NameIsFoundInAnyLetterCaseAndWrittenAsKnown)
{
    const HttpResult result =
        PostIssue(Replaced(PasswordRequest(), "alice@example.test", "ALICE@Example.Test"));
    EXPECT_EQ(FindOne(result.body, "//saml:Subject/saml:NameID"), "alice@example.test");
}

TEST_F(IssueByPassword, WrongPasswordIsFailedAuthentication)
{
    const HttpResult result =
        PostIssue(Replaced(PasswordRequest(), "alice-secret", "Alice-secret"));
    EXPECT_EQ(FaultText(result, "wst:FailedAuthentication"), "Invalid user name or password");
    EXPECT_NE(result.body.find("xmlns:wst=\"" + std::string(Ns::Wst) + '"'), std::string::npos);
}

TEST_F(IssueByPassword, UnknownUserIsToldNothingMore)
{
    const HttpResult result =
        PostIssue(Replaced(PasswordRequest(), "alice@example.test", "eve@example.test"));
    EXPECT_EQ(FaultText(result, "wst:FailedAuthentication"), "Invalid user name or password");
}

TEST_F(IssueByPassword, MissingCredentialsAreRefused)
{
    const HttpResult result = PostIssue(Envelope("", IssueBody()));
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), "The request carries no credentials");
}

TEST_F(IssueByPassword, UnknownDelegateIsRefused)
{
    const HttpResult result = PostIssue(PasswordRequest(DelegateTo("eve@example.test")));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidRequest"), "The delegate 'eve@example.test' is not known");
}

TEST_F(IssueByPassword, MessageExpiredWithinSkewIsAccepted)
{
    // Expires plus five minutes is a millisecond ahead.
    _now = StartTime() + std::chrono::minutes(15) - std::chrono::milliseconds(1);
    const std::string request = Replaced(
        Replaced(PasswordRequest(), "12:00:00.001Z</wsu:Created>", "12:14:00.001Z</wsu:Created>"),
        "13:00:00.001Z",
        "13:14:00.001Z");
    EXPECT_EQ(PostIssue(request).status, 200);
}

TEST_F(IssueByPassword, MessageExpiredBeyondSkewIsRefused)
{
    _now = StartTime() + std::chrono::minutes(15);
    EXPECT_EQ(
        FaultText(PostIssue(PasswordRequest()), "wst:ExpiredData"),
        "The message created at 2026-11-20T12:00:00.000Z has expired");
}

TEST_F(IssueByPassword, MessageFromTheFarFutureIsRefused)
{
    _now = StartTime() - std::chrono::minutes(5) - std::chrono::microseconds(1);
    EXPECT_EQ(
        FaultText(PostIssue(PasswordRequest()), "wst:ExpiredData"),
        "The message was created in the future: 2026-11-20T12:00:00.000Z");
}

TEST_F(IssueByPassword, MessageFromTheNearFutureIsAccepted)
{
    _now = StartTime() - std::chrono::minutes(4);
    EXPECT_EQ(PostIssue(PasswordRequest()).status, 200);
}

TEST_F(IssueByPassword, LifetimeThatEndsBeforeItBeginsIsRefused)
{
    const HttpResult result =
        PostIssue(Replaced(PasswordRequest(), "13:00:00.001Z", "12:00:00.001Z"));
    EXPECT_EQ(FaultText(result, "wst:InvalidTimeRange"), "The lifetime ends before it begins");
}

TEST_F(IssueByPassword, LifetimeThatBeginsLaterIsRefused)
{
    const HttpResult result = PostIssue(
        Replaced(PasswordRequest(), "12:00:00.001Z</wsu:Created>", "12:30:00.001Z</wsu:Created>"));
    EXPECT_EQ(
        FaultText(result, "wst:InvalidTimeRange"),
        "The lifetime must begin now, not at 2026-11-20T12:30:00.001Z");
}

TEST_F(IssueByPassword, LongLifetimeIsCutToThirtyDays)
{
    const HttpResult result =
        PostIssue(Replaced(PasswordRequest(), "2026-11-20T13:00:00.001Z", "2027-11-20T13:00:00Z"));
    EXPECT_EQ(FindOne(result.body, "//saml:Conditions/@NotOnOrAfter"), "2026-12-20T12:00:00.001Z");
}

} // namespace

} // namespace DevStsTests
