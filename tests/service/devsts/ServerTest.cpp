#include "Harness.h"
#include "Requests.h"

#include <condition_variable>
#include <future>
#include <httplib.h>
#include <mutex>

namespace DevStsTests {

namespace {

using InProcessServer = ServerTest;

TEST_F(InProcessServer, ReceivedRequestsShowHeadersAndBody)
{
    const std::string request = PasswordRequest();
    PostIssue(request);
    const std::vector<DevSts::ReceivedRequest> received = _server.ReceivedRequests();
    ASSERT_EQ(received.size(), 1U);
    EXPECT_EQ(received[0].method, "POST");
    EXPECT_EQ(received[0].path, "/sts");
    EXPECT_EQ(received[0].headers.find("content-type")->second, "text/xml");
    EXPECT_EQ(
        received[0].headers.find("SOAPACTION")->second,
        '"' + std::string(Ns::Wst) + "/RST/Issue\"");
    EXPECT_EQ(received[0].body, request);
}

TEST_F(InProcessServer, HookChangesTheNextReplyOnly)
{
    _server.OnNextReply([](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
        reply.status = 503;
        reply.contentType = "text/plain";
        reply.body = "busy";
        reply.headers.emplace("Set-Cookie", "a=b");
    });
    const HttpResult changed = PostIssue(PasswordRequest());
    EXPECT_EQ(changed.status, 503);
    EXPECT_EQ(changed.body, "busy");
    EXPECT_EQ(changed.headers.find("Set-Cookie")->second, "a=b");
    EXPECT_EQ(changed.headers.find("Content-Type")->second, "text/plain");
    EXPECT_EQ(PostIssue(PasswordRequest()).status, 200);
}

TEST_F(InProcessServer, HookSeesTheReplyItChanges)
{
    _server.OnNextReply([](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
        reply.body = Replaced(reply.body, ">alice@example.test<", ">admin@example.test<");
    });
    const std::string reply = PostIssue(PasswordRequest()).body;
    EXPECT_EQ(FindOne(reply, "//saml:Subject/saml:NameID"), "admin@example.test");
    EXPECT_FALSE(VerifiesWithXmlSec(AssertionIn(reply)));
}

TEST_F(InProcessServer, DelayOutlastsAnImpatientClient)
{
    _server.SetDelay(std::chrono::milliseconds(500));
    httplib::Client client("127.0.0.1", _port);
    client.set_read_timeout(std::chrono::milliseconds(50));
    EXPECT_FALSE(client.Post("/sts", PasswordRequest(), "text/xml"));
}

TEST_F(InProcessServer, StoppedServerIsGone)
{
    _server.Stop();
    httplib::Client client("127.0.0.1", _port);
    EXPECT_FALSE(client.Post("/sts", PasswordRequest(), "text/xml"));
}

TEST_F(InProcessServer, StopDoesNotWaitForIdleConnections)
{
    httplib::Client client("127.0.0.1", _port);
    client.set_keep_alive(true);
    ASSERT_TRUE(client.Get("/sts"));
    const auto begun = std::chrono::steady_clock::now();
    _server.Stop();
    // Idle connections live for five seconds.
    EXPECT_LT(std::chrono::steady_clock::now() - begun, std::chrono::seconds(4));
}

TEST_F(InProcessServer, StopAnswersTheRequestUnderWay)
{
    std::promise<void> begun;
    std::promise<void> stopping;
    _server.OnNextReply([&](const DevSts::ReceivedRequest&, DevSts::Reply&) {
        begun.set_value();
        stopping.get_future().wait();
    });
    std::future<HttpResult> reply =
        std::async(std::launch::async, [this] { return PostIssue(PasswordRequest()); });
    begun.get_future().wait();
    std::future<void> stopped = std::async(std::launch::async, [this] { _server.Stop(); });
    // Once nobody can connect, the stop has begun.
    while (httplib::Client("127.0.0.1", _port).Get("/sts")) {
    }
    stopping.set_value();
    EXPECT_EQ(reply.get().status, 200);
    stopped.get();
}

TEST_F(InProcessServer, UnusableAddressIsReported)
{
    DevSts::Options options;
    options.stateDir = SharedState();
    options.host = "256.256.256.256";
    DevSts::Server second(options);
    EXPECT_THROW(second.Start(), std::runtime_error);
}

TEST_F(InProcessServer, TakenPortIsReported)
{
    DevSts::Options options;
    options.stateDir = SharedState();
    options.port = _port;
    DevSts::Server second(options);
    EXPECT_THROW(second.Start(), std::runtime_error);
}

TEST_F(InProcessServer, AnswersManyClientsAtOnce)
{
    std::vector<std::future<HttpResult>> replies(40);
    for (std::future<HttpResult>& reply : replies) {
        reply = std::async(std::launch::async, [this] { return PostIssue(PasswordRequest()); });
    }
    for (std::future<HttpResult>& reply : replies) {
        EXPECT_EQ(reply.get().status, 200);
    }
}

TEST_F(InProcessServer, HundredRequestsAreUnderWayAtOnce)
{
    constexpr int Clients = 100;
    std::mutex mutex;
    std::condition_variable arrived;
    int underWay = 0;
    for (int i = 0; i < Clients; ++i) {
        _server.OnNextReply([&](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
            std::unique_lock<std::mutex> lock(mutex);
            ++underWay;
            arrived.notify_all();
            const bool all = arrived.wait_for(
                lock, std::chrono::seconds(30), [&] { return underWay == Clients; });
            reply.status = all ? 200 : 503;
        });
    }
    std::vector<std::future<HttpResult>> replies(Clients);
    for (std::future<HttpResult>& reply : replies) {
        reply = std::async(std::launch::async, [this] { return PostIssue(PasswordRequest()); });
    }
    for (std::future<HttpResult>& reply : replies) {
        EXPECT_EQ(reply.get().status, 200);
    }
}

} // namespace

} // namespace DevStsTests
