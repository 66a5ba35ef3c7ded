#include "quillon/ssl/SSLContext.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClient/protocol/HttpsClient.h"
#include "support/Failure.h"
#include "support/TestData.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gmock/gmock.h>

#include <vector>

using namespace SsoClient;
using testing::HasSubstr;
using testing::Not;

// The transport of this program, which only notes what it is given and answers nothing.

namespace {

struct Given
{
    std::string url;
    Quillon::Ssl::SSLContext* sslContext;
    std::string peer;
    long long timeout;
    long long connectTimeout; ///< 0 if it was not given
};
std::vector<Given> given;
std::vector<std::string> sent;

class MuteSession final : public TransportSession
{
public:
    void SendRequest(const Request& request, Quillon::Ref<Quillon::Reader>&) override
    {
        sent.push_back(request.body);
        throw CommunicationException("mute");
    }
    void SendRequestAsync(
        const Request&,
        const ResponseCallback&,
        Quillon::Ref<Quillon::System::ScheduledItem>&) override
    {
        FAIL();
    }
};

} // namespace

namespace SsoClient {

HttpsClient::HttpsClient(
    const std::string& url,
    Quillon::Ssl::SSLContext* sslContext,
    const std::string& peer,
    long long timeout)
{
    given.push_back({url, sslContext, peer, timeout, 0});
}

HttpsClient::HttpsClient(
    const std::string& url,
    Quillon::Ssl::SSLContext* sslContext,
    const std::string& peer,
    const ExchangeOptions& options)
{
    given.push_back(
        {url, sslContext, peer, options.timeoutMicroseconds, options.connectTimeoutMicroseconds});
}

void HttpsClient::RequireUsable() const {}

boost::shared_ptr<TransportSession> HttpsClient::CreateSession() const
{
    return boost::make_shared<MuteSession>();
}

boost::shared_ptr<TransportSession> HttpsClient::CreateControlledSession(
    const SessionOptions&) const
{
    return CreateSession();
}

boost::shared_ptr<const Transport> HttpsClient::WithReuse(
    const boost::optional<ConnectionReuse>&) const
{
    return boost::make_shared<HttpsClient>(*this);
}

} // namespace SsoClient

namespace {

class Factory : public testing::Test
{
protected:
    Factory()
    {
        given.clear();
        sent.clear();
        config.url = "https://sts.example.com:7444/sts/STSService";
        config.trustedCertificates = GetTestCertificates("sts");
        config.sslPeerParameter = "sha256//AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA=";
        config.holderOfKeyConfig =
            HolderOfKeyConfig{GetTestKey("client"), GetTestCertificates("client").front()};
        config.sslContext = sslContext.get();
    }

    /** What a negotiation's first leg goes out with. */
    std::string SendLeg() const
    {
        const auto context = InternalApi::CreateGssNegotiationContext(config, TokenSpec());
        EXPECT_EQ(
            GetFailure([&context] {
                context->NegotiateToken({'l', 'e', 'g'});
            }),
            "CommunicationException: mute");
        return sent.back();
    }

    std::string SendPassword() const
    {
        const auto service = CreateSecurityTokenService(config);
        EXPECT_EQ(
            GetFailure([&service] { service->AcquireToken("user", "password", TokenSpec()); }),
            "CommunicationException: mute");
        return sent.back();
    }

    Quillon::Ref<Quillon::Ssl::SSLContext> sslContext = Quillon::Ssl::CreateSSLContext({});
    SecurityTokenServiceConfig config;
};

class CreateSecurityTokenServiceTest : public Factory
{};
class CreateGssNegotiationContextTest : public Factory
{};

} // namespace

TEST_F(CreateSecurityTokenServiceTest, GivesEachExchange240Seconds)
{
    CreateSecurityTokenService(config);
    ASSERT_EQ(given.size(), 1U);
    EXPECT_EQ(given[0].timeout, 240'000'000);
}

TEST_F(CreateSecurityTokenServiceTest, GivesEachExchangeTheLimitsOfItsOptions)
{
    ExchangeOptions options;
    options.timeoutMicroseconds = 30'000'000;
    options.connectTimeoutMicroseconds = 10'000'000;
    CreateSecurityTokenService(config, options);
    ASSERT_EQ(given.size(), 1U);
    EXPECT_EQ(given[0].timeout, 30'000'000);
    EXPECT_EQ(given[0].connectTimeout, 10'000'000);
}

TEST_F(CreateSecurityTokenServiceTest, RefusesLimitsThatAreNotPositive)
{
    for (long long ExchangeOptions::*limit :
         {&ExchangeOptions::timeoutMicroseconds, &ExchangeOptions::connectTimeoutMicroseconds}) {
        ExchangeOptions options;
        options.*limit = 0;
        EXPECT_EQ(
            GetFailure([&] { CreateSecurityTokenService(config, options); }),
            "InvalidArgumentException: Invalid argument : The time-out of 0 microseconds is not "
            "positive.");
    }
}

TEST_F(CreateGssNegotiationContextTest, GivesEachExchange40Seconds)
{
    InternalApi::CreateGssNegotiationContext(config, {});
    ASSERT_EQ(given.size(), 1U);
    EXPECT_EQ(given[0].timeout, 40'000'000);
}

TEST_F(Factory, GivesTheTransportWhatTheConfigurationSays)
{
    CreateSecurityTokenService(config);
    InternalApi::CreateGssNegotiationContext(config, {});
    ASSERT_EQ(given.size(), 2U);
    for (const Given& each : given) {
        EXPECT_EQ(each.url, config.url);
        EXPECT_EQ(each.sslContext, sslContext.get());
        EXPECT_EQ(each.peer, config.sslPeerParameter);
    }
}

TEST_F(Factory, SignsWithTheIdentityOfTheConfiguration)
{
    EXPECT_THAT(SendLeg(), HasSubstr("<ds:Signature "));
    EXPECT_THAT(SendPassword(), HasSubstr("<ds:Signature "));
}

TEST_F(Factory, TakesHalfAnIdentityForNone)
{
    config.holderOfKeyConfig->certificate.reset();
    EXPECT_THAT(SendLeg(), Not(HasSubstr("Signature")));
    EXPECT_THAT(SendPassword(), Not(HasSubstr("Signature")));
}
