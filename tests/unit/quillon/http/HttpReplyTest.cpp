#include "HttpClient.h"
#include "NameLookup.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <vector>

using namespace Quillon::Http;
using namespace Testing;
using Quillon::Ref;
using testing::HasSubstr;
using testing::StartsWith;
using testing::Values;

// When a reply is an answer, and what of it is judged.

namespace {

/** Far above what any of these exchanges takes; one that waits for the server ends here. */
constexpr long long Bound = 10'000'000;

Ref<ClientRequest> MakeBoundRequest(const std::string& body = "ping")
{
    const Ref<ClientRequest> request = HttpClient::MakeRequest(body);
    request->SetTimeout(Bound);
    return request;
}

/** Answers the first request with `bytes` and keeps the connection open. */
TestServer::Handler AnswerAndStay(const std::string& bytes)
{
    return [bytes](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write(bytes);
        connection.WaitForClose();
    };
}

/** The texts of the failures of the replies that are cut at each place before the end. */
std::vector<std::string> CutEverywhere(const std::string& reply)
{
    std::vector<std::string> texts;
    for (std::size_t size = 0; size < reply.size(); ++size) {
        const TestServer server(AnswerAndClose(reply.substr(0, size)));
        texts.push_back(HttpClient(server).PostAndFail(MakeBoundRequest()));
    }
    return texts;
}

TEST(CutReply, IsAFailureWhereverItsHeadEnds)
{
    const std::string head =
        "HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: 0\r\n\r\n";
    for (const std::string& text : CutEverywhere(head)) {
        EXPECT_NE("", text);
    }
    const TestServer server(AnswerAndClose(head));
    EXPECT_EQ("", HttpClient(server).PostAndFail());
}

TEST(CutReply, IsAFailureWhereverItsHeadEndsBeforeABodyWithoutLength)
{
    for (const std::string& text :
         CutEverywhere("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\n\r\n")) {
        EXPECT_NE("", text);
    }
}

TEST(CutReply, IsAFailureWhereverItsChunksEnd)
{
    const std::string reply = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n"
                              "3;x=y\r\nabc\r\n0\r\nX-Trailer: 1\r\n\r\n";
    // Nothing is missing without the very last octet.
    for (const std::string& text : CutEverywhere(reply.substr(0, reply.size() - 1))) {
        EXPECT_NE("", text);
    }
    const TestServer server(AnswerAndClose(reply));
    EXPECT_EQ("abc", HttpClient(server).Post().body);
}

TEST(CutReply, SaysThatItsHeadersAreNotComplete)
{
    const TestServer server(AnswerAndClose("HTTP/1.1 200 OK\r\nContent-Ty"));
    EXPECT_EQ(
        "The reply of " + Describe(server) + " ended too early: its headers are not complete.",
        HttpClient(server).PostAndFail());
}

TEST(CutReply, HasNoStatusIfItsHeadersAreNotComplete)
{
    const TestServer server(AnswerAndClose("HTTP/1.1 404 Not Found\r\nContent-Le"));
    const Ref<ClientRequest> request = MakeBoundRequest();
    request->SetBodyStatuses([](int status) noexcept { return status == 200; });
    EXPECT_EQ(
        "The reply of " + Describe(server) + " ended too early: its headers are not complete.",
        HttpClient(server).PostAndFail(request));
}

/** A reply of status 1xx that is the answer, on a connection that stays open. */
class FinalInterimStatuses : public testing::TestWithParam<std::string>
{};

// [RFC 9110 15.2]
TEST_P(FinalInterimStatuses, EndTheExchangeAtOnce)
{
    const TestServer server(AnswerAndStay("HTTP/1.1 " + GetParam()));
    HttpClient client(server);
    const Reply reply = client.Post(MakeBoundRequest());
    EXPECT_EQ(GetParam().substr(0, 7), std::to_string(reply.code) + " " + reply.reason);
    EXPECT_EQ("", reply.body);
}

INSTANTIATE_TEST_SUITE_P(
    Reply,
    FinalInterimStatuses,
    Values(
        "199 Odd\r\nContent-Length: 0\r\n\r\n",
        "199 Odd\r\nContent-Length: 4\r\n\r\nbody",
        "199 Odd\r\nContent-Length: 9000000\r\n\r\nbody",
        "199 Odd\r\nTransfer-Encoding: chunked\r\n\r\n4\r\nbody\r\n0\r\n\r\n",
        "199 Odd\r\nContent-Encoding: gzip\r\nConnection: close\r\n\r\n",
        "199 Odd\r\n\r\n<html>no status line</html>",
        "104 Odd\r\nContent-Length: 0\r\n\r\n",
        "101 Odd\r\nConnection: Upgrade\r\nUpgrade: x\r\n\r\n"));

/** A reply of status 1xx before the answer. */
class InterimStatuses : public testing::TestWithParam<std::string>
{};

// [RFC 9110 15.2]
TEST_P(InterimStatuses, ArePassedOver)
{
    const TestServer server(
        AnswerAndStay("HTTP/1.1 " + GetParam() + MakeReply("201 Created", "done")));
    HttpClient client(server);
    const Reply reply = client.Post(MakeBoundRequest());
    EXPECT_EQ(201, reply.code);
    EXPECT_EQ("done", reply.body);
}

INSTANTIATE_TEST_SUITE_P(
    Reply,
    InterimStatuses,
    Values(
        "100 Continue\r\n\r\n",
        "100 Continue\r\nContent-Length: 0\r\n\r\n",
        "102 Processing\r\n\r\n",
        "103 Early Hints\r\nLink: x\r\n\r\n",
        "103 Early Hints\r\nContent-Length: 0\r\n\r\n",
        "199 Odd\r\n\r\n"));

TEST(Reply, IsNoneIfAllThatComesIsAGoAhead)
{
    const TestServer server(AnswerAndClose("HTTP/1.1 100 Continue\r\n\r\n"));
    EXPECT_EQ(
        "The server " + Describe(server) + " closed the connection without a reply.",
        HttpClient(server).PostAndFail());
}

namespace {

/** What `server` is told to have done wrong when it is reached as `host`. */
std::string GetFailure(const TestServer& server, const std::string& host)
{
    std::string text = HttpClient(MakeTcpSpec(server, host)).PostAndFail();
    const std::string name = Describe(server, host);
    const std::size_t position = text.find(name);
    return position == std::string::npos ? text : text.replace(position, name.size(), "it");
}

} // namespace

TEST(Reply, IsNotBlamedForAnAddressThatRefusedBefore)
{
    const TestServer server(
        AnswerAll("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\nno chunk\r\n"));
    EXPECT_EQ(GetFailure(server, "127.0.0.1"), GetFailure(server, NameLookup::TwoAddressHost));
}

/** What follows a status whose body does not count. */
class UnwantedBodies : public testing::TestWithParam<std::string>
{};

TEST_P(UnwantedBodies, AreNeitherJudgedNorAwaited)
{
    const TestServer server(AnswerAndStay("HTTP/1.1 503 Odd\r\n" + GetParam()));
    HttpClient client(server);
    const Ref<ClientRequest> request = MakeBoundRequest();
    request->SetBodyStatuses([](int status) noexcept { return status == 200; });
    const Reply reply = client.Post(request);
    EXPECT_EQ(503, reply.code);
    EXPECT_EQ("Odd", reply.reason);
    EXPECT_EQ("", reply.body);
}

INSTANTIATE_TEST_SUITE_P(
    Reply,
    UnwantedBodies,
    Values(
        "\r\n",
        "Content-Length: 4\r\n\r\nbody",
        "Content-Length: 100\r\n\r\nshort",
        "Content-Length: 9000000\r\n\r\n",
        "Content-Length: 5\r\nContent-Length: 6\r\n\r\n",
        "Content-Encoding: gzip\r\nContent-Length: 4\r\n\r\nbody",
        "Transfer-Encoding: gzip\r\n\r\nbody",
        "Transfer-Encoding: chunked\r\n\r\nno chunk"));

TEST(BodyStatuses, LetTheOthersBeJudged)
{
    const TestServer server(
        AnswerAndStay("HTTP/1.1 500 Odd\r\nContent-Encoding: gzip\r\nContent-Length: 1\r\n\r\n1"));
    const Ref<ClientRequest> request = MakeBoundRequest();
    request->SetBodyStatuses([](int status) noexcept { return status == 500; });
    EXPECT_EQ(
        "The reply of " + Describe(server) + " is encoded as \"gzip\", which nobody asked for.",
        HttpClient(server).PostAndFail(request));
}

TEST(BodyStatuses, CloseTheConnectionOfTheOthers)
{
    const TestServer server(AnswerAll(MakeReply("503 Odd", "body")));
    HttpClient client(server);
    const Ref<ClientRequest> request = MakeBoundRequest();
    request->SetBodyStatuses([](int status) noexcept { return status == 200; });
    EXPECT_EQ(503, client.Post(request).code);
    EXPECT_EQ("body", client.Post().body);
    EXPECT_EQ(2, server.GetConnectionCount());
}

TEST(Reply, MayHaveAnEmptyContentEncoding)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong", "Content-Encoding:\r\n")));
    EXPECT_EQ("pong", HttpClient(server).Post().body);
}

TEST(Reply, MayRepeatItsLength)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong", "Content-Length: 4\r\n")));
    EXPECT_EQ("pong", HttpClient(server).Post().body);
}

/** The end of the text with which a reply with these header fields is refused. */
std::string GetRefusal(const std::string& fields)
{
    const TestServer server(AnswerAndStay("HTTP/1.1 200 OK\r\n" + fields + "\r\npong"));
    const std::string text = HttpClient(server).PostAndFail(MakeBoundRequest());
    const std::string start = "The reply of " + Describe(server) + " ";
    EXPECT_THAT(text, StartsWith(start));
    return text.substr(start.size());
}

// [RFC 9112 6.3]
TEST(Reply, HasOneLength)
{
    EXPECT_EQ(
        "has more than one Content-Length.",
        GetRefusal("Content-Length: 4\r\nContent-Length: 3\r\n"));
    EXPECT_EQ("has no valid Content-Length.", GetRefusal("Content-Length: 4, 4\r\n"));
    EXPECT_EQ("has no valid Content-Length.", GetRefusal("Content-Length: 4x\r\n"));
    EXPECT_EQ(
        "is larger than 8388608 bytes.", GetRefusal("Content-Length: 99999999999999999999999\r\n"));
}

TEST(Reply, HasABoundForOneHeaderLine)
{
    const TestServer server([](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write("HTTP/1.1 200 OK\r\nX: ");
        while (connection.Write(std::string(1000, 'x'))) {
        }
    });
    EXPECT_EQ(
        "The reply of " + Describe(server) + " has more than 65536 bytes of headers.",
        HttpClient(server).PostAndFail(MakeBoundRequest()));
}

TEST(Reply, HasABoundForChunkExtensions)
{
    const TestServer server([](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n0;");
        // It ends, so that a client without the bound takes it for a good reply.
        connection.Write(std::string(17 * 1024 * 1024, 'x') + "\r\n\r\n");
        connection.WaitForClose();
    });
    EXPECT_EQ(
        "The reply of " + Describe(server) + " takes more than 16777216 bytes on the wire.",
        HttpClient(server).PostAndFail(HttpClient::MakeRequest()));
}

TEST(Reply, MayHaveShortChunks)
{
    std::string reply = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n";
    for (int count = 0; count < 100'000; ++count) {
        reply += "1;x=y\r\na\r\n";
    }
    const TestServer server(AnswerAll(reply + "0\r\n\r\n"));
    EXPECT_EQ(std::string(100'000, 'a'), HttpClient(server).Post().body);
}

/** Answers the first request and ends the connection as it gets the second. */
struct LosingServer
{
    explicit LosingServer(bool withReset)
        : server([this, withReset](ServerConnection& connection) {
            while (connection.ReadRequest()) {
                if (++requestCount == 2) {
                    if (withReset) {
                        connection.GetStream().ResetAtClose();
                    }
                    return;
                }
                connection.Write(MakeReply("200 OK", "pong"));
            }
        })
    {}

    std::atomic<int> requestCount{0};
    const TestServer server;
};

TEST(Request, GoesOutOnce)
{
    for (const bool withReset : {false, true}) {
        for (const std::string body : {"ping", ""}) {
            LosingServer losing(withReset);
            HttpClient client(losing.server);
            EXPECT_EQ("pong", client.Post().body);
            EXPECT_EQ(
                "The server " + Describe(losing.server) + " closed the connection without a reply.",
                client.PostAndFail(MakeBoundRequest(body)));
            EXPECT_EQ(2, losing.requestCount);
            EXPECT_EQ(1, losing.server.GetConnectionCount());
            EXPECT_EQ("pong", client.Post().body);
        }
    }
}

TEST(Request, GoesOutOnceAlthoughThePoolHasAnotherConnection)
{
    std::atomic<int> requestCount{0};
    std::promise<void> secondIsHere;
    std::shared_future<void> mayAnswer = secondIsHere.get_future().share();
    const TestServer server([&](ServerConnection& connection) {
        while (const auto request = connection.ReadRequest()) {
            ++requestCount;
            if (request->body == "lose") {
                return;
            }
            if (request->body == "second") {
                secondIsHere.set_value();
            }
            mayAnswer.wait();
            connection.Write(MakeReply("200 OK", "pong"));
        }
    });
    HttpClient client(server);
    const auto first = client.Start(HttpClient::MakeRequest("first"));
    const auto second = client.Start(HttpClient::MakeRequest("second"));
    client.Wait(*first);
    client.Wait(*second);
    ASSERT_EQ(2, server.GetConnectionCount());
    EXPECT_EQ(
        "The server " + Describe(server) + " closed the connection without a reply.",
        client.PostAndFail(MakeBoundRequest("lose")));
    EXPECT_EQ(3, requestCount);
}

/**
 * Answers on each connection, and then does something to the first before it waits for more. The
 * test goes on when that is done.
 */
class DisturbedConnection
{
public:
    using Disturbance = std::function<void(ServerConnection&)>;

    explicit DisturbedConnection(
        Disturbance disturbance, TestServer::StreamFactory streams = &TestServer::MakePlainStream)
        : _disturbance(std::move(disturbance))
        , server([this](ServerConnection& connection) { Serve(connection); }, std::move(streams))
    {}

    void Disturb()
    {
        _mayDisturb.set_value();
        _isDisturbed.get_future().wait();
    }

private:
    void Serve(ServerConnection& connection)
    {
        const bool isFirst = !_hasServed.exchange(true);
        connection.ReadRequest();
        connection.Write(MakeReply("200 OK", "pong"));
        if (isFirst) {
            _mayDisturb.get_future().wait();
            _disturbance(connection);
            _isDisturbed.set_value();
        }
        while (connection.ReadRequest()) {
            connection.Write(MakeReply("200 OK", "from the first connection"));
        }
    }

    const Disturbance _disturbance;
    std::atomic<bool> _hasServed{false};
    std::promise<void> _mayDisturb;
    std::promise<void> _isDisturbed;

public:
    const TestServer server; // the last to begin, and the first to end
};

// [RFC 9112 9.2]: octets that nobody asked for are no reply to the request that follows.
TEST(KeptConnection, IsNotUsedIfItHasAReplyToARequestNotYetMade)
{
    for (const std::string& unasked : {MakeReply("200 OK", "unasked"), std::string("\r\n")}) {
        DisturbedConnection disturbed(
            [&](ServerConnection& connection) { connection.Write(unasked); });
        HttpClient client(disturbed.server);
        EXPECT_EQ("pong", client.Post().body);
        disturbed.Disturb();
        EXPECT_EQ("pong", client.Post().body);
        EXPECT_EQ(2, disturbed.server.GetConnectionCount());
    }
}

TEST(KeptConnection, IsUsedIfNothingHasHappenedToIt)
{
    DisturbedConnection disturbed([](ServerConnection&) {});
    HttpClient client(disturbed.server);
    EXPECT_EQ("pong", client.Post().body);
    disturbed.Disturb();
    EXPECT_EQ("from the first connection", client.Post().body);
    EXPECT_EQ(1, disturbed.server.GetConnectionCount());
}

TEST(Reply, GivesItsCookiesEvenIfItFails)
{
    std::promise<std::string> head;
    const TestServer server([&](ServerConnection& connection) {
        const auto request = connection.ReadRequest();
        if (request->body == "fail") {
            connection.Write(
                "HTTP/1.1 200 OK\r\nSet-Cookie: id=1\r\nContent-Length: 10\r\n\r\nshort");
            return;
        }
        head.set_value(request->head);
        connection.Write(MakeReply("200 OK", "pong"));
    });
    HttpClient client(server);
    EXPECT_NE("", client.PostAndFail(HttpClient::MakeRequest("fail")));
    client.Post();
    EXPECT_THAT(head.get_future().get(), HasSubstr("\r\nCookie: id=1\r\n"));
}

} // namespace
