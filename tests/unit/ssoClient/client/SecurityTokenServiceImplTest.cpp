#include "ssoClient/client/SecurityTokenServiceImpl.h"

#include "logCapture.h"
#include "quillon/Exceptions.h"
#include "quillon/xml/Parser.h"
#include "serviceFakes.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Descriptions.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Failure.h"
#include "support/FixedClock.h"
#include "support/TestData.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gmock/gmock.h>

using namespace SsoClient;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

namespace {

std::string IssueReply(const std::string& assertion)
{
    return "<S:Envelope xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\"><S:Body>"
           "<t:RequestSecurityTokenResponseCollection"
           " xmlns:t=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\">"
           "<t:RequestSecurityTokenResponse><t:RequestedSecurityToken>"
           + assertion
           + "</t:RequestedSecurityToken></t:RequestSecurityTokenResponse>"
             "</t:RequestSecurityTokenResponseCollection></S:Body></S:Envelope>";
}

class AcquireToken : public testing::Test
{
protected:
    AcquireToken() { spec.tokenLifetimeSec = 300; }

    boost::shared_ptr<const SamlToken> Acquire() const { return AcquireThrough(responseHandler); }

    boost::shared_ptr<const SamlToken> AcquireThrough(
        const boost::shared_ptr<const ResponseHandler>& handler) const
    {
        return SecurityTokenServiceImpl(
                   boost::make_shared<RequestBuilderImpl>(boost::none), transport, handler, trusted)
            .AcquireToken("jdoe", "s3cret", spec);
    }

    std::string GetFailureThrough(const boost::shared_ptr<const ResponseHandler>& handler) const
    {
        return GetFailure([&] { AcquireThrough(handler); });
    }

    TokenSpec spec;
    boost::shared_ptr<FakeTransport> transport = boost::make_shared<FakeTransport>();
    boost::shared_ptr<ReplyIsToken> responseHandler = boost::make_shared<ReplyIsToken>(*transport);
    std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> trusted;
    FixedClock clock{WhenTokensAreValid};
};

constexpr char RequestLine[] =
    "SsoClient[64]: Requested token for subject `jdoe', spec `TokenSpec [tokenLifetimeSec=300, "
    "delegable=false, delegateTo=<unset>, renewable=false, "
    "confirmationType=0,audienceRestriction=, advice=[]'";

std::string FrameLine(const std::string& step)
{
    return FrameLinePattern(step, "AcquireToken");
}

} // namespace

TEST_F(AcquireToken, SendsOneRequestInASessionOfItsOwn)
{
    Acquire();
    ASSERT_EQ(transport->sent.size(), 1U);
    EXPECT_EQ(
        transport->sent[0].soapAction,
        "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue");
    EXPECT_THAT(transport->sent[0].body, HasSubstr("<wsse:Username>jdoe</wsse:Username>"));
    EXPECT_THAT(transport->sent[0].body, HasSubstr(">s3cret</wsse:Password>"));
    EXPECT_EQ(transport->sessionsMade, 1);
}

TEST_F(AcquireToken, ReleasesTheSessionBeforeTheReplyIsRead)
{
    Acquire();
    EXPECT_EQ(responseHandler->sessionsAliveWhenCalled, 0);
}

TEST_F(AcquireToken, GivesNullForEmptyAssertion)
{
    LogCapture log(64);
    EXPECT_EQ(Acquire(), nullptr);
    EXPECT_THAT(log.lines, Not(testing::Contains(HasSubstr("Successfully"))));
}

TEST_F(AcquireToken, GivesVerifiedToken)
{
    transport->reply = IssueReply(GetSignedAssertion());
    trusted = GetTestCertificates("sts");
    const auto token = AcquireThrough(boost::make_shared<ResponseHandlerImpl>());
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetId(), "_7d1f6a52-9c61");
    EXPECT_EQ(token->GetSubject(), PrincipalId("user", "example.com"));
}

TEST_F(AcquireToken, GivesTokenWhoseXmlVerifiesAgain)
{
    transport->reply = IssueReply(GetSignedAssertion());
    trusted = GetTestCertificates("sts");
    const auto token = AcquireThrough(boost::make_shared<ResponseHandlerImpl>());
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(CreateSamlToken(token->ToXml(), trusted)->GetId(), token->GetId());
}

TEST_F(AcquireToken, LogsEveryStepInOrder)
{
    transport->reply = GetSignedAssertion();
    trusted = GetTestCertificates("sts");
    LogCapture log(64);
    const auto token = Acquire();
    ASSERT_NE(token, nullptr);
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            testing::ContainsRegex(FrameLine("START")),
            RequestLine,
            "SsoClient[64]: SecurityTokenServiceImpl::AcquireToken sending request",
            "SsoClient[64]: SecurityTokenServiceImpl::AcquireToken processing response",
            "SsoClient[64]: Successfully acquired token: " + CreateRedactedDescription(*token),
            testing::ContainsRegex(FrameLine("END"))));
    EXPECT_EQ(GetOpId(log.lines.front()), GetOpId(log.lines.back()));
}

TEST_F(AcquireToken, LogsAnotherIdForEachCall)
{
    LogCapture log(64);
    Acquire();
    const std::string first = GetOpId(log.lines.back());
    Acquire();
    EXPECT_NE(first, GetOpId(log.lines.back()));
}

TEST_F(AcquireToken, LogsTheEndWhenTheRequestIsRefused)
{
    spec.tokenLifetimeSec = 0;
    LogCapture log(64);
    EXPECT_EQ(
        GetFailureThrough(responseHandler),
        "InvalidArgumentException: Invalid argument : Token lifetime must be positive");
    ASSERT_EQ(log.lines.size(), 3U);
    EXPECT_THAT(log.lines[0], testing::ContainsRegex(FrameLine("START")));
    EXPECT_THAT(log.lines[1], HasSubstr("tokenLifetimeSec=0"));
    EXPECT_THAT(log.lines[2], testing::ContainsRegex(FrameLine("END")));
    EXPECT_EQ(GetOpId(log.lines[0]), GetOpId(log.lines[2]));
    EXPECT_EQ(transport->sessionsMade, 0);
}

TEST_F(AcquireToken, LogsTheEndWhenSendingFails)
{
    transport->failure = boost::make_shared<CommunicationException>("no route");
    LogCapture log(64);
    EXPECT_EQ(GetFailureThrough(responseHandler), "CommunicationException: no route");
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            testing::ContainsRegex(FrameLine("START")),
            RequestLine,
            "SsoClient[64]: SecurityTokenServiceImpl::AcquireToken sending request",
            testing::ContainsRegex(FrameLine("END"))));
    EXPECT_EQ(transport->sessionsAlive, 0);
}

TEST_F(AcquireToken, LogsTheEndWhenTheReplyIsBad)
{
    transport->reply = "no markup";
    LogCapture log(64);
    EXPECT_THAT(
        GetFailureThrough(boost::make_shared<ResponseHandlerImpl>()),
        testing::StartsWith("SsoException: Response is not well-formed XML: "));
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            testing::ContainsRegex(FrameLine("START")),
            RequestLine,
            "SsoClient[64]: SecurityTokenServiceImpl::AcquireToken sending request",
            "SsoClient[64]: SecurityTokenServiceImpl::AcquireToken processing response",
            testing::ContainsRegex(FrameLine("END"))));
}

TEST_F(AcquireToken, LogsNothingBelowLevel64)
{
    transport->reply = GetSignedAssertion();
    trusted = GetTestCertificates("sts");
    LogCapture log(63);
    ASSERT_NE(Acquire(), nullptr);
    EXPECT_TRUE(log.lines.empty());
}

TEST_F(AcquireToken, NeverLogsPasswordOrAssertion)
{
    transport->reply = GetSignedAssertion();
    trusted = GetTestCertificates("sts");
    LogCapture log(64);
    ASSERT_NE(Acquire(), nullptr);
    for (const std::string& line : log.lines) {
        EXPECT_THAT(line, Not(HasSubstr("s3cret")));
        EXPECT_THAT(line, Not(HasSubstr("Assertion")));
        EXPECT_THAT(line, Not(HasSubstr("_7d1f6a52-9c61")));
    }
}

TEST_F(AcquireToken, ReportsMalformedAssertionAsFailureOfTheService)
{
    transport->reply = "<Assertion/>";
    std::string parserText;
    try {
        CreateSamlToken(transport->reply, trusted);
    } catch (const ParseException& error) {
        parserText = error.what();
    }
    EXPECT_NE(parserText, "");
    EXPECT_EQ(GetFailureThrough(responseHandler), "SsoException: " + parserText);
}

// The clocks of service and caller may differ by ten minutes. The token is valid in 2026.
TEST_F(AcquireToken, ToleratesTenMinutesAndNoMore)
{
    transport->reply = GetSignedAssertion();
    trusted = GetTestCertificates("sts");
    for (const char* const good : {"2025-12-31T23:50:00Z", "2026-12-31T00:09:59Z"}) {
        const FixedClock now(good);
        EXPECT_EQ(GetFailureThrough(responseHandler), "none") << good;
    }
    for (const char* const bad : {"2025-12-31T23:49:59Z", "2026-12-31T00:10:00Z"}) {
        const FixedClock now(bad);
        EXPECT_THAT(GetFailureThrough(responseHandler), testing::StartsWith("SsoException: "))
            << bad;
    }
}

TEST_F(AcquireToken, ReportsAssertionThatDoesNotVerify)
{
    transport->reply = GetSignedAssertion();
    trusted = GetTestCertificates("foreign");
    EXPECT_THROW(Acquire(), InvalidSignatureException);
}

TEST_F(AcquireToken, ReportsEveryAssertionAsUnverifiedWithoutTrustedCertificates)
{
    transport->reply = GetSignedAssertion();
    EXPECT_THROW(Acquire(), InvalidSignatureException);
}

TEST_F(AcquireToken, SendsNoPasswordIfATrustedCertificateIsNull)
{
    trusted = GetTestCertificates("sts");
    trusted.push_back(nullptr);
    EXPECT_EQ(
        GetFailureThrough(responseHandler),
        "InvalidArgumentException: Invalid argument : A trusted certificate is null");
    EXPECT_EQ(transport->sessionsMade, 0);
    spec.tokenLifetimeSec = 0;
    EXPECT_THAT(GetFailureThrough(responseHandler), HasSubstr("Token lifetime must be positive"));
}

TEST_F(AcquireToken, DoesNotSayThatItSendsIfATrustedCertificateIsNull)
{
    trusted.push_back(nullptr);
    const LogCapture log(64);
    EXPECT_NE(GetFailureThrough(responseHandler), "");
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            testing::ContainsRegex(FrameLine("START")),
            RequestLine,
            testing::ContainsRegex(FrameLine("END"))));
}

TEST_F(AcquireToken, LetsOtherExceptionsPass)
{
    transport->reply = "<Assertion>";
    EXPECT_THROW(Acquire(), Quillon::Xml::XMLParseException);
}

TEST(CreateSecurityTokenService, RefusesHttpsWithoutContext)
{
    SecurityTokenServiceConfig config;
    config.url = "https://sts.example.com/STS";
    EXPECT_EQ(
        GetFailure([&config] { CreateSecurityTokenService(config); }),
        "InvalidArgumentException: Invalid argument : "
        "HTTPS connection requested but no SSLContext provided.");
}

TEST(CreateSecurityTokenService, AcceptsEmptyTrustAndOutlivesTheConfiguration)
{
    boost::shared_ptr<SecurityTokenService> service;
    {
        SecurityTokenServiceConfig config;
        config.url = "http://127.0.0.1:1/STS";
        service = CreateSecurityTokenService(config);
    }
    TokenSpec spec;
    spec.tokenLifetimeSec = 0;
    EXPECT_THROW(service->AcquireToken("u", "p", spec), Quillon::InvalidArgumentException);
}
