#include "Day.h"
#include "ScriptedService.h"
#include "VirtualEnvironment.h"

#include "support/FakeSamlToken.h"
#include "support/FreedMemory.h"

#include "quillon/service/Logger.h"
#include "ssoClientRuntime/DelegatedTokens.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <chrono>
#include <string>

using namespace SsoClient;
using namespace std::chrono_literals;
using Testing::Day;
using Testing::ScriptedService;
using Testing::Secret;
using Testing::VirtualEnvironment;

namespace {

TEST(Day, LeavesNoSecretBehind)
{
    Quillon::Service::GetApp()->GetLogFacility().SetSink(
        [](const std::string&, int, const std::string&) {});
    const FreedMemory freed(Secret);
    Day(7).Live();
    EXPECT_FALSE(freed.HeldTheText());
}

TEST(DelegatedTokens, OverwriteWhatTheyKeptOfAPresentedToken)
{
    const auto environment = boost::make_shared<VirtualEnvironment>();
    const auto service = boost::make_shared<ScriptedService>(environment);
    DelegatedTokensOptions options;
    options.environment = environment;
    const auto tokens = CreateDelegatedTokens(options);
    FakeSamlToken user;
    user.xml = "<user>" + std::string(Secret) + "</user>";
    user.endDate = Testing::After(environment->GetWallTime(), 24h);
    {
        const FreedMemory freed(Secret);
        tokens->GetToken(service, user, TokenSpec());
        tokens->GetToken(service, user, TokenSpec());
        EXPECT_EQ(1U, tokens->GetStatus().entries);
        tokens->Clear();
        EXPECT_FALSE(freed.HeldTheText());
    }
}

} // namespace
