#include "ssoClient/client/SecurityTokenServiceImpl.h"

#include "logCapture.h"
#include "serviceFakes.h"
#include "ssoClient/Descriptions.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/client/descriptions.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Failure.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::ContainsRegex;
using testing::ElementsAre;
using testing::HasSubstr;

namespace {

#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"

std::string Reply(const std::string& response)
{
    return "<S:Envelope xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\"><S:Body>" + response
           + "</S:Body></S:Envelope>";
}

std::string TokenResponse()
{
    return "<t:RequestSecurityTokenResponse xmlns:t=\"" WST "\"><t:RequestedSecurityToken>"
           + GetSignedAssertion() + "</t:RequestedSecurityToken></t:RequestSecurityTokenResponse>";
}

std::string IssueReply()
{
    return Reply(
        "<RequestSecurityTokenResponseCollection>" + TokenResponse()
        + "</RequestSecurityTokenResponseCollection>");
}

std::string StatusReply(const char* code)
{
    return Reply(
        "<RequestSecurityTokenResponse><Status><Code>" + std::string(code)
        + "</Code></Status></RequestSecurityTokenResponse>");
}

/** A service with an identity, whose transport answers what the test puts there. */
class Operation : public testing::Test
{
protected:
    Operation()
    {
        spec.tokenLifetimeSec = 300;
        presented.xml = ReadTestData("tokens/accepted/holder-of-key.xml");
        presented.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
    }

    SecurityTokenServiceImpl GetService() const
    {
        return GetService(
            HolderOfKeyConfig{GetTestKey("client"), GetTestCertificates("client").front()});
    }

    SecurityTokenServiceImpl GetService(const boost::optional<HolderOfKeyConfig>& identity) const
    {
        return {
            boost::make_shared<RequestBuilderImpl>(identity),
            transport,
            boost::make_shared<ResponseHandlerImpl>(),
            trusted};
    }

    /** @return class and text of what the operation throws before anything is sent. */
    template <class Call>
    std::string GetEarlyFailure(const Call& call) const
    {
        const std::string failure = GetFailure([&] { call(GetService()); });
        EXPECT_EQ(transport->sessionsMade, 0);
        return failure;
    }

    TokenSpec spec;
    FakeSamlToken presented;
    std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> trusted =
        GetTestCertificates("sts");
    boost::shared_ptr<FakeTransport> transport = boost::make_shared<FakeTransport>();
    FixedClock clock{WhenTokensAreValid};
};

class AcquireTokenByCertificate : public Operation
{};
class AcquireTokenByToken : public Operation
{};
class ValidateSubject : public Operation
{};
class RenewToken : public Operation
{};

constexpr char NullCertificate[] =
    "InvalidArgumentException: Invalid argument : A trusted certificate is null";

} // namespace

TEST_F(Operation, SendsNothingIfATrustedCertificateIsNull)
{
    trusted.push_front(nullptr);
    EXPECT_EQ(
        GetEarlyFailure([this](const auto& service) { service.AcquireTokenByCertificate(spec); }),
        NullCertificate);
    EXPECT_EQ(
        GetEarlyFailure(
            [this](const auto& service) { service.AcquireTokenByToken(presented, spec); }),
        NullCertificate);
    EXPECT_EQ(
        GetEarlyFailure([this](const auto& service) { service.RenewToken(presented, 600); }),
        NullCertificate);
}

TEST_F(AcquireTokenByCertificate, GivesVerifiedTokenAndLogsEveryStep)
{
    transport->reply = IssueReply();
    LogCapture log(64);
    const auto token = GetService().AcquireTokenByCertificate(spec);
    ASSERT_NE(token, nullptr);
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "AcquireTokenByCertificate")),
            "SsoClient[64]: Requested token with spec `" + WriteTokenSpec(spec) + "'",
            "SsoClient[64]: Successfully acquired token: " + CreateRedactedDescription(*token),
            ContainsRegex(FrameLinePattern("END", "AcquireTokenByCertificate"))));
    EXPECT_EQ(GetOpId(log.lines.front()), GetOpId(log.lines.back()));
    ASSERT_EQ(transport->sent.size(), 1U);
    EXPECT_EQ(transport->sent[0].soapAction, WST "/RST/Issue");
    EXPECT_THAT(transport->sent[0].body, HasSubstr("wsse:BinarySecurityToken"));
    EXPECT_EQ(transport->sessionsAlive, 0);
}

TEST_F(AcquireTokenByCertificate, WithoutIdentitySendsNothing)
{
    LogCapture log(64);
    EXPECT_THROW(
        GetService(boost::none).AcquireTokenByCertificate(spec), Quillon::InvalidStateException);
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "AcquireTokenByCertificate")),
            HasSubstr("Requested token"),
            ContainsRegex(FrameLinePattern("END", "AcquireTokenByCertificate"))));
    EXPECT_EQ(transport->sessionsMade, 0);
}

TEST_F(AcquireTokenByToken, GivesVerifiedTokenAndLogsEveryStep)
{
    transport->reply = IssueReply();
    LogCapture log(64);
    const auto token = GetService().AcquireTokenByToken(presented, spec);
    ASSERT_NE(token, nullptr);
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "AcquireTokenByToken")),
            "SsoClient[64]: Requested token for " + CreateRedactedDescription(presented)
                + " with spec `" + WriteTokenSpec(spec) + "'",
            "SsoClient[64]: Successfully acquired token: " + CreateRedactedDescription(*token),
            ContainsRegex(FrameLinePattern("END", "AcquireTokenByToken"))));
    EXPECT_EQ(GetOpId(log.lines.front()), GetOpId(log.lines.back()));
    ASSERT_EQ(transport->sent.size(), 1U);
    EXPECT_EQ(transport->sent[0].soapAction, WST "/RST/Issue");
    EXPECT_THAT(transport->sent[0].body, HasSubstr("wsse:KeyIdentifier"));
}

TEST_F(AcquireTokenByToken, DescribesNoTokenBelowLevel64)
{
    transport->reply = IssueReply();
    LogCapture log(63);
    ASSERT_NE(GetService().AcquireTokenByToken(presented, spec), nullptr);
    EXPECT_EQ(presented.subjectReads, 0);
    EXPECT_TRUE(log.lines.empty());
}

TEST_F(AcquireTokenByToken, RefusesReplyOfARenewal)
{
    transport->reply = Reply(TokenResponse());
    EXPECT_THROW(GetService().AcquireTokenByToken(presented, spec), SsoException);
}

TEST_F(ValidateSubject, GivesTheVerdictAndLogsEveryStep)
{
    transport->reply = StatusReply(WST "/status/valid");
    LogCapture log(64);
    EXPECT_TRUE(GetService().ValidateSubject(presented));
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "ValidateSubject")),
            "SsoClient[64]: Validating subject of token " + CreateRedactedDescription(presented),
            "SsoClient[64]: Result: true",
            ContainsRegex(FrameLinePattern("END", "ValidateSubject"))));
    ASSERT_EQ(transport->sent.size(), 1U);
    EXPECT_EQ(transport->sent[0].soapAction, WST "/RST/Validate");
}

TEST_F(ValidateSubject, NeedsNoIdentity)
{
    transport->reply = StatusReply(WST "/status/invalid");
    LogCapture log(64);
    EXPECT_FALSE(GetService(boost::none).ValidateSubject(presented));
    EXPECT_THAT(log.lines, testing::Contains("SsoClient[64]: Result: false"));
}

TEST_F(ValidateSubject, NeedsNoTrustedCertificate)
{
    trusted = {nullptr};
    transport->reply = StatusReply(WST "/status/valid");
    EXPECT_TRUE(GetService().ValidateSubject(presented));
}

TEST_F(ValidateSubject, LogsTheEndWhenTheReplyIsBad)
{
    transport->reply = StatusReply("maybe");
    LogCapture log(64);
    EXPECT_THROW(GetService().ValidateSubject(presented), SsoException);
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "ValidateSubject")),
            HasSubstr("Validating subject"),
            ContainsRegex(FrameLinePattern("END", "ValidateSubject"))));
}

TEST_F(ValidateSubject, DescribesNoTokenBelowLevel64)
{
    transport->reply = StatusReply(WST "/status/valid");
    LogCapture log(63);
    EXPECT_TRUE(GetService().ValidateSubject(presented));
    EXPECT_EQ(presented.subjectReads, 0);
}

TEST_F(RenewToken, GivesVerifiedTokenAndLogsEveryStep)
{
    transport->reply = Reply(TokenResponse());
    LogCapture log(64);
    const auto token = GetService().RenewToken(presented, 5'000'000'000);
    ASSERT_NE(token, nullptr);
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "RenewToken")),
            "SsoClient[64]: Renewing token " + CreateRedactedDescription(presented)
                + " for 5000000000 more seconds",
            "SsoClient[64]: Successfully acquired token: " + CreateRedactedDescription(*token),
            ContainsRegex(FrameLinePattern("END", "RenewToken"))));
    EXPECT_EQ(GetOpId(log.lines.front()), GetOpId(log.lines.back()));
    ASSERT_EQ(transport->sent.size(), 1U);
    EXPECT_EQ(transport->sent[0].soapAction, WST "/RST/Renew");
}

TEST_F(RenewToken, RefusesReplyOfAnIssue)
{
    transport->reply = IssueReply();
    EXPECT_THROW(GetService().RenewToken(presented, 600), SsoException);
}

TEST_F(RenewToken, RefusesBearerToken)
{
    presented.confirmationMethod = SamlToken::CONFIRM_BEARER;
    LogCapture log(64);
    EXPECT_THROW(GetService().RenewToken(presented, 600), Quillon::InvalidArgumentException);
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "RenewToken")),
            HasSubstr("Renewing token"),
            ContainsRegex(FrameLinePattern("END", "RenewToken"))));
    EXPECT_EQ(transport->sessionsMade, 0);
}

TEST_F(RenewToken, DescribesNoTokenBelowLevel64)
{
    transport->reply = Reply(TokenResponse());
    LogCapture log(63);
    ASSERT_NE(GetService().RenewToken(presented, 600), nullptr);
    EXPECT_EQ(presented.subjectReads, 0);
}
