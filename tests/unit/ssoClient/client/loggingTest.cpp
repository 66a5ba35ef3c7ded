#include "ssoClient/client/logging.h"

#include "logCapture.h"

#include <gtest/gtest.h>

#include <set>
#include <thread>

using namespace SsoClient;

TEST(GetLogger, GivesTheLoggerOfTheLibrary)
{
    EXPECT_EQ(getLogger()->GetName(), "SsoClient");
    EXPECT_EQ(
        getLogger(), Quillon::Service::GetApp()->GetLogFacility().GetLogger("SsoClient").get());
}

TEST(GetLogger, GivesTheSameLoggerToEveryThread)
{
    std::vector<Quillon::Service::Logger*> loggers(8, nullptr);
    std::vector<std::thread> threads;
    for (Quillon::Service::Logger*& logger : loggers) {
        threads.emplace_back([&logger] { logger = getLogger(); });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(
        std::set<Quillon::Service::Logger*>(loggers.begin(), loggers.end()),
        std::set<Quillon::Service::Logger*>{getLogger()});
}

TEST(LogTrace, WritesAtLevel64)
{
    LogCapture log(64);
    LogTrace([] { return "text"; });
    EXPECT_EQ(log.lines, std::vector<std::string>{"SsoClient[64]: text"});
}

TEST(LogTrace, DescribesNothingBelowLevel64)
{
    LogCapture log(63);
    bool described = false;
    LogTrace([&described] {
        described = true;
        return "text";
    });
    EXPECT_FALSE(described);
    EXPECT_TRUE(log.lines.empty());
}
