#include "quillon/service/Logger.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <mutex>
#include <stdexcept>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <vector>

using namespace Quillon;
using namespace Quillon::Service;

namespace {

/** Gathers lines while it lives. */
class Capture
{
public:
    Capture()
    {
        GetApp()->GetLogFacility().SetSink(
            [this](const std::string& logger, int level, const std::string& text) {
                const std::lock_guard<std::mutex> lock(_mutex);
                _lines.push_back(logger + "|" + std::to_string(level) + "|" + text);
            });
    }
    ~Capture() { GetApp()->GetLogFacility().SetSink(LogSink()); }
    Capture(const Capture&) = delete;
    Capture& operator=(const Capture&) = delete;

    const std::vector<std::string>& GetLines() const { return _lines; }

private:
    std::mutex _mutex;
    std::vector<std::string> _lines;
};

Ref<Logger> GetLogger(const std::string& name)
{
    return GetApp()->GetLogFacility().GetLogger(name);
}

} // namespace

TEST(GetApp, IsAlwaysTheSame)
{
    ASSERT_NE(nullptr, GetApp());
    EXPECT_EQ(GetApp(), GetApp());
}

TEST(GetLogger, GivesOneLoggerForAName)
{
    EXPECT_EQ(GetLogger("one"), GetLogger("one"));
    EXPECT_NE(GetLogger("one"), GetLogger("two"));
    EXPECT_EQ("two", GetLogger("two")->GetName());
}

TEST(Log, WritesUpToTheLevelOfAWarningByDefault)
{
    const Capture capture;
    const Ref<Logger> logger = GetLogger("default");
    logger->Log(LOG_LEVEL_WARNING, "warning");
    logger->Log(LOG_LEVEL_WARNING + 1, "chatter");
    logger->Log(0, "grave");
    EXPECT_EQ(
        (std::vector<std::string>{"default|8|warning", "default|0|grave"}), capture.GetLines());
    EXPECT_TRUE(logger->IsEnabled(LOG_LEVEL_WARNING));
    EXPECT_FALSE(logger->IsEnabled(LOG_LEVEL_TRACE));
}

TEST(SetLevel, TakesEffectForThatLoggerOnly)
{
    const Capture capture;
    const Ref<Logger> logger = GetLogger("chatty");
    logger->SetLevel(LOG_LEVEL_TRACE);
    logger->Log(LOG_LEVEL_TRACE, "trace");
    logger->Log(LOG_LEVEL_TRACE + 1, "too much");
    GetLogger("quiet")->Log(LOG_LEVEL_TRACE, "nothing");
    EXPECT_EQ(LOG_LEVEL_TRACE, logger->GetLevel());
    EXPECT_EQ((std::vector<std::string>{"chatty|64|trace"}), capture.GetLines());
}

TEST(Log, WritesToStandardErrorByDefault)
{
    testing::internal::CaptureStderr();
    GetLogger("plain")->Log(LOG_LEVEL_WARNING, "50%s done");
    GetLogger("plain")->Log(LOG_LEVEL_TRACE, "unseen");
    EXPECT_EQ("plain[8]: 50%s done\n", testing::internal::GetCapturedStderr());
}

TEST(SetSink, EmptyFunctionBringsTheDefaultBack)
{
    {
        const Capture capture;
    }
    testing::internal::CaptureStderr();
    GetLogger("plain")->Log(LOG_LEVEL_WARNING, "back");
    EXPECT_EQ("plain[8]: back\n", testing::internal::GetCapturedStderr());
}

/** What a sink gets of a text. */
std::string GetLogged(const std::string& text)
{
    const Capture capture;
    GetLogger("logged")->Log(8, text);
    return capture.GetLines().at(0).substr(std::string("logged|8|").size());
}

TEST(Log, TellsWhatItWroteOutFromWhatWasThere)
{
    EXPECT_EQ("a\\x0ab", GetLogged("a\nb"));
    EXPECT_EQ("a\\x5cx0ab", GetLogged("a\\x0ab"));
    EXPECT_EQ("\\\\x0a", GetLogged("\\\n"));
    EXPECT_EQ("DOMAIN\\group \\x \\xg0 \\", GetLogged("DOMAIN\\group \\x \\xg0 \\"));
}

TEST(Log, WritesOutWhatSteersATerminalOrTheReader)
{
    EXPECT_EQ("\\xc2\\x9b", GetLogged("\u009b"));
    EXPECT_EQ("\\xe2\\x80\\xa8\\xe2\\x80\\xa9", GetLogged("\u2028\u2029"));
    EXPECT_EQ("\\xe2\\x80\\xae", GetLogged("\u202e"));
    EXPECT_EQ("\\xe2\\x81\\xa6", GetLogged("\u2066"));
    EXPECT_EQ("\\xd8\\x9c", GetLogged("\u061c"));
    EXPECT_EQ(
        "\u00a0\u2027\u202f\u2065\u206a\U0001f511",
        GetLogged("\u00a0\u2027\u202f\u2065\u206a\U0001f511"));
}

// [RFC 3629 3]
TEST(Log, WritesOutWhatIsNotUtf8)
{
    EXPECT_EQ("\\x9b", GetLogged("\x9b"));
    EXPECT_EQ("\\xc0\\x8a", GetLogged("\xc0\x8a"));
    EXPECT_EQ("\\xed\\xa0\\x80", GetLogged("\xed\xa0\x80"));
    EXPECT_EQ("\\xe2\\x80", GetLogged("\xe2\x80"));
    EXPECT_EQ("\\xf4\\x90\\x80\\x80", GetLogged("\xf4\x90\x80\x80"));
}

TEST(Log, WritesControlCharactersOut)
{
    const Capture capture;
    GetLogger("forged")->Log(8, "a\r\nforged[8]: b\tc\x7F\x1B ü");
    EXPECT_EQ(
        (std::vector<std::string>{"forged|8|a\\x0d\\x0aforged[8]: b\tc\\x7f\\x1b ü"}),
        capture.GetLines());
}

TEST(Log, SurvivesASinkThatThrows)
{
    GetApp()->GetLogFacility().SetSink(
        [](const std::string&, int, const std::string&) { throw std::runtime_error("no disk"); });
    GetLogger("unlucky")->Log(8, "lost");
    const Capture capture;
    GetLogger("unlucky")->Log(8, "found");
    EXPECT_EQ((std::vector<std::string>{"unlucky|8|found"}), capture.GetLines());
}

TEST(Log, SinkMayLogAndReplaceTheSink)
{
    LogFacility& facility = GetApp()->GetLogFacility();
    std::vector<std::string> second;
    facility.SetSink([&](const std::string&, int, const std::string&) {
        facility.SetSink([&second](const std::string&, int, const std::string& text) {
            second.push_back(text);
        });
        GetLogger("nested")->Log(8, "inner");
    });
    GetLogger("nested")->Log(8, "outer");
    facility.SetSink(LogSink());
    EXPECT_EQ((std::vector<std::string>{"inner"}), second);
}

TEST(Log, DeliversEachLineOnceFromManyThreads)
{
    constexpr int ThreadCount = 4;
    constexpr int LineCount = 1000;
    std::atomic<int> delivered{0};
    const LogSink first = [&delivered](const std::string&, int, const std::string&) {
        delivered.fetch_add(1);
    };
    const LogSink second = [&delivered](const std::string& logger, int, const std::string&) {
        delivered.fetch_add(logger == "busy" ? 1 : 0);
    };
    LogFacility& facility = GetApp()->GetLogFacility();
    facility.SetSink(first);

    std::vector<std::thread> threads;
    for (int i = 0; i < ThreadCount; ++i) {
        threads.emplace_back([] {
            for (int line = 0; line < LineCount; ++line) {
                GetLogger("busy")->Log(8, "line");
                GetLogger("busy" + std::to_string(line % 7))->SetLevel(line);
            }
        });
    }
    for (int i = 0; i < LineCount; ++i) {
        facility.SetSink(i % 2 == 0 ? second : first);
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    facility.SetSink(LogSink());
    EXPECT_EQ(ThreadCount * LineCount, delivered.load());
}

namespace {

/** Whether a child that is forked now can log. */
bool CanLogInChild()
{
    const pid_t child = fork();
    if (child == 0) {
        alarm(10); // a child that hangs ends here
        GetLogger("forked")->Log(8, "line");
        std::_Exit(0);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return status == 0;
}

/** Forks so often while others log that one of them is inside the logger's lock. */
[[noreturn]] void ForkWhileOthersLog()
{
    constexpr int ForkCount = 200;
    GetApp()->GetLogFacility().SetSink([](const std::string&, int, const std::string&) {});
    std::atomic<bool> goesOn{true};
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&goesOn] {
            while (goesOn) {
                GetLogger("parent")->Log(8, "");
            }
        });
    }
    int good = 0;
    while (good < ForkCount && CanLogInChild()) {
        ++good;
    }
    goesOn = false;
    for (std::thread& thread : threads) {
        thread.join();
    }
    std::_Exit(good == ForkCount ? 0 : 1);
}

} // namespace

TEST(Log, WorksInAChildThatWasForkedWhileOthersLogged)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(ForkWhileOthersLog(), testing::ExitedWithCode(0), "^$");
}
