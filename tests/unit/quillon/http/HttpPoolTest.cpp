#include "HttpClient.h"

#include "quillon/system/ThreadPool.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <future>
#include <string>
#include <thread>

using namespace Testing;
using Quillon::System::GetThreadPool;

// Work of the thread pool that sends requests while the process ends. Each test runs in a fresh
// process: a "death test" that ends with exit code 0.

namespace {

class HttpPoolProcess : public testing::Test
{
protected:
    HttpPoolProcess() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

/** What the work came to; made before the pool starts, so it is destroyed after the pool's end. */
struct Outcome
{
    const std::string expected;
    std::promise<std::string> actual;

    ~Outcome()
    {
        auto future = actual.get_future();
        // The end has waited for the work, so this does not have to.
        if (future.wait_for(std::chrono::seconds(0)) != std::future_status::ready
            || future.get() != expected) {
            std::abort();
        }
    }
};

/** A server that answers the first request of a connection and is silent from then on. */
TestServer::Handler AnswerOnce(std::promise<void>& askedAgain)
{
    return [&askedAgain](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write(MakeReply("200 OK", "pong"));
        if (connection.ReadRequest()) {
            askedAgain.set_value();
        }
        connection.WaitForClose();
    };
}

enum class First
{
    POOL,
    HTTP
};

/** Ends the process while work waits for an exchange that gets no reply. */
[[noreturn]] void ExitWhileWorkWaits(First first)
{
    static std::promise<void> asked;
    static const TestServer server(AnswerOnce(asked));
    static Outcome outcome{"The process is about to end.", {}};
    // Never destroyed: the work uses it until the end.
    static HttpClient& client = *new HttpClient(server);
    if (first == First::POOL) {
        GetThreadPool()->Queue([] {});
    }
    client.Post();
    GetThreadPool()->Queue([] { outcome.actual.set_value(client.PostAndFail()); });
    asked.get_future().wait();
    std::exit(0);
}

TEST_F(HttpPoolProcess, ReleasesWorkThatWaitsIfThePoolWasUsedFirst)
{
    EXPECT_EXIT(ExitWhileWorkWaits(First::POOL), testing::ExitedWithCode(0), "^$");
}

TEST_F(HttpPoolProcess, ReleasesWorkThatWaitsIfHttpWasUsedFirst)
{
    EXPECT_EXIT(ExitWhileWorkWaits(First::HTTP), testing::ExitedWithCode(0), "^$");
}

/** Ends the process with work that sends its first request when the end has begun. */
[[noreturn]] void ExitBeforeTheFirstExchange()
{
    static const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    static Outcome outcome{"The process is about to end and sends nothing any more.", {}};
    static std::promise<void> begun;
    GetThreadPool()->Queue([] {
        begun.set_value();
        for (bool hasEnded = false; !hasEnded; std::this_thread::yield()) {
            try {
                GetThreadPool()->Queue([] {});
            } catch (const Quillon::InvalidStateException&) {
                hasEnded = true;
            }
        }
        outcome.actual.set_value(HttpClient(server).PostAndFail());
    });
    begun.get_future().wait();
    std::exit(0);
}

TEST_F(HttpPoolProcess, SendsNothingMoreForWorkThatFinishes)
{
    EXPECT_EXIT(ExitBeforeTheFirstExchange(), testing::ExitedWithCode(0), "^$");
}

/** Ends the process in work that has sent a request, while other work waits for a reply. */
[[noreturn]] void ExitInWork()
{
    static std::promise<void> asked;
    static const TestServer server(AnswerOnce(asked));
    static Outcome outcome{"The process is about to end.", {}};
    static HttpClient& client = *new HttpClient(server);
    GetThreadPool()->Queue([] {
        client.Post();
        GetThreadPool()->Queue([] { outcome.actual.set_value(client.PostAndFail()); });
        asked.get_future().wait();
        std::exit(0);
    });
    std::promise<void>().get_future().wait();
    std::abort();
}

TEST_F(HttpPoolProcess, ReleasesOtherWorkWhenWorkExits)
{
    EXPECT_EXIT(ExitInWork(), testing::ExitedWithCode(0), "^$");
}

} // namespace
