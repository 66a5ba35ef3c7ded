#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClient/protocol/HttpsClient.h"
#include "support/TestData.h"

#include <gmock/gmock.h>

#include <vector>

using testing::ElementsAre;

// The transport of this program, which only notes its time-out.

namespace {

std::vector<long long> timeouts;

SsoClient::SecurityTokenServiceConfig MakeConfig()
{
    SsoClient::SecurityTokenServiceConfig config;
    config.url = "http://127.0.0.1/sts";
    config.trustedCertificates = GetTestCertificates("sts");
    return config;
}

} // namespace

namespace SsoClient {

HttpsClient::HttpsClient(
    std::string const& /*url*/,
    Quillon::Ssl::SSLContext* /*sslContext*/,
    std::string const& /*peer*/,
    long long timeout)
    : _timeout(timeout)
{
    timeouts.push_back(timeout);
}

boost::shared_ptr<TransportSession> HttpsClient::CreateSession() const
{
    return nullptr;
}

} // namespace SsoClient

TEST(CreateSecurityTokenService, GivesEachExchange240Seconds)
{
    timeouts.clear();
    SsoClient::CreateSecurityTokenService(MakeConfig());
    EXPECT_THAT(timeouts, ElementsAre(240'000'000));
}

TEST(CreateGssNegotiationContext, GivesEachExchange40Seconds)
{
    timeouts.clear();
    SsoClient::InternalApi::CreateGssNegotiationContext(MakeConfig(), {});
    EXPECT_THAT(timeouts, ElementsAre(40'000'000));
}
