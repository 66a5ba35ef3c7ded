#include "ssoClientRuntime/ProcessEnvironment.h"

#include "ScriptedService.h"

#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"

#include "quillon/system/Clock.h"
#include "ssoClient/Exceptions.h"
#include "ssoClientRuntime/TokenSource.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <future>
#include <memory>
#include <thread>
#include <vector>

using namespace SsoClient;
using namespace std::chrono_literals;

namespace {

TEST(ProcessEnvironment, IsOne)
{
    EXPECT_EQ(GetProcessEnvironment(), GetProcessEnvironment());
}

TEST(ProcessEnvironment, ReadsTheClockOfTheProcess)
{
    const FixedClock clock("2011-07-05T09:00:00Z");
    EXPECT_EQ(clock.Now(), GetProcessEnvironment()->GetWallTime());
}

TEST(ProcessEnvironment, DrawsNumbersBelowOne)
{
    double sum = 0;
    for (int draw = 0; draw < 10'000; ++draw) {
        const double number = GetProcessEnvironment()->DrawNumber();
        ASSERT_GE(number, 0);
        ASSERT_LT(number, 1);
        sum += number;
    }
    EXPECT_NEAR(5'000, sum, 300); // ten times the standard deviation
}

TEST(ProcessEnvironment, RunsWorkOnAnotherThread)
{
    std::promise<std::thread::id> thread;
    GetProcessEnvironment()->Run([&] { thread.set_value(std::this_thread::get_id()); });
    EXPECT_NE(std::this_thread::get_id(), thread.get_future().get());
}

TEST(ProcessEnvironment, RunsWorkInTheOrderOfItsTimesAndNeverEarly)
{
    const auto environment = GetProcessEnvironment();
    const auto now = environment->GetSteadyTime();
    std::vector<int> order;
    std::promise<std::chrono::steady_clock::time_point> ended;
    environment->RunAt(now + 30ms, [&] {
        order.push_back(3);
        ended.set_value(environment->GetSteadyTime());
    });
    environment->RunAt(now + 20ms, [&] { order.push_back(2); });
    environment->RunAt(now - 1h, [&] { order.push_back(1); });
    EXPECT_GE(ended.get_future().get(), now + 30ms);
    EXPECT_EQ((std::vector{1, 2, 3}), order);
}

TEST(ProcessEnvironment, LetsGoOfWorkThatHasRun)
{
    const auto bound = std::make_shared<int>(0);
    const std::weak_ptr<int> rest = bound;
    std::promise<void> next;
    const auto now = GetProcessEnvironment()->GetSteadyTime();
    GetProcessEnvironment()->RunAt(now, [kept = bound] {});
    GetProcessEnvironment()->RunAt(now + 1ms, [&] { next.set_value(); });
    next.get_future().get();
    EXPECT_EQ(1, rest.use_count());
}

// The thread that waits for times goes on beyond the end of this environment's static objects.
TEST(ProcessEnvironment, RunsNothingMoreAfterItsEnd)
{
    static auto* const environment = new ProcessEnvironment();
    std::promise<void> first;
    environment->RunAt(environment->GetSteadyTime(), [&] { first.set_value(); });
    first.get_future().get();
    environment->End();
    bool hasRun = false;
    environment->RunAt(environment->GetSteadyTime(), [&] { hasRun = true; });
    std::promise<void> later;
    const auto soon = environment->GetSteadyTime() + 20ms;
    GetProcessEnvironment()->RunAt(soon, [&] { later.set_value(); });
    later.get_future().get();
    EXPECT_FALSE(hasRun);
}

boost::shared_ptr<const SamlToken> MakeTokenOfAnHour()
{
    const auto token = boost::make_shared<FakeSamlToken>();
    token->startDate = Quillon::System::GetUtcDateTime();
    token->endDate = Testing::After(token->startDate, 1h);
    return token;
}

TEST(ProcessEnvironment, HasSourcesRefreshByThemselves)
{
    // An attempt may go on when the source is gone.
    const auto made = std::make_shared<std::atomic<int>>(0);
    const auto third = std::make_shared<std::promise<void>>();
    TokenSourceOptions options;
    options.refreshAt = 0.00001; // of an hour
    options.minWait = 1ms;
    const auto source = CreateTokenSource(
        [made, third] {
            if (++*made == 3) {
                third->set_value();
            }
            return MakeTokenOfAnHour();
        },
        options);
    EXPECT_NE(nullptr, source->GetToken());
    third->get_future().get();
}

TEST(ProcessEnvironmentDeathTest, LetsTheProcessEndWhileSourcesWait)
{
    const auto run = [] {
        static const auto source = CreateTokenSource(
            []() -> boost::shared_ptr<const SamlToken> { throw CommunicationException("no"); });
        EXPECT_THROW(source->GetToken(), NoTokenException);
        std::exit(3);
    };
    EXPECT_EXIT(run(), testing::ExitedWithCode(3), "");
}

} // namespace
