#include "Operations.h"

#include "support/Failure.h"
#include "support/TestData.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;

namespace {

constexpr char NotWellFormed[] = "SsoException: Response is not well-formed XML: ";
constexpr char Html[] = "<!DOCTYPE html><html><body><p>Out of order<br></body></html>";

class FailedOperation : public EveryOperationTest
{};

/** The operations that bring a token. */
class FailedTokenOperation : public EveryOperationTest
{};

/** The operations that need the caller's own key. */
class OperationWithoutIdentity : public EveryOperationTest
{};

INSTANTIATE_TEST_SUITE_P(
    All, FailedOperation, testing::ValuesIn(GetOperations()), GetOperationName);
INSTANTIATE_TEST_SUITE_P(
    All,
    FailedTokenOperation,
    testing::ValuesIn(SelectOperations(&Operation::givesToken)),
    GetOperationName);
INSTANTIATE_TEST_SUITE_P(
    All,
    OperationWithoutIdentity,
    testing::ValuesIn(SelectOperations(&Operation::needsIdentity)),
    GetOperationName);

class AcquireTokenFailure : public HttpsStsTest
{
protected:
    std::string GetFailureOf(const SecurityTokenService& service, const std::string& password) const
    {
        return GetFailure(
            [&] { service.AcquireToken("alice@example.test", password, MakeSpec()); });
    }
};

class AcquireTokenByCertificateFailure : public HttpsStsTest
{
protected:
    std::string GetFailureWith(const HolderOfKeyConfig& identity) const
    {
        return GetFailure([&] { MakeService(identity)->AcquireTokenByCertificate(MakeSpec()); });
    }
};

class AcquireTokenByTokenFailure : public HttpsStsTest
{
protected:
    std::string GetFailureFor(const SamlToken& token, const TokenSpec& spec) const
    {
        return GetFailure([&] { service->AcquireTokenByToken(token, spec); });
    }

    ServicePtr service = MakeService();
};

} // namespace

TEST_P(FailedOperation, SucceedsWithoutTheFault)
{
    EXPECT_EQ(Run(), "none");
}

TEST_P(FailedOperation, ReportsStatus404)
{
    AnswerNext(404, "<html/>", "text/html");
    EXPECT_EQ(Run(), "CommunicationException: Server returned error: 404 Not Found");
}

TEST_P(FailedOperation, ReportsStatus503)
{
    AnswerNext(503, "", "text/html");
    EXPECT_EQ(Run(), "CommunicationException: Server returned error: 503 Service Unavailable");
}

TEST_P(FailedOperation, ReportsStatus302WithoutFollowing)
{
    server.OnNextReply([](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
        reply.status = 302;
        reply.headers.emplace("Location", "/sts");
    });
    EXPECT_EQ(Run(), "CommunicationException: Server returned error: 302 Found");
    EXPECT_EQ(server.ReceivedRequests().size(), 2U);
}

TEST_P(FailedOperation, ReportsHtml)
{
    AnswerNext(200, Html, "text/html");
    EXPECT_THAT(Run(), StartsWith(NotWellFormed));
}

TEST_P(FailedOperation, ReportsHtmlWithStatus500)
{
    AnswerNext(500, Html, "text/html");
    EXPECT_THAT(Run(), StartsWith(NotWellFormed));
}

TEST_P(FailedOperation, ReportsEmptyReply)
{
    AnswerNext(200, "", "text/xml");
    EXPECT_THAT(Run(), StartsWith(NotWellFormed));
}

TEST_P(FailedOperation, ReportsTruncatedReply)
{
    server.OnNextReply([](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
        reply.body.resize(reply.body.size() - 1);
        while (reply.body.back() != '>') {
            reply.body.pop_back();
        }
        reply.body.pop_back();
    });
    EXPECT_THAT(Run(), StartsWith(NotWellFormed));
}

TEST_P(FailedOperation, ReportsXmlThatIsNotSoap)
{
    AnswerNext(200, "<html><body/></html>", "text/xml");
    EXPECT_EQ(Run(), "SsoException: Unexpected response format: missing SAOP Body.");
}

TEST_P(FailedOperation, ReportsReplyWithoutContent)
{
    AnswerNext(200, "<E><Body/></E>", "text/xml");
    EXPECT_EQ(Run(), "SsoException: Unexpected XML format");
}

TEST_P(FailedOperation, ReportsFaultOfTheServer)
{
    AnswerNext(
        500,
        "<E><Body><Fault><faultcode xmlns:s='http://schemas.xmlsoap.org/soap/envelope/'>s:Server"
        "</faultcode><faultstring>Out of order</faultstring></Fault></Body></E>",
        "text/xml");
    EXPECT_EQ(Run(), "SsoException: Unexpected SOAP fault: s:Server; request failed.");
}

TEST_P(FailedOperation, ReportsServerThatIsGone)
{
    server.Stop();
    EXPECT_EQ(
        Run(), "HttpException: Cannot connect to " + DescribeServer() + ": Connection refused.");
}

TEST_P(FailedOperation, WorksAgainAfterwards)
{
    AnswerNext(503, "", "text/html");
    EXPECT_NE(Run(), "none");
    EXPECT_EQ(Run(), "none");
}

TEST_P(FailedTokenOperation, ReportsTokenThatWasChanged)
{
    ReplaceInNextReply("@example.test", "@Example.test");
    EXPECT_EQ(
        Run(),
        "InvalidSignatureException: Failed to verify signature: token might have been tampered "
        "with.");
}

TEST_P(FailedTokenOperation, ReportsTokenWithoutSignature)
{
    server.OnNextReply([](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
        const std::string end = "</ds:Signature>";
        const std::size_t from = reply.body.find("<ds:Signature ");
        reply.body.erase(from, reply.body.find(end) + end.size() - from);
    });
    EXPECT_EQ(
        Run(),
        "SsoException: Signature syntax error: Expected element 'Signature', found 'saml:Subject'");
}

TEST_P(FailedTokenOperation, ReportsTokenOfAnotherSigner)
{
    config.trustedCertificates = GetTestCertificates("foreign");
    // The two have the same subject, so only their fingerprints tell them apart.
    const auto describe = [](const std::string& name) {
        const auto certificate = GetTestCertificates(name).front();
        return "'" + certificate->GetSubjectName() + "' (SHA-256 " + certificate->GetFingerprint()
               + ")";
    };
    EXPECT_EQ(
        RunOn(*MakeService()),
        "InvalidSignatureException: Signature verification error. The signing certificate is not "
        "one of the 1 trusted certificates; the signature names "
            + describe("sts") + "; trusted: " + describe("foreign"));
}

TEST_P(FailedTokenOperation, ReportsEveryTokenAsUnsignedIfNobodyIsTrusted)
{
    config.trustedCertificates.clear();
    EXPECT_EQ(
        RunOn(*MakeService()),
        "InvalidSignatureException: Signature verification error. There are no trusted "
        "certificates");
}

TEST_P(FailedTokenOperation, TakesTheSecondTrustedCertificate)
{
    config.trustedCertificates.push_front(GetTestCertificates("foreign").front());
    EXPECT_EQ(RunOn(*MakeService()), "none");
}

TEST_P(FailedTokenOperation, ReportsMalformedTokenAsFailureOfTheService)
{
    ReplaceInNextReply("Version=\"2.0\"", "Version=\"2.1\"");
    EXPECT_EQ(Run(), "SsoException: Invalid token version");
}

TEST_P(OperationWithoutIdentity, FailsBeforeAnythingIsSent)
{
    EXPECT_THAT(
        RunOn(*MakeBearerService()),
        StartsWith("InvalidStateException: No HolderOfKeyConfig provided. Unable to "));
    EXPECT_EQ(server.ReceivedRequests().size(), 1U);
}

TEST_F(AcquireTokenFailure, ReportsWrongPassword)
{
    EXPECT_EQ(
        GetFailureOf(*MakeBearerService(), "guess"),
        "InvalidCredentialsException: Authentication failed: Invalid user name or password");
}

TEST_F(AcquireTokenFailure, ReportsWrongPasswordOfSignedRequest)
{
    EXPECT_EQ(
        GetFailureOf(*MakeService(), "guess"),
        "InvalidCredentialsException: Authentication failed: Invalid user name or password");
}

TEST_F(AcquireTokenFailure, ReportsUnknownDelegate)
{
    TokenSpec spec = MakeSpec();
    spec.delegateTo = "nobody@example.test";
    EXPECT_EQ(
        GetFailure(
            [&] { MakeBearerService()->AcquireToken("alice@example.test", AlicesPassword, spec); }),
        "SsoException: Unexpected SOAP fault: wst:InvalidRequest; request failed.");
}

TEST_F(AcquireTokenFailure, ReportsClockThatIsFarOff)
{
    const DevSts::TimePoint later = DevSts::ParseTime("2026-11-20T14:00:00Z").value();
    DevSts::Options options = MakeServerOptions(state, true);
    options.clock = [later] { return later; };
    DevSts::Server laterServer(options);
    laterServer.Start();
    config.url = laterServer.Url();
    EXPECT_EQ(
        GetFailureOf(*MakeBearerService(), AlicesPassword),
        "SsoException: Unexpected SOAP fault: wst:ExpiredData; request failed.");
}

TEST_F(AcquireTokenFailure, RefusesLifetimeThatIsNotPositiveWithoutSending)
{
    for (const long long lifetime : {0LL, -1LL}) {
        EXPECT_EQ(
            GetFailure([&] {
                MakeService()->AcquireToken(
                    "alice@example.test", AlicesPassword, MakeSpec(lifetime));
            }),
            "InvalidArgumentException: Invalid argument : Token lifetime must be positive");
    }
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(AcquireTokenByCertificateFailure, ReportsUnknownCertificate)
{
    EXPECT_EQ(
        GetFailureWith(MakeIdentity("foreign", "foreign")),
        "InvalidCredentialsException: Authentication failed: The certificate belongs to no known "
        "user");
}

TEST_F(AcquireTokenByCertificateFailure, ReportsKeyThatIsNotTheCertificates)
{
    EXPECT_EQ(
        GetFailureWith(MakeIdentity("foreign", "client")),
        "SsoException: Unexpected SOAP fault: wsse:FailedCheck; request failed.");
}

TEST_F(AcquireTokenByCertificateFailure, RefusesWeakKeyWithoutSending)
{
    EXPECT_EQ(
        GetFailureWith(MakeIdentity("weak", "weak")),
        "XmlSecurityException: A key of type RSA-1024 cannot sign with "
        "'http://www.w3.org/2001/04/xmldsig-more#rsa-sha256'");
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(AcquireTokenByCertificateFailure, RefusesEllipticKeyWithoutSending)
{
    EXPECT_EQ(
        GetFailureWith(MakeIdentity("sts-p256", "sts-p256")),
        "XmlSecurityException: A key of type EC prime256v1 cannot sign with "
        "'http://www.w3.org/2001/04/xmldsig-more#rsa-sha256'");
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(AcquireTokenByCertificateFailure, RefusesBearerConfirmationWithoutSending)
{
    TokenSpec spec = MakeSpec();
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    EXPECT_EQ(
        GetFailure([&] { MakeService()->AcquireTokenByCertificate(spec); }),
        "InvalidArgumentException: Invalid argument : TokenSpec::confirmation must be "
        "CONFIRMATION_DEFAULT for acquire token by certificate");
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(AcquireTokenByTokenFailure, ReportsTokenOfAnotherKey)
{
    const TokenPtr token = service->AcquireTokenByCertificate(MakeSpec());
    service = MakeService(MakeIdentity("foreign", "foreign"));
    EXPECT_EQ(
        GetFailureFor(*token, MakeSpec()),
        "SsoException: Unexpected SOAP fault: wsse:FailedCheck; request failed.");
}

TEST_F(AcquireTokenByTokenFailure, ReportsTokenThatMayNotBeDelegated)
{
    const TokenPtr token = service->AcquireTokenByCertificate(MakeSpec());
    TokenSpec spec = MakeSpec();
    spec.delegateTo = ServiceName;
    EXPECT_EQ(
        GetFailureFor(*token, spec),
        "SsoException: Unexpected SOAP fault: wst:InvalidRequest; request failed.");
}

TEST_F(AcquireTokenByTokenFailure, ReportsWiderAudience)
{
    TokenSpec spec = MakeSpec();
    spec.audienceRestriction = {"urn:example:a"};
    const TokenPtr token = service->AcquireTokenByCertificate(spec);
    spec.audienceRestriction = {"urn:example:a", "urn:example:b"};
    EXPECT_EQ(
        GetFailureFor(*token, spec),
        "SsoException: Unexpected SOAP fault: wst:InvalidScope; request failed.");
}

TEST_F(AcquireTokenByTokenFailure, ReportsExpiredToken)
{
    const TokenPtr token = service->AcquireTokenByCertificate(MakeSpec());
    const FixedClock later("2026-11-20T13:00:00Z");
    EXPECT_THAT(
        GetFailureFor(*token, MakeSpec()),
        StartsWith("InvalidCredentialsException: Authentication failed: The presented token is "
                   "refused: "));
}
