#include "Harness.h"
#include "Requests.h"
#include "SignedRequests.h"

namespace DevStsTests {

namespace {

std::string RenewBody(const std::string& assertion)
{
    return std::string("<wst:RequestSecurityToken xmlns:wst=\"") + Ns::Wst
           + "\"><wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
             "<wst:RequestType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/Renew"
             "</wst:RequestType><wst:Lifetime xmlns:wsu=\""
           + Ns::Wsu
           + "\"><wsu:Created>2026-11-20T12:00:00.002Z</wsu:Created>"
             "<wsu:Expires>2026-11-20T15:00:00.002Z</wsu:Expires></wst:Lifetime>"
             "<wst:RenewTarget>"
           + assertion + "</wst:RenewTarget></wst:RequestSecurityToken>";
}

std::string ValidateBody(const std::string& assertion)
{
    return std::string("<wst:RequestSecurityToken xmlns:wst=\"") + Ns::Wst
           + "\"><wst:TokenType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Status"
             "</wst:TokenType>"
             "<wst:RequestType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/Validate"
             "</wst:RequestType><wst:ValidateTarget>"
           + assertion + "</wst:ValidateTarget></wst:RequestSecurityToken>";
}

constexpr const char* Status = "/soapenv:Envelope/soapenv:Body"
                               "/wst:RequestSecurityTokenResponse/wst:Status";

class RenewToken : public ServerTest
{
protected:
    std::string IssueToken(const std::string& body, const Identity& identity = Client())
    {
        const std::string password = UsernameToken("alice@example.test", "alice-secret");
        return AssertionIn(
            PostIssue(Sign(CertificateTemplate(password, body, identity), identity)).body);
    }

    static std::string RenewableBody()
    {
        return Replaced(IssueBody("PublicKey", UseKey), "Allow=\"false\"", "Allow=\"true\"");
    }

    HttpResult Renew(const std::string& assertion, const Identity& identity = Client())
    {
        return PostRenew(Sign(CertificateTemplate("", RenewBody(assertion), identity), identity));
    }

    HttpResult PostRenew(const std::string& request)
    {
        return Post(std::string(Ns::Wst) + "/RST/Renew", request);
    }

    HttpResult Validate(const std::string& assertion)
    {
        return Post(std::string(Ns::Wst) + "/RST/Validate", Envelope("", ValidateBody(assertion)));
    }
};

TEST_F(RenewToken, ReplyIsSingleResponseWithFreshToken)
{
    const std::string old = IssueToken(RenewableBody());
    const HttpResult result = Renew(old);
    ASSERT_EQ(result.status, 200) << result.body;
    EXPECT_EQ(
        Find(
            result.body,
            "/soapenv:Envelope/soapenv:Body/wst:RequestSecurityTokenResponse"
            "/wst:RequestedSecurityToken/saml:Assertion")
            .size(),
        1U);
    const std::string fresh = AssertionIn(result.body);
    EXPECT_TRUE(VerifiesWithXmlSec(fresh));
    EXPECT_NE(FindOne(fresh, "/saml:Assertion/@ID"), FindOne(old, "/saml:Assertion/@ID"));
    EXPECT_EQ(FindOne(fresh, "//saml:Conditions/@NotOnOrAfter"), "2026-11-20T15:00:00.002Z");
    EXPECT_EQ(FindOne(fresh, "//saml:Condition/@Count"), "9");
    EXPECT_EQ(FindOne(fresh, "//saml:Subject/saml:NameID"), "alice@example.test");
    EXPECT_EQ(
        FindOne(fresh, "//saml:SubjectConfirmationData//ds:X509Certificate"), Base64Of(Client()));
}

TEST_F(RenewToken, CountEndsAtZero)
{
    std::string token = IssueToken(RenewableBody());
    for (int left = 9; left >= 0; --left) {
        token = AssertionIn(Renew(token).body);
        ASSERT_EQ(FindOne(token, "//saml:Condition/@Count"), std::to_string(left));
    }
    EXPECT_EQ(FaultText(Renew(token), "wst:UnableToRenew"), "The token is not renewable");
}

TEST_F(RenewToken, RefusesTokenThatIsNotRenewable)
{
    const std::string token = IssueToken(IssueBody("PublicKey", UseKey));
    EXPECT_EQ(FaultText(Renew(token), "wst:UnableToRenew"), "The token is not renewable");
}

TEST_F(RenewToken, RefusesBearerToken)
{
    const std::string token =
        IssueToken(Replaced(IssueBody("Bearer"), "Allow=\"false\"", "Allow=\"true\""));
    EXPECT_EQ(
        FaultText(Renew(token), "wst:UnableToRenew"),
        "The token is not bound to the key that signed the request");
}

TEST_F(RenewToken, RefusesAnotherKey)
{
    const std::string token = IssueToken(RenewableBody());
    EXPECT_EQ(
        FaultText(Renew(token, Stranger()), "wst:UnableToRenew"),
        "The token is not bound to the key that signed the request");
}

TEST_F(RenewToken, RefusesUnsignedRequest)
{
    const std::string token = IssueToken(RenewableBody());
    EXPECT_EQ(
        FaultText(PostRenew(Envelope("", RenewBody(token))), "wst:InvalidRequest"),
        "The request must be signed");
}

TEST_F(RenewToken, RefusesChangedToken)
{
    const std::string token =
        Replaced(IssueToken(RenewableBody()), ">alice@example.test<", ">bob@example.test<");
    EXPECT_EQ(
        FaultText(Renew(token), "wst:UnableToRenew"),
        "The token is refused: The signature of the token does not verify");
}

TEST_F(RenewToken, RefusesExpiredToken)
{
    const std::string token = IssueToken(Replaced(RenewableBody(), "13:00:00.001Z", "12:08:00Z"));
    _now = StartTime() + std::chrono::minutes(8);
    EXPECT_EQ(
        FaultText(Renew(token), "wst:UnableToRenew"),
        "The token is refused: The token has expired at 2026-11-20T12:08:00.000Z");
}

TEST_F(RenewToken, RefusesPasswordInTheHeader)
{
    const std::string token = IssueToken(RenewableBody());
    const std::string request = Sign(
        CertificateTemplate(UsernameToken("alice@example.test", "alice-secret"), RenewBody(token)));
    EXPECT_EQ(
        FaultText(PostRenew(request), "wst:InvalidRequest"),
        "A Renew request carries no password and no token in its header");
}

TEST_F(RenewToken, RefusesBodyOfAnotherOperation)
{
    const HttpResult result = PostRenew(PasswordRequest());
    EXPECT_EQ(
        FaultText(result, "wst:InvalidRequest"),
        "Element 'RequestType' must be '" + std::string(Ns::Wst) + "/Renew', not '" + Ns::Wst
            + "/Issue'");
}

using ValidateToken = RenewToken;

TEST_F(ValidateToken, IssuedTokenIsValid)
{
    const HttpResult result = Validate(AssertionIn(PostIssue(PasswordRequest()).body));
    EXPECT_EQ(result.status, 200);
    EXPECT_EQ(
        FindOne(result.body, std::string(Status) + "/wst:Code"),
        std::string(Ns::Wst) + "/status/valid");
    EXPECT_EQ(
        FindOne(result.body, "//wst:RequestSecurityTokenResponse/wst:TokenType"),
        std::string(Ns::Wst) + "/RSTR/Status");
}

TEST_F(ValidateToken, ChangedTokenIsInvalid)
{
    const HttpResult result = Validate(Replaced(
        AssertionIn(PostIssue(PasswordRequest()).body),
        ">alice@example.test<",
        ">bob@example.test<"));
    EXPECT_EQ(result.status, 200);
    EXPECT_EQ(
        FindOne(result.body, std::string(Status) + "/wst:Code"),
        std::string(Ns::Wst) + "/status/invalid");
    EXPECT_EQ(
        FindOne(result.body, std::string(Status) + "/wst:Reason"),
        "The signature of the token does not verify");
}

TEST_F(ValidateToken, ExpiredTokenIsInvalid)
{
    const std::string token =
        AssertionIn(PostIssue(Replaced(PasswordRequest(), "13:00:00.001Z", "12:08:00Z")).body);
    _now = StartTime() + std::chrono::minutes(8);
    const HttpResult result = Validate(token);
    EXPECT_EQ(
        FindOne(result.body, std::string(Status) + "/wst:Code"),
        std::string(Ns::Wst) + "/status/invalid");
    EXPECT_EQ(
        FindOne(result.body, std::string(Status) + "/wst:Reason"),
        "The token has expired at 2026-11-20T12:08:00.000Z");
}

TEST_F(ValidateToken, SignedRequestIsRefused)
{
    const std::string token = AssertionIn(PostIssue(PasswordRequest()).body);
    const HttpResult result = Post(
        std::string(Ns::Wst) + "/RST/Validate", Sign(CertificateTemplate("", ValidateBody(token))));
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), "A Validate request is not signed");
}

using ValidateForgottenSubject = EditedUsersTest;

TEST_F(ValidateForgottenSubject, TokenIsInvalid)
{
    const std::string request =
        Envelope("", ValidateBody(AssertionIn(PostIssue(PasswordRequest()).body)));
    const std::string action = std::string(Ns::Wst) + "/RST/Validate";
    EXPECT_EQ(
        FindOne(Post(action, request).body, std::string(Status) + "/wst:Code"),
        std::string(Ns::Wst) + "/status/valid");
    WriteText(
        UsersFile(), Replaced(ReadText(UsersFile()), "alice@example.test", "al@example.test"));
    const HttpResult result = Post(action, request);
    EXPECT_EQ(
        FindOne(result.body, std::string(Status) + "/wst:Code"),
        std::string(Ns::Wst) + "/status/invalid");
    EXPECT_EQ(
        FindOne(result.body, std::string(Status) + "/wst:Reason"),
        "The subject 'alice@example.test' is not known any more");
}

} // namespace

} // namespace DevStsTests
