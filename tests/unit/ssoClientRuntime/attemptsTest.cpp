#include "ssoClientRuntime/attempts.h"

#include "ScriptedService.h"

#include "support/FakeSamlToken.h"
#include "support/TestData.h"

#include "quillon/http/HttpException.h"
#include "ssoClient/Exceptions.h"
#include "ssoClientRuntime/Exceptions.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <chrono>
#include <stdexcept>
#include <string>

using namespace SsoClient;
using namespace std::chrono_literals;
using Testing::Token;

namespace {

template <class Error>
std::string TryToThrow(const Error& error)
{
    const Outcome outcome = Try([&]() -> Token { throw error; });
    EXPECT_EQ(nullptr, outcome.token);
    return DescribeFailure(*outcome.failure);
}

TEST(Try, GivesTheToken)
{
    const Token token = boost::make_shared<FakeSamlToken>();
    const Outcome outcome = Try([&] { return token; });
    EXPECT_EQ(token, outcome.token);
    EXPECT_EQ(nullptr, outcome.failure);
}

TEST(Try, KeepsWhatIsThrownAsWhatItIs)
{
    EXPECT_EQ("InvalidCredentialsException: no", TryToThrow(InvalidCredentialsException("no")));
    EXPECT_EQ("SsoException: runtime_error: why", TryToThrow(std::runtime_error("why")));
    EXPECT_EQ("SsoException: Something that is not an exception was thrown", TryToThrow(1));
}

TEST(Try, TakesNoTokenForAFailure)
{
    const Outcome outcome = Try([] { return Token(); });
    EXPECT_EQ("SsoException: The token service gave no token", DescribeFailure(*outcome.failure));
}

TEST(Classify, TakesTheNetworkForPassingAndEverythingElseForRefused)
{
    EXPECT_EQ(FailureKind::TRANSIENT, Classify(Quillon::Http::HttpException("")));
    EXPECT_EQ(FailureKind::TRANSIENT, Classify(Quillon::Http::TimeoutException("")));
    EXPECT_EQ(FailureKind::TRANSIENT, Classify(CommunicationException("")));
    EXPECT_EQ(FailureKind::TRANSIENT, Classify(NoTokenException(TokenOutage())));
    EXPECT_EQ(FailureKind::REFUSED, Classify(SsoException("")));
    EXPECT_EQ(FailureKind::REFUSED, Classify(InvalidCredentialsException("")));
    EXPECT_EQ(FailureKind::REFUSED, Classify(InvalidSignatureException("")));
    EXPECT_EQ(FailureKind::REFUSED, Classify(Quillon::InvalidArgumentException("")));
}

Span ReadLifetime(const std::string& xml)
{
    FakeSamlToken token; // from 09:00 to 10:00
    token.xml = xml;
    const Validity validity = ReadValidity(token);
    return validity.end - validity.issued;
}

TEST(ReadValidity, BeginsWithTheIssueInstant) // [SAML-CORE 2.3.3]
{
    EXPECT_EQ(Span(50min), ReadLifetime("<a IssueInstant='2011-07-05T09:10:00Z'/>"));
    EXPECT_EQ(Span(70min), ReadLifetime("<a IssueInstant='2011-07-05T08:50:00Z'/>"));
}

TEST(ReadValidity, BeginsWithTheStartIfThereIsNoOtherThatMakesSense)
{
    for (const std::string xml :
         {"",
          "<a/>",
          "<a IssueInstant='today'/>",
          "<a IssueInstant='2011-07-05T10:00:00Z'/>",
          "<a IssueInstant='2011-07-05T09:10:00Z'>"}) {
        EXPECT_EQ(Span(60min), ReadLifetime(xml)) << xml;
    }
}

TEST(IsRenewableBy, WantsARenewableTokenOfThatCertificate)
{
    const auto own = GetTestCertificates("client").front();
    const auto other = GetTestCertificates("sts").front();
    FakeSamlToken token;
    token.renewable = true;
    token.confirmationMethod = FakeSamlToken::CONFIRM_HOLDER_OF_KEY;
    token.certificate = own;
    EXPECT_TRUE(IsRenewableBy(token, own.get()));
    EXPECT_FALSE(IsRenewableBy(token, other.get()));
    EXPECT_FALSE(IsRenewableBy(token, nullptr));
    token.confirmationMethod = FakeSamlToken::CONFIRM_BEARER;
    EXPECT_FALSE(IsRenewableBy(token, own.get()));
    token.confirmationMethod = FakeSamlToken::CONFIRM_HOLDER_OF_KEY;
    token.renewable = false;
    EXPECT_FALSE(IsRenewableBy(token, own.get()));
    token.renewable = true;
    token.certificate.reset();
    EXPECT_FALSE(IsRenewableBy(token, own.get()));
}

TEST(DescribeFailure, CutsLongTexts)
{
    EXPECT_EQ(
        "SsoException: " + std::string(500, 'a'),
        DescribeFailure(SsoException(std::string(500, 'a'))));
    EXPECT_EQ(
        "SsoException: " + std::string(500, 'a') + "...",
        DescribeFailure(SsoException(std::string(501, 'a'))));
}

TEST(NoTokenException, SaysWhySinceWhenAndWhenNext)
{
    TokenOutage outage;
    EXPECT_STREQ("There is no token yet", NoTokenException(outage).what());
    outage.reason = std::make_shared<CommunicationException>("no route");
    outage.since = Quillon::System::DateTime("2011-07-05T09:00:00Z");
    EXPECT_STREQ(
        "There is no token; attempts have failed since 2011-07-05T09:00:00.000Z:"
        " CommunicationException: no route",
        NoTokenException(outage).what());
    outage.nextAttempt = Quillon::System::DateTime("2011-07-05T09:00:02.5Z");
    EXPECT_STREQ(
        "There is no token; attempts have failed since 2011-07-05T09:00:00.000Z, the next one is at"
        " 2011-07-05T09:00:02.500Z: CommunicationException: no route",
        NoTokenException(outage).what());
}

TEST(NoTokenException, KeepsTheReasonWhenItIsRaisedAgain)
{
    TokenOutage outage;
    outage.reason = std::make_shared<InvalidCredentialsException>("wrong password");
    try {
        const NoTokenException error(outage);
        const Quillon::Exception& plain = error;
        plain.Throw();
    } catch (const NoTokenException& error) {
        EXPECT_THROW(error.GetOutage().reason->Throw(), InvalidCredentialsException);
    }
}

} // namespace
