#include "HttpClient.h"

#include "quillon/system/ThreadPool.h"
#include "support/PoolSupport.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <future>
#include <string>

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

/**
 * What work came to. Made just before the pool starts, so it is destroyed when the pool has waited
 * for the work, and nothing else has happened since.
 */
struct Outcome
{
    const std::string expected;
    std::promise<std::string> actual;

    ~Outcome()
    {
        auto future = actual.get_future();
        if (future.wait_for(std::chrono::seconds(0)) != std::future_status::ready
            || future.get() != expected) {
            std::abort();
        }
    }
};

/** Answers requests, but for those that say "wait". */
TestServer::Handler AnswerUnlessToldToWait(std::promise<void>& isWaiting)
{
    return [&isWaiting](ServerConnection& connection) {
        while (const auto request = connection.ReadRequest()) {
            if (request->body == "wait") {
                isWaiting.set_value();
                connection.WaitForClose();
                return;
            }
            connection.Write(MakeReply("200 OK", "pong"));
        }
    };
}

std::string PostAndWait(HttpClient& client)
{
    return client.PostAndFail(HttpClient::MakeRequest("wait"));
}

enum class First
{
    POOL,
    HTTP
};

/** Ends the process while work waits for an exchange that gets no reply. */
[[noreturn]] void ExitWhileWorkWaits(First first)
{
    static std::promise<void> isWaiting;
    static const TestServer server(AnswerUnlessToldToWait(isWaiting));
    // Never destroyed: the work uses it until the end.
    static HttpClient& client = *new HttpClient(server);
    if (first == First::HTTP) {
        client.Post();
    }
    static Outcome outcome{"The process is about to end.", {}};
    GetThreadPool()->Queue([] {});
    client.Post();
    GetThreadPool()->Queue([] { outcome.actual.set_value(PostAndWait(client)); });
    isWaiting.get_future().wait();
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
        AwaitEnd(*GetThreadPool());
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
    static std::promise<void> isWaiting;
    static const TestServer server(AnswerUnlessToldToWait(isWaiting));
    static HttpClient& client = *new HttpClient(server);
    client.Post();
    static Outcome outcome{"The process is about to end.", {}};
    GetThreadPool()->Queue([] {
        GetThreadPool()->Queue([] { outcome.actual.set_value(PostAndWait(client)); });
        isWaiting.get_future().wait();
        client.Post();
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
