#include "ServiceOptions.h"

#include <gtest/gtest.h>

TEST(ServiceOptions, LimitAnExchangeAsTheLibraryDoesAndConnectingToTenSeconds)
{
    const SsoClient::ExchangeOptions limits = ServiceOptions().GetExchangeOptions();
    EXPECT_EQ(limits.timeoutMicroseconds, SsoClient::ExchangeOptions().timeoutMicroseconds);
    EXPECT_EQ(limits.connectTimeoutMicroseconds, 10'000'000);
}

TEST(ServiceOptions, LimitConnectingToTheWholeIfThatIsShorter)
{
    ServiceOptions options;
    options.timeoutSec = 3;
    const SsoClient::ExchangeOptions limits = options.GetExchangeOptions();
    EXPECT_EQ(limits.timeoutMicroseconds, 3'000'000);
    EXPECT_EQ(limits.connectTimeoutMicroseconds, 3'000'000);
}
