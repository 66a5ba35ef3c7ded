#include "logCapture.h"
#include "negotiationFakes.h"
#include "serviceFakes.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Failure.h"
#include "support/FixedClock.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::ContainsRegex;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace {

#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"

constexpr char ContractError[] =
    "SsoClient[8]: GSS contract error: non-empty user leg after negotiation is complete";

class AcquireTokenByGSS : public testing::Test
{
protected:
    AcquireTokenByGSS()
    {
        GTEST_FLAG_SET(death_test_style, "threadsafe");
        spec.tokenLifetimeSec = 300;
    }

    boost::shared_ptr<const SamlToken> Acquire(NegotiationHandler& handler) const
    {
        return SecurityTokenServiceImpl(
                   boost::make_shared<RequestBuilderImpl>(boost::none),
                   transport,
                   boost::make_shared<ResponseHandlerImpl>(),
                   trusted)
            .AcquireTokenByGSS(spec, handler);
    }

    std::string GetAcquireFailure(NegotiationHandler& handler) const
    {
        return GetFailure([&] { Acquire(handler); });
    }

    TokenSpec spec;
    boost::shared_ptr<FakeTransport> transport = boost::make_shared<FakeTransport>();
    std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> trusted =
        GetTestCertificates("sts");
    FixedClock clock{WhenTokensAreValid};
};

} // namespace

TEST_F(AcquireTokenByGSS, CallsTheHandlerOnceIfTheFirstReplyHasTheToken)
{
    transport->replies = {NegotiationReply("c1", "", GetSignedAssertion())};
    ScriptedHandler handler({"one"});
    EXPECT_NE(Acquire(handler), nullptr);
    EXPECT_THAT(handler.asked, ElementsAre(""));
    EXPECT_EQ(transport->sent.size(), 1U);
}

TEST_F(AcquireTokenByGSS, CallsTheHandlerOnceMoreForAFinalLeg)
{
    transport->replies = {NegotiationReply("c1", "ZmluYWw=", GetSignedAssertion())};
    ScriptedHandler handler({"one", "done"});
    EXPECT_NE(Acquire(handler), nullptr);
    EXPECT_THAT(handler.asked, ElementsAre("", "final"));
    EXPECT_EQ(transport->sent.size(), 1U); // nothing after the token
}

TEST_F(AcquireTokenByGSS, SendsEachLegUnderTheContextOfTheLastReply)
{
    transport->replies = {
        NegotiationReply("c1", "Zmlyc3Q=", ""),
        NegotiationReply("c2", "c2Vjb25k", ""),
        NegotiationReply("c3", "", GetSignedAssertion())};
    ScriptedHandler handler({"one", "two", "three"});
    EXPECT_NE(Acquire(handler), nullptr);
    EXPECT_THAT(handler.asked, ElementsAre("", "first", "second"));
    ASSERT_EQ(transport->sent.size(), 3U);
    EXPECT_EQ(transport->sent[0].soapAction, WST "/RST/Issue");
    EXPECT_THAT(transport->sent[0].body, HasSubstr(" Context=\"urn:uuid:"));
    EXPECT_THAT(transport->sent[0].body, HasSubstr(">b25l</wst:BinaryExchange>"));
    EXPECT_EQ(transport->sent[1].soapAction, WST "/RSTR/Issue");
    EXPECT_THAT(transport->sent[1].body, HasSubstr(" Context=\"c1\""));
    EXPECT_THAT(transport->sent[1].body, HasSubstr(">dHdv</wst:BinaryExchange>"));
    EXPECT_EQ(transport->sent[2].soapAction, WST "/RSTR/Issue");
    EXPECT_THAT(transport->sent[2].body, HasSubstr(" Context=\"c2\""));
    EXPECT_THAT(transport->sent[2].body, HasSubstr(">dGhyZWU=</wst:BinaryExchange>"));
}

TEST_F(AcquireTokenByGSS, UsesOneSessionAndReleasesIt)
{
    transport->replies = {
        NegotiationReply("c1", "Zmlyc3Q=", ""), NegotiationReply("c2", "", GetSignedAssertion())};
    ScriptedHandler handler({"one", "two"});
    Acquire(handler);
    EXPECT_EQ(transport->sessionsMade, 1);
    EXPECT_EQ(transport->sessionsAlive, 0);
}

// [RFC 2743 1.1.2]
TEST_F(AcquireTokenByGSS, HandsAnEmptyLegOfTheServiceOn)
{
    transport->replies = {
        NegotiationReply("c1", " ", ""), NegotiationReply("c1", "", GetSignedAssertion())};
    ScriptedHandler handler({"one", "two"});
    EXPECT_NE(Acquire(handler), nullptr);
    EXPECT_THAT(handler.asked, ElementsAre("", ""));
}

TEST_F(AcquireTokenByGSS, LogsEveryStepInOrder)
{
    transport->replies = {NegotiationReply("c1", "", GetSignedAssertion())};
    ScriptedHandler handler({"one"});
    LogCapture log(64);
    Acquire(handler);
    EXPECT_THAT(
        log.lines,
        ElementsAre(
            ContainsRegex(FrameLinePattern("START", "AcquireTokenByGSS")),
            "SsoClient[64]: Requested token with spec `TokenSpec [tokenLifetimeSec=300, "
            "delegable=false, delegateTo=<unset>, renewable=false, "
            "confirmationType=0,audienceRestriction=, advice=[]'",
            ContainsRegex("^SsoClient\\[64\\]: Successfully acquired token: SamlToken \\["),
            ContainsRegex(FrameLinePattern("END", "AcquireTokenByGSS"))));
    EXPECT_EQ(GetOpId(log.lines.front()), GetOpId(log.lines.back()));
}

TEST_F(AcquireTokenByGSS, LogsAContractErrorForAnEmptyLegAfterTheEnd)
{
    transport->replies = {NegotiationReply("c1", "ZmluYWw=", GetSignedAssertion())};
    ScriptedHandler handler({"one", ""});
    const LogCapture log(8);
    EXPECT_NE(Acquire(handler), nullptr);
    EXPECT_THAT(log.lines, ElementsAre(ContractError));
}

TEST_F(AcquireTokenByGSS, LogsAContractErrorForANullLegAfterTheEnd)
{
    transport->replies = {NegotiationReply("c1", "ZmluYWw=", GetSignedAssertion())};
    ScriptedHandler handler({"one"});
    handler.answers.push_back(nullptr);
    const LogCapture log(8);
    EXPECT_NE(Acquire(handler), nullptr);
    EXPECT_THAT(log.lines, ElementsAre(ContractError));
}

TEST_F(AcquireTokenByGSS, LogsNothingForANonEmptyLegAfterTheEnd)
{
    transport->replies = {NegotiationReply("c1", "ZmluYWw=", GetSignedAssertion())};
    ScriptedHandler handler({"one", "more"});
    const LogCapture log(8);
    EXPECT_NE(Acquire(handler), nullptr);
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(AcquireTokenByGSS, LogsNoContractErrorBelowLevel8)
{
    transport->replies = {NegotiationReply("c1", "ZmluYWw=", GetSignedAssertion())};
    ScriptedHandler handler({"one", ""});
    const LogCapture log(7);
    EXPECT_NE(Acquire(handler), nullptr);
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(AcquireTokenByGSS, LogsNoLegAndNoAssertion)
{
    transport->replies = {NegotiationReply("c1", "ZmluYWw=", GetSignedAssertion())};
    ScriptedHandler handler({"one", ""});
    const LogCapture log(64);
    Acquire(handler);
    for (const std::string& line : log.lines) {
        EXPECT_THAT(line, Not(HasSubstr("ZmluYWw=")));
        EXPECT_THAT(line, Not(HasSubstr("b25l")));
        EXPECT_THAT(line, Not(HasSubstr("Assertion")));
    }
}

TEST_F(AcquireTokenByGSS, RefusesANullLeg)
{
    ScriptedHandler handler({});
    handler.answers.push_back(nullptr);
    EXPECT_EQ(
        GetAcquireFailure(handler),
        "InvalidArgumentException: Invalid argument : Invalid NegotiationHandler: the returned leg "
        "may not be NULL");
    EXPECT_THAT(transport->sent, IsEmpty());
}

TEST_F(AcquireTokenByGSS, RefusesANullLegInTheMiddle)
{
    transport->replies = {NegotiationReply("c1", "Zmlyc3Q=", "")};
    ScriptedHandler handler({"one"});
    handler.answers.push_back(nullptr);
    EXPECT_EQ(
        GetAcquireFailure(handler),
        "InvalidArgumentException: Invalid argument : Invalid NegotiationHandler: the returned leg "
        "may not be NULL");
    EXPECT_EQ(transport->sent.size(), 1U);
}

TEST_F(AcquireTokenByGSS, StopsTheProcessOnAnEmptyFirstLeg)
{
    ScriptedHandler handler({""});
    EXPECT_DEATH(
        Acquire(handler),
        "PanicVerify failed: !leg\\.empty\\(\\) "
        "\\(lib/ssoClient/SecurityTokenServiceImpl:762\\)\n");
}

TEST_F(AcquireTokenByGSS, StopsTheProcessOnAnEmptyFurtherLeg)
{
    transport->replies = {NegotiationReply("c1", "Zmlyc3Q=", "")};
    ScriptedHandler handler({"one", ""});
    EXPECT_DEATH(
        Acquire(handler),
        "PanicVerify failed: !leg\\.empty\\(\\) "
        "\\(lib/ssoClient/SecurityTokenServiceImpl:794\\)\n");
}

TEST_F(AcquireTokenByGSS, RefusesAReplyWithoutContextId)
{
    for (const std::string& assertion : {std::string(), GetSignedAssertion()}) {
        transport->replies = {NegotiationReply("", "Zmlyc3Q=", assertion)};
        ScriptedHandler handler({"one"});
        EXPECT_EQ(
            GetAcquireFailure(handler),
            "CommunicationException: Error processing the response to SPNego token request: no "
            "Context ID was returned.");
        EXPECT_THAT(handler.asked, ElementsAre(""));
    }
}

TEST_F(AcquireTokenByGSS, RefusesALaterReplyWithoutContextId)
{
    transport->replies = {
        NegotiationReply("c1", "Zmlyc3Q=", ""), NegotiationReply("", "c2Vjb25k", "")};
    ScriptedHandler handler({"one", "two"});
    EXPECT_EQ(
        GetAcquireFailure(handler),
        "CommunicationException: Error processing the response to SPNego token request: no "
        "Context ID was returned.");
}

TEST_F(AcquireTokenByGSS, LetsTheHandlersExceptionPassAndLogsTheEnd)
{
    ScriptedHandler handler({});
    const LogCapture log(64);
    EXPECT_EQ(GetAcquireFailure(handler), "runtime_error: asked too often");
    EXPECT_THAT(log.lines.back(), ContainsRegex(FrameLinePattern("END", "AcquireTokenByGSS")));
    EXPECT_EQ(transport->sessionsAlive, 0);
}

TEST_F(AcquireTokenByGSS, LetsTheHandlersLastExceptionPass)
{
    transport->replies = {NegotiationReply("c1", "ZmluYWw=", GetSignedAssertion())};
    ScriptedHandler handler({"one"});
    EXPECT_EQ(GetAcquireFailure(handler), "runtime_error: asked too often");
}

TEST_F(AcquireTokenByGSS, EndsWhenTheHandlerHasEnoughOfAServiceThatNeverDoes)
{
    transport->reply = NegotiationReply("c1", "Zmlyc3Q=", "");
    ScriptedHandler handler(std::deque<std::string>(100, "leg"));
    EXPECT_EQ(GetAcquireFailure(handler), "runtime_error: asked too often");
    EXPECT_EQ(transport->sent.size(), 100U);
}

TEST_F(AcquireTokenByGSS, LetsTheTransportsExceptionPass)
{
    transport->failure = boost::make_shared<CommunicationException>("no route");
    ScriptedHandler handler({"one"});
    EXPECT_EQ(GetAcquireFailure(handler), "CommunicationException: no route");
    EXPECT_EQ(transport->sessionsAlive, 0);
}

TEST_F(AcquireTokenByGSS, RefusesABadLifetimeAfterTheFirstLeg)
{
    spec.tokenLifetimeSec = 0;
    ScriptedHandler handler({"one"});
    EXPECT_EQ(
        GetAcquireFailure(handler),
        "InvalidArgumentException: Invalid argument : Token lifetime must be positive");
    EXPECT_THAT(transport->sent, IsEmpty());
}

TEST_F(AcquireTokenByGSS, ReportsAMalformedAssertionAsFailureOfTheService)
{
    transport->replies = {NegotiationReply("c1", "", "<Assertion/>")};
    ScriptedHandler handler({"one"});
    EXPECT_THAT(GetAcquireFailure(handler), testing::StartsWith("SsoException: "));
}

TEST_F(AcquireTokenByGSS, ReportsAnAssertionThatDoesNotVerify)
{
    std::string assertion = GetSignedAssertion();
    const std::size_t name = assertion.find("user@");
    ASSERT_NE(name, std::string::npos);
    assertion[name] = 'x';
    transport->replies = {NegotiationReply("c1", "", assertion)};
    ScriptedHandler handler({"one"});
    EXPECT_THAT(GetAcquireFailure(handler), testing::StartsWith("InvalidSignatureException: "));
}

TEST_F(AcquireTokenByGSS, ToleratesTenMinutesAndNoMore)
{
    for (const auto& [time, failure] :
         {std::pair("2025-12-31T23:49:59Z", "SsoException: "),
          std::pair("2025-12-31T23:50:00Z", "none"),
          std::pair("2026-12-31T00:09:59Z", "none"),
          std::pair("2026-12-31T00:10:00Z", "SsoException: The token has expired at: ")}) {
        const FixedClock now(time);
        transport->replies = {NegotiationReply("c1", "", GetSignedAssertion())};
        ScriptedHandler handler({"one"});
        EXPECT_THAT(GetAcquireFailure(handler), testing::StartsWith(failure)) << time;
    }
}

TEST_F(AcquireTokenByGSS, SendsNoLegIfATrustedCertificateIsNull)
{
    trusted.push_back(nullptr);
    ScriptedHandler handler({"one"});
    EXPECT_EQ(
        GetAcquireFailure(handler),
        "InvalidArgumentException: Invalid argument : A trusted certificate is null");
    EXPECT_THAT(transport->sent, IsEmpty());
    spec.tokenLifetimeSec = 0;
    ScriptedHandler other({"one"});
    EXPECT_THAT(GetAcquireFailure(other), testing::HasSubstr("Token lifetime must be positive"));
}
