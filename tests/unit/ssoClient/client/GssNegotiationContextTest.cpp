#include "ssoClient/client/GssNegotiationContextImpl.h"

#include "logCapture.h"
#include "negotiationFakes.h"
#include "serviceFakes.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Failure.h"
#include "support/FixedClock.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using namespace SsoClient::InternalApi;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

namespace {

#define WST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"

class NegotiateToken : public testing::Test
{
protected:
    NegotiateToken() { spec.tokenLifetimeSec = 300; }

    boost::shared_ptr<GssNegotiationContext> MakeContext() const
    {
        return boost::make_shared<GssNegotiationContextImpl>(
            spec,
            boost::make_shared<RequestBuilderImpl>(boost::none),
            transport->CreateSession(),
            boost::make_shared<ResponseHandlerImpl>(),
            trusted);
    }

    TokenSpec spec;
    boost::shared_ptr<FakeTransport> transport = boost::make_shared<FakeTransport>();
    std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> trusted =
        GetTestCertificates("sts");
    FixedClock clock{WhenTokensAreValid};
};

} // namespace

TEST_F(NegotiateToken, BeginsAndGoesOnUnderTheContextOfTheLastReply)
{
    transport->replies = {
        NegotiationReply("c1", "Zmlyc3Q=", ""),
        NegotiationReply("c2", "c2Vjb25k", ""),
        NegotiationReply("c3", "ZmluYWw=", GetSignedAssertion())};
    const auto context = MakeContext();

    const NegotiationResult first = context->NegotiateToken(ToLeg("one"));
    EXPECT_EQ(*first.leg, ToLeg("first"));
    EXPECT_EQ(first.token, nullptr);
    EXPECT_EQ(transport->sent[0].soapAction, WST "/RST/Issue");
    EXPECT_THAT(transport->sent[0].body, HasSubstr(" Context=\"urn:uuid:"));
    EXPECT_THAT(transport->sent[0].body, HasSubstr(">b25l</wst:BinaryExchange>"));

    const NegotiationResult second = context->NegotiateToken(ToLeg("two"));
    EXPECT_EQ(*second.leg, ToLeg("second"));
    EXPECT_EQ(transport->sent[1].soapAction, WST "/RSTR/Issue");
    EXPECT_THAT(transport->sent[1].body, HasSubstr(" Context=\"c1\""));
    EXPECT_THAT(transport->sent[1].body, HasSubstr(">dHdv</wst:BinaryExchange>"));

    const NegotiationResult third = context->NegotiateToken(ToLeg("three"));
    EXPECT_EQ(*third.leg, ToLeg("final"));
    ASSERT_NE(third.token, nullptr);
    EXPECT_EQ(third.token->GetConfirmationMethod(), SamlToken::CONFIRM_BEARER);
    EXPECT_THAT(transport->sent[2].body, HasSubstr(" Context=\"c2\""));
    EXPECT_EQ(transport->sessionsMade, 1);
}

TEST_F(NegotiateToken, GivesAnEmptyLegIfTheServiceSentNone)
{
    transport->replies = {NegotiationReply("c1", "", GetSignedAssertion())};
    const NegotiationResult result = MakeContext()->NegotiateToken(ToLeg("one"));
    ASSERT_NE(result.leg, nullptr);
    EXPECT_THAT(*result.leg, IsEmpty());
    EXPECT_NE(result.token, nullptr);
}

TEST_F(NegotiateToken, BeginsAnewAfterAReplyWithoutContextId)
{
    transport->replies = {
        NegotiationReply("", "Zmlyc3Q=", ""), NegotiationReply("c1", "Zmlyc3Q=", "")};
    const auto context = MakeContext();
    EXPECT_EQ(*context->NegotiateToken(ToLeg("one")).leg, ToLeg("first"));
    context->NegotiateToken(ToLeg("two"));
    EXPECT_EQ(transport->sent[1].soapAction, WST "/RST/Issue");
}

TEST_F(NegotiateToken, BeginsAnewAfterALaterReplyWithoutContextId)
{
    transport->replies = {
        NegotiationReply("c1", "Zmlyc3Q=", ""),
        NegotiationReply("", "c2Vjb25k", ""),
        NegotiationReply("c3", "Zmlyc3Q=", "")};
    const auto context = MakeContext();
    context->NegotiateToken(ToLeg("one"));
    context->NegotiateToken(ToLeg("two"));
    context->NegotiateToken(ToLeg("three"));
    EXPECT_EQ(transport->sent[1].soapAction, WST "/RSTR/Issue");
    EXPECT_EQ(transport->sent[2].soapAction, WST "/RST/Issue");
}

TEST_F(NegotiateToken, GoesOnAfterTheToken)
{
    transport->replies = {
        NegotiationReply("c1", "", GetSignedAssertion()), NegotiationReply("c1", "Zmlyc3Q=", "")};
    const auto context = MakeContext();
    context->NegotiateToken(ToLeg("one"));
    EXPECT_EQ(context->NegotiateToken(ToLeg("two")).token, nullptr);
    EXPECT_THAT(transport->sent[1].body, HasSubstr(" Context=\"c1\""));
}

TEST_F(NegotiateToken, SendsAnEmptyLeg)
{
    transport->replies = {NegotiationReply("c1", "Zmlyc3Q=", "")};
    EXPECT_EQ(*MakeContext()->NegotiateToken(Leg()).leg, ToLeg("first"));
    EXPECT_THAT(transport->sent[0].body, HasSubstr("></wst:BinaryExchange>"));
}

TEST_F(NegotiateToken, StaysWhereItWasOnFailure)
{
    transport->replies = {
        NegotiationReply("c1", "Zmlyc3Q=", ""), "no reply", NegotiationReply("c2", "c2Vjb25k", "")};
    const auto context = MakeContext();
    context->NegotiateToken(ToLeg("one"));
    EXPECT_THAT(
        GetFailure([&] { context->NegotiateToken(ToLeg("two")); }),
        StartsWith("SsoException: Response is not well-formed XML: "));
    context->NegotiateToken(ToLeg("two"));
    EXPECT_THAT(transport->sent[2].body, HasSubstr(" Context=\"c1\""));
}

TEST_F(NegotiateToken, GoesOnFromAReplyWhoseTokenIsRefused)
{
    transport->replies = {
        NegotiationReply("c1", "", "<Assertion/>"), NegotiationReply("c2", "Zmlyc3Q=", "")};
    const auto context = MakeContext();
    EXPECT_THROW(context->NegotiateToken(ToLeg("one")), ParseException);
    context->NegotiateToken(ToLeg("two"));
    EXPECT_THAT(transport->sent[1].body, HasSubstr(" Context=\"c1\""));
}

TEST_F(NegotiateToken, ReportsAMalformedAssertionAsSuch)
{
    transport->replies = {NegotiationReply("c1", "", "<Assertion/>")};
    EXPECT_THAT(
        GetFailure([&] { MakeContext()->NegotiateToken(ToLeg("one")); }),
        StartsWith("ParseException: "));
}

TEST_F(NegotiateToken, ReportsAnAssertionThatDoesNotVerify)
{
    std::string assertion = GetSignedAssertion();
    const std::size_t name = assertion.find("user@");
    ASSERT_NE(name, std::string::npos);
    assertion[name] = 'x';
    transport->replies = {NegotiationReply("c1", "", assertion)};
    EXPECT_THROW(MakeContext()->NegotiateToken(ToLeg("one")), InvalidSignatureException);
}

// The clocks of service and caller may differ by ten minutes. The token is valid in 2026.
TEST_F(NegotiateToken, ToleratesTenMinutesAndNoMore)
{
    transport->reply = NegotiationReply("c1", "", GetSignedAssertion());
    for (const char* const good : {"2025-12-31T23:50:00Z", "2026-12-31T00:09:59Z"}) {
        const FixedClock now(good);
        EXPECT_NE(MakeContext()->NegotiateToken(ToLeg("one")).token, nullptr) << good;
    }
    for (const char* const bad : {"2025-12-31T23:49:59Z", "2026-12-31T00:10:00Z"}) {
        const FixedClock now(bad);
        EXPECT_THROW(MakeContext()->NegotiateToken(ToLeg("one")), ParseException) << bad;
    }
}

TEST_F(NegotiateToken, SendsNothingIfATrustedCertificateIsNull)
{
    trusted.push_back(nullptr);
    const auto context = MakeContext();
    EXPECT_EQ(
        GetFailure([&context] { context->NegotiateToken(ToLeg("one")); }),
        "InvalidArgumentException: Invalid argument : A trusted certificate is null");
    EXPECT_THAT(transport->sent, IsEmpty());
}

TEST_F(NegotiateToken, LogsNothing)
{
    transport->replies = {NegotiationReply("c1", "ZmluYWw=", GetSignedAssertion())};
    const LogCapture log(64);
    MakeContext()->NegotiateToken(ToLeg("one"));
    EXPECT_THAT(log.lines, IsEmpty());
}

TEST_F(NegotiateToken, RefusesABadLifetime)
{
    spec.tokenLifetimeSec = -1;
    EXPECT_EQ(
        GetFailure([&] { MakeContext()->NegotiateToken(ToLeg("one")); }),
        "InvalidArgumentException: Invalid argument : Token lifetime must be positive");
    EXPECT_THAT(transport->sent, IsEmpty());
}

TEST(CreateGssNegotiationContext, RefusesAnEmptyListOfCertificates)
{
    SecurityTokenServiceConfig config;
    config.url = "http://127.0.0.1:9/sts";
    EXPECT_EQ(
        GetFailure([&] { CreateGssNegotiationContext(config, TokenSpec()); }),
        "InvalidArgumentException: Invalid argument : No STS trusted certificates provided");
}

TEST(CreateGssNegotiationContext, RefusesHttpsWithoutContext)
{
    SecurityTokenServiceConfig config;
    config.url = "https://127.0.0.1:9/sts";
    EXPECT_EQ(
        GetFailure([&] { CreateGssNegotiationContext(config, TokenSpec()); }),
        "InvalidArgumentException: Invalid argument : HTTPS connection requested but no SSLContext "
        "provided.");
}

TEST(CreateGssNegotiationContext, ConnectsOnlyWithTheFirstExchange)
{
    SecurityTokenServiceConfig config;
    config.url = "http://127.0.0.1:9/sts"; // nobody listens there
    config.trustedCertificates = GetTestCertificates("sts");
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    const auto context = CreateGssNegotiationContext(config, spec);
    ASSERT_NE(context, nullptr);
    EXPECT_THROW(context->NegotiateToken(ToLeg("one")), Quillon::Exception);
}
