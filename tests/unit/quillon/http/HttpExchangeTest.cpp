#include "HttpClient.h"
#include "support/ClientSocket.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <fcntl.h>
#include <fstream>
#include <future>
#include <limits>
#include <poll.h>

using namespace Quillon::Http;
using namespace Testing;
using Quillon::Ref;
using testing::Combine;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;
using testing::Values;

namespace {

/** Answers the first request with "200 OK" and gives it to the test. */
struct Recorder
{
    TestServer::Handler GetHandler(const std::string& reply = MakeReply("200 OK", "pong"))
    {
        return [this, reply](ServerConnection& connection) {
            if (std::optional<ReceivedRequest> request = connection.ReadRequest()) {
                received.set_value(*request);
                connection.Write(reply);
            }
        };
    }

    std::promise<ReceivedRequest> received;
};

TEST(Post, SendsExactlyTheseLines)
{
    Recorder recorder;
    const TestServer server(recorder.GetHandler());
    const Ref<ClientRequest> request = HttpClient::MakeRequest("<a>b</a>", "/sts?x=%20y");
    request->SetHeader("SOAPAction", "\"urn:action\"");
    request->SetHeader("X-Empty", "");
    request->SetHeader("content-TYPE", "text/plain");
    HttpClient(server).Post(request);
    const ReceivedRequest received = recorder.received.get_future().get();
    EXPECT_EQ(
        "POST /sts?x=%20y HTTP/1.1\r\n"
        "Host: 127.0.0.1:"
            + std::to_string(server.GetPort())
            + "\r\nUser-Agent: SsoClient/" PROJECT_VERSION "\r\n"
              "Accept: */*\r\n"
              "Content-Type: text/plain\r\n"
              "SOAPAction: \"urn:action\"\r\n"
              "X-Empty:\r\n"
              "Content-Length: 8",
        received.head);
    EXPECT_EQ("<a>b</a>", received.body);
}

TEST(Post, SendsAnEmptyBody)
{
    Recorder recorder;
    const TestServer server(recorder.GetHandler());
    EXPECT_EQ("pong", HttpClient(server).Post(HttpClient::MakeRequest("")).body);
    const ReceivedRequest received = recorder.received.get_future().get();
    EXPECT_THAT(received.head, HasSubstr("Content-Length: 0"));
}

TEST(Post, SendsALargeBodyWithoutAskingForAGoAhead)
{
    Recorder recorder;
    const TestServer server(recorder.GetHandler());
    const std::string body(3 * 1024 * 1024, 'x');
    EXPECT_EQ("pong", HttpClient(server).Post(HttpClient::MakeRequest(body)).body);
    const ReceivedRequest received = recorder.received.get_future().get();
    EXPECT_THAT(received.head, Not(HasSubstr("Expect")));
    EXPECT_EQ(body, received.body);
}

TEST(Post, KeepsDotSegmentsOfThePath)
{
    Recorder recorder;
    const TestServer server(recorder.GetHandler());
    HttpClient(server).Post(HttpClient::MakeRequest("x", "/a/../b/./c"));
    EXPECT_THAT(
        recorder.received.get_future().get().head, StartsWith("POST /a/../b/./c HTTP/1.1\r\n"));
}

class Statuses : public testing::TestWithParam<std::pair<std::string, Reply>>
{};

TEST_P(Statuses, ArePassedOnAsTheyAre)
{
    const TestServer server(AnswerAll(MakeReply(GetParam().first, "text")));
    const Reply reply = HttpClient(server).Post();
    EXPECT_EQ(GetParam().second.code, reply.code);
    EXPECT_EQ(GetParam().second.reason, reply.reason);
    EXPECT_EQ(GetParam().second.body, reply.body);
}

INSTANTIATE_TEST_SUITE_P(
    Post,
    Statuses,
    Values(
        std::pair("200 OK", Reply{200, "OK", "text"}),
        std::pair("299 Fine by me", Reply{299, "Fine by me", "text"}),
        std::pair("300 Multiple Choices", Reply{300, "Multiple Choices", "text"}),
        std::pair("404 Not Found", Reply{404, "Not Found", "text"}),
        std::pair("500 Internal Server Error", Reply{500, "Internal Server Error", "text"}),
        std::pair("501 Not Implemented", Reply{501, "Not Implemented", "text"}),
        std::pair("503 ", Reply{503, "", "text"}),
        std::pair("503", Reply{503, "", "text"}),
        std::pair("599   Spaced   out  ", Reply{599, "Spaced   out", "text"})));

TEST(Post, TakesAnInterimStatusAsTheAnswerIfNothingFollows)
{
    const TestServer server(AnswerAndClose("HTTP/1.1 199 Odd\r\nContent-Length: 0\r\n\r\n"));
    const Reply reply = HttpClient(server).Post();
    EXPECT_EQ(199, reply.code);
    EXPECT_EQ("Odd", reply.reason);
    EXPECT_EQ("", reply.body);
}

TEST(Post, PassesOverInterimReplies)
{
    const TestServer server(AnswerAll(
        "HTTP/1.1 100 Continue\r\n\r\n"
        "HTTP/1.1 103 Early Hints\r\nLink: x\r\n\r\n"
        + MakeReply("201 Created", "done")));
    const Reply reply = HttpClient(server).Post();
    EXPECT_EQ(201, reply.code);
    EXPECT_EQ("Created", reply.reason);
    EXPECT_EQ("done", reply.body);
}

TEST(Post, FollowsNoRedirect)
{
    const TestServer elsewhere(AnswerAll(MakeReply("200 OK", "trap")));
    for (const std::string status :
         {"301 Moved", "302 Found", "303 See Other", "307 Temporary", "308 Permanent"}) {
        const TestServer server(
            AnswerAll(MakeReply(status, "here", "Location: " + elsewhere.GetUrl() + "\r\n")));
        const Reply reply = HttpClient(server).Post();
        EXPECT_EQ(status, std::to_string(reply.code) + " " + reply.reason);
        EXPECT_EQ("here", reply.body);
    }
    EXPECT_EQ(0, elsewhere.GetConnectionCount());
}

TEST(Post, ReadsChunkedBodies)
{
    const TestServer server(AnswerAll("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n"
                                      "3\r\nabc\r\n2\r\nde\r\n0\r\nX-Trailer: 1\r\n\r\n"));
    EXPECT_EQ("abcde", HttpClient(server).Post().body);
}

TEST(Post, ReadsABodyUpToTheEndOfTheConnection)
{
    const TestServer server(AnswerAndClose("HTTP/1.1 200 OK\r\n\r\nall of it"));
    EXPECT_EQ("all of it", HttpClient(server).Post().body);
}

TEST(Post, ReadsABodyOfTheLargestSize)
{
    const std::string body(8 * 1024 * 1024, 'x');
    const TestServer server(AnswerAll(MakeReply("200 OK", body)));
    EXPECT_EQ(body, HttpClient(server).Post().body);
}

TEST(Post, RefusesADeclaredBodyThatIsTooLarge)
{
    const TestServer server(
        AnswerAndClose("HTTP/1.1 200 OK\r\nContent-Length: 8388609\r\n\r\nand so on"));
    EXPECT_EQ(
        "The reply of " + Describe(server) + " is larger than 8388608 bytes.",
        HttpClient(server).PostAndFail());
}

TEST(Post, RefusesAChunkedBodyThatGrowsTooLarge)
{
    const TestServer server([](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n");
        const std::string chunk = "100000\r\n" + std::string(0x100000, 'x') + "\r\n";
        while (connection.Write(chunk)) {
        }
    });
    EXPECT_EQ(
        "The reply of " + Describe(server) + " is larger than 8388608 bytes.",
        HttpClient(server).PostAndFail());
}

TEST(Post, RefusesHeadersWithoutEnd)
{
    const TestServer server([](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write("HTTP/1.1 200 OK\r\n");
        while (connection.Write("X-Filler: " + std::string(1000, 'x') + "\r\n")) {
        }
    });
    EXPECT_EQ(
        "The reply of " + Describe(server) + " has more than 65536 bytes of headers.",
        HttpClient(server).PostAndFail());
}

TEST(Post, RefusesInterimRepliesWithoutEnd)
{
    const TestServer server([](ServerConnection& connection) {
        connection.ReadRequest();
        while (connection.Write("HTTP/1.1 103 Early Hints\r\n\r\n")) {
        }
    });
    EXPECT_EQ(
        "The reply of " + Describe(server) + " has more than 65536 bytes of headers.",
        HttpClient(server).PostAndFail());
}

TEST(Post, RefusesEncodingsItDidNotAskFor)
{
    for (const std::string name : {"Content-Encoding", "Transfer-Encoding"}) {
        const TestServer server(
            AnswerAndClose("HTTP/1.1 200 OK\r\n" + name + ": gzip\r\n\r\nnot gzip at all"));
        EXPECT_EQ(
            "The reply of " + Describe(server) + " is encoded as \"gzip\", which nobody asked for.",
            HttpClient(server).PostAndFail());
    }
}

TEST(Post, ReportsAReplyThatEndsTooEarly)
{
    const TestServer server(AnswerAndClose("HTTP/1.1 200 OK\r\nContent-Length: 10\r\n\r\nshort"));
    EXPECT_EQ(
        "The reply of " + Describe(server)
            + " ended too early: transfer closed with 5 bytes remaining to read.",
        HttpClient(server).PostAndFail());
}

TEST(Post, ReportsAChunkedReplyThatEndsTooEarly)
{
    const TestServer server(
        AnswerAndClose("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n5\r\nabcde\r\n"));
    EXPECT_EQ(
        "The reply of " + Describe(server)
            + " ended too early: transfer closed with outstanding read data remaining.",
        HttpClient(server).PostAndFail());
}

TEST(Post, ReportsAConnectionThatEndsWithoutReply)
{
    const TestServer server(AnswerAndClose(""));
    EXPECT_EQ(
        "The server " + Describe(server) + " closed the connection without a reply.",
        HttpClient(server).PostAndFail());
}

struct MalformedReply
{
    std::string bytes;
    std::string problem;
};

class MalformedReplies : public testing::TestWithParam<MalformedReply>
{};

TEST_P(MalformedReplies, AreReported)
{
    const TestServer server(AnswerAndClose(GetParam().bytes));
    EXPECT_THAT(
        HttpClient(server).PostAndFail(),
        StartsWith("The reply of " + Describe(server) + " " + GetParam().problem));
}

INSTANTIATE_TEST_SUITE_P(
    Post,
    MalformedReplies,
    Values(
        MalformedReply{"hello, world\r\n\r\n", "is not HTTP: "},
        MalformedReply{"<html></html>", "is not HTTP: "},
        MalformedReply{"SSH-2.0-OpenSSH\r\n", "is not HTTP: "},
        MalformedReply{"HTTP/9.9 200 OK\r\n\r\n", "is not HTTP: "},
        MalformedReply{"HTTP/1.1 2x0 OK\r\n\r\n", "is not HTTP: "},
        MalformedReply{"HTTP/1.1 20 OK\r\n\r\n", "is not HTTP: "},
        MalformedReply{std::string("HTTP/1.1 200 OK\r\nX: a\0b\r\n\r\n", 28), "is not HTTP: "}));

TEST(Post, ReportsARefusedConnection)
{
    int port = 0;
    {
        const TestServer gone(AnswerAndClose(""));
        port = gone.GetPort();
    }
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec("127.0.0.1", port, false, spec);
    EXPECT_EQ(
        "Cannot connect to 127.0.0.1 port " + std::to_string(port) + ": Connection refused.",
        HttpClient(spec).PostAndFail());
}

TEST(Post, ReportsAnUnknownHost)
{
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec("unknown.invalid", 80, false, spec);
    EXPECT_EQ("The host name unknown.invalid cannot be resolved.", HttpClient(spec).PostAndFail());
}

TEST(Post, ReachesIpv6Addresses)
{
    Recorder recorder;
    const TestServer server(recorder.GetHandler(), &TestServer::MakePlainStream, AF_INET6);
    EXPECT_EQ("pong", HttpClient(MakeTcpSpec(server, "::1")).Post().body);
    EXPECT_THAT(
        recorder.received.get_future().get().head,
        HasSubstr("\r\nHost: [::1]:" + std::to_string(server.GetPort()) + "\r\n"));
}

TEST(Post, GivesUpOnAServerThatNeverAnswers)
{
    const TestServer server([](ServerConnection& connection) { connection.WaitForClose(); });
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetTimeout(Short);
    HttpClient client(server);
    try {
        client.Post(request);
        FAIL() << "answered";
    } catch (const TimeoutException& error) {
        EXPECT_EQ(
            "There was no complete reply from " + Describe(server) + " within 0.05 seconds.",
            std::string(error.what()));
    }
}

TEST(Post, GivesUpOnAServerThatDripsItsReply)
{
    const TestServer server([](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n");
        // Each byte is sent by itself; the reply stays below all size limits.
        for (int count = 0; count < 1'000'000 && connection.Write("1\r\nx\r\n"); ++count) {
        }
        connection.WaitForClose();
    });
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetTimeout(Short);
    HttpClient client(server);
    EXPECT_EQ(
        "There was no complete reply from " + Describe(server) + " within 0.05 seconds.",
        client.PostAndFail(request));
}

TEST(WaitForResponse, CallsTheExchangeOffWhenTheTimeIsOver)
{
    std::promise<void> closed;
    const TestServer server([&](ServerConnection& connection) {
        connection.WaitForClose();
        closed.set_value();
    });
    HttpClient client(server);
    const Ref<PendingRequestItem> pending = client.Start(HttpClient::MakeRequest());
    EXPECT_THROW(client.Wait(*pending, Short), TimeoutException);
    EXPECT_TRUE(HasHappened(closed)) << "the I/O thread was not woken up";
    try {
        client.Wait(*pending);
        FAIL() << "answered";
    } catch (const HttpException& error) {
        EXPECT_EQ(
            "The exchange with " + Describe(server) + " was called off.",
            std::string(error.what()));
    }
}

TEST(WaitForResponse, NamesLimitsInWholeSeconds)
{
    const TestServer server([](ServerConnection& connection) { connection.WaitForClose(); });
    HttpClient client(server);
    const Ref<PendingRequestItem> pending = client.Start(HttpClient::MakeRequest());
    try {
        client.Wait(*pending, 0);
        FAIL() << "answered";
    } catch (const TimeoutException& error) {
        EXPECT_EQ(
            "There was no complete reply from " + Describe(server) + " within 0 seconds.",
            std::string(error.what()));
    }
}

TEST(UserAgent, WakesTheIdleIoThreadUp)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    client.Post();
    // The I/O thread has nothing to do any more and waits for ever, but for a lost event.
    std::promise<void> completed;
    const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(),
        [&](const Quillon::Exception*, ClientResponse*, PendingRequestItem*) {
            completed.set_value();
        });
    EXPECT_TRUE(HasHappened(completed)) << "the I/O thread was not woken up";
    pending->Cancel();
}

TEST(UserAgent, KeepsItsConnectionBetweenExchanges)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    client.Post();
    client.Post();
    EXPECT_EQ(1, server.GetConnectionCount());
}

TEST(UserAgent, SharesNoConnectionWithAnother)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const Ref<ConnectionSpec> spec = MakeTcpSpec(server);
    HttpClient first(spec);
    HttpClient second(spec);
    first.Post();
    second.Post();
    first.Post();
    second.Post();
    EXPECT_EQ(2, server.GetConnectionCount());
}

TEST(UserAgent, SharesConnectionsThroughAPool)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const Ref<ConnectionSpec> spec = MakeTcpSpec(server);
    Ref<HttpConnectionPool> pool;
    CreateHttpConnectionPool(spec.get(), pool);
    HttpClient(spec, pool.get()).Post();
    HttpClient(spec, pool.get()).Post();
    EXPECT_EQ(1, server.GetConnectionCount());
}

TEST(UserAgent, ClosesItsConnectionWhenItGoes)
{
    std::promise<void> closed;
    const TestServer server([&](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write(MakeReply("200 OK", "pong"));
        connection.WaitForClose();
        closed.set_value();
    });
    HttpClient(server).Post();
    EXPECT_TRUE(HasHappened(closed)) << "the I/O thread was not woken up";
}

/** Until the end of the connection has come. Before, a request may still be lost in it. */
void WaitForEndOfConnection(int port)
{
    pollfd descriptor{FindClientSocket(port), POLLRDHUP, 0};
    if (descriptor.fd >= 0) { // else the client has already closed it as well
        EXPECT_EQ(1, poll(&descriptor, 1, static_cast<int>(Generous / 1000)));
    }
}

TEST(UserAgent, ConnectsAnewAfterTheServerClosed)
{
    const TestServer server(AnswerAndClose(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    EXPECT_EQ("pong", client.Post().body);
    WaitForEndOfConnection(server.GetPort());
    EXPECT_EQ("pong", client.Post().body);
    EXPECT_EQ(2, server.GetConnectionCount());
}

TEST(UserAgent, KeepsItsConnectionFromProgramsThatTheHostStarts)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    client.Post();
    const int descriptor = FindClientSocket(server.GetPort());
    ASSERT_LE(0, descriptor);
    EXPECT_EQ(FD_CLOEXEC, fcntl(descriptor, F_GETFD));
}

TEST(CreateTCPConnectionSpec, SaysWhetherIdleConnectionsAreProbed)
{
    for (const bool keepAlive : {false, true}) {
        const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
        Ref<ConnectionSpec> spec;
        CreateTCPConnectionSpec("127.0.0.1", server.GetPort(), keepAlive, spec);
        HttpClient client(spec);
        client.Post();
        EXPECT_EQ(keepAlive, IsProbed(FindClientSocket(server.GetPort())));
    }
}

void HandlerOfTheHost(int /*signal*/) {}

/** What the process does about SIGPIPE while a reply is read. */
void (*handlerDuringTheExchange)(int) = nullptr;

bool NoteHandler(int /*status*/) noexcept
{
    struct sigaction current
    {};
    sigaction(SIGPIPE, nullptr, &current);
    handlerDuringTheExchange = current.sa_handler;
    return true;
}

TEST(Post, LeavesTheSignalHandlersOfTheHostAlone)
{
    const auto usual = std::signal(SIGPIPE, &HandlerOfTheHost);
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetBodyStatuses(&NoteHandler);
    EXPECT_EQ("pong", HttpClient(server).Post(request).body);
    EXPECT_EQ(&HandlerOfTheHost, handlerDuringTheExchange);
    std::signal(SIGPIPE, usual);
}

/** Sets a cookie with the first request of a connection, and answers with the cookies it got. */
void ServeCookies(ServerConnection& connection)
{
    while (std::optional<ReceivedRequest> request = connection.ReadRequest()) {
        const std::size_t start = request->head.find("\r\nCookie: ");
        const std::string cookies =
            start == std::string::npos
                ? "none"
                : request->head.substr(
                    start + 10, request->head.find('\r', start + 2) - start - 10);
        connection.Write(MakeReply(
            "200 OK",
            cookies,
            request->body == "login"    ? "Set-Cookie: id=1; HttpOnly\r\n"
            : request->body == "change" ? "Set-Cookie: id=2; HttpOnly\r\n"
            : request->body == "logout" ? "Set-Cookie: id=; Max-Age=0\r\n"
                                        : ""));
    }
}

// [RFC 6265 5.4]
TEST(CookieStore, SendsBackWhatItReceived)
{
    const TestServer server(&ServeCookies);
    HttpClient client(server);
    EXPECT_EQ("none", client.Post(HttpClient::MakeRequest("login")).body);
    EXPECT_EQ("id=1", client.Post(HttpClient::MakeRequest("change")).body);
    EXPECT_EQ("id=2", client.Post(HttpClient::MakeRequest("logout")).body);
    EXPECT_EQ("none", client.Post(HttpClient::MakeRequest("again")).body);
}

TEST(CookieStore, SharesNothingWithAnother)
{
    const TestServer server(&ServeCookies);
    HttpClient first(server);
    HttpClient second(server);
    first.Post(HttpClient::MakeRequest("login"));
    EXPECT_EQ("none", second.Post().body);
    EXPECT_EQ("id=1", first.Post().body);
}

TEST(CookieStore, CanBeAbsent)
{
    const TestServer server(&ServeCookies);
    Ref<UserAgent> agent;
    CreateHttpUserAgent(MakeTcpSpec(server).get(), nullptr, nullptr, agent);
    for (const std::string body : {"login", "again"}) {
        Ref<PendingRequestItem> pending;
        agent->SendRequestAsync(HttpClient::MakeRequest(body).get(), Completion(), pending);
        Ref<ClientResponse> response;
        agent->WaitForResponse(pending.get(), Generous, response);
        EXPECT_EQ("none", ToReply(*response).body);
    }
}

TEST(CookieStore, KeepsItsName)
{
    Ref<CookieStore> store;
    CreateCookieStore("mine", store);
    EXPECT_EQ("mine", store->GetName());
}

/** Sets an environment variable for the length of a test. */
class Environment
{
public:
    Environment(const char* name, const std::string& value)
        : _name(name)
    {
        setenv(name, value.c_str(), 1);
    }
    ~Environment() { unsetenv(_name); }
    Environment(const Environment&) = delete;
    Environment& operator=(const Environment&) = delete;

private:
    const char* _name;
};

TEST(Post, IgnoresProxiesOfTheEnvironment)
{
    const TestServer proxy(AnswerAll(MakeReply("200 OK", "trap")));
    const Environment http("http_proxy", proxy.GetUrl());
    const Environment all("ALL_PROXY", proxy.GetUrl());
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    EXPECT_EQ("pong", HttpClient(server).Post().body);
    EXPECT_EQ(0, proxy.GetConnectionCount());
}

TEST(Post, IgnoresNetrc)
{
    const std::string home = testing::TempDir();
    const std::string path = home + ".netrc";
    std::ofstream(path) << "machine 127.0.0.1 login eve password secret\n"
                           "default login eve password secret\n";
    Recorder recorder;
    const TestServer server(recorder.GetHandler());
    {
        const Environment variable("HOME", home);
        HttpClient(server).Post();
    }
    EXPECT_EQ(0, std::remove(path.c_str()));
    EXPECT_THAT(recorder.received.get_future().get().head, Not(HasSubstr("Authorization")));
}

TEST(Post, SendsNoCredentialsAfterAChallenge)
{
    const TestServer server(AnswerAll(MakeReply(
        "401 Unauthorized",
        "no",
        "WWW-Authenticate: Basic realm=\"x\"\r\n"
        "WWW-Authenticate: Negotiate\r\n")));
    EXPECT_EQ(401, HttpClient(server).Post().code);
}

} // namespace

namespace {

Ref<HttpConnectionPool> MakePool(const Ref<ConnectionSpec>& spec, long long idleLimit)
{
    Ref<HttpConnectionPool> pool;
    CreateHttpConnectionPool(spec.get(), idleLimit, pool);
    return pool;
}

} // namespace

TEST(ConnectionPool, ClosesWhatIsIdleForTooLong)
{
    std::promise<void> isClosed;
    std::atomic<int> closed{0};
    const TestServer server([&](ServerConnection& connection) {
        while (connection.ReadRequest()) {
            connection.Write(MakeReply("200 OK", "pong"));
        }
        if (closed++ == 0) {
            isClosed.set_value();
        }
    });
    const Ref<ConnectionSpec> spec = MakeTcpSpec(server);
    const Ref<HttpConnectionPool> pool = MakePool(spec, Short);
    HttpClient client(spec, pool.get());
    EXPECT_EQ(client.Post().body, "pong");
    EXPECT_TRUE(HasHappened(isClosed));
    EXPECT_EQ(client.Post().body, "pong"); // over another connection
    EXPECT_EQ(server.GetConnectionCount(), 2);
}

TEST(ConnectionPool, KeepsWhatIsNotIdleForLong)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const Ref<ConnectionSpec> spec = MakeTcpSpec(server);
    const Ref<HttpConnectionPool> pool = MakePool(spec, Generous);
    const Ref<HttpConnectionPool> shortLived = MakePool(spec, Short); // another one's limit
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(HttpClient(spec, pool.get()).Post().body, "pong");
    }
    EXPECT_EQ(server.GetConnectionCount(), 1);
}

TEST(ConnectionPool, KeepsForEverWhatMayBeIdleForEver)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const Ref<ConnectionSpec> spec = MakeTcpSpec(server);
    const Ref<HttpConnectionPool> pool = MakePool(spec, std::numeric_limits<long long>::max());
    for (int i = 0; i < 2; ++i) {
        EXPECT_EQ(HttpClient(spec, pool.get()).Post().body, "pong");
    }
    EXPECT_EQ(server.GetConnectionCount(), 1);
}

TEST(ConnectionPool, DoesNotCloseWhatIsInUse)
{
    std::promise<void> idleIsClosed;
    std::atomic<bool> isFirst{true};
    const TestServer server([&](ServerConnection& connection) {
        while (const auto request = connection.ReadRequest()) {
            if (request->body == "wait") {
                // The other pool has been closed for being idle by the time of this answer.
                EXPECT_TRUE(HasHappened(idleIsClosed));
            }
            connection.Write(MakeReply("200 OK", "pong"));
        }
        if (isFirst.exchange(false)) {
            idleIsClosed.set_value();
        }
    });
    const Ref<ConnectionSpec> spec = MakeTcpSpec(server);
    const Ref<HttpConnectionPool> busy = MakePool(spec, Short);
    const Ref<HttpConnectionPool> idle = MakePool(spec, Short);
    EXPECT_EQ(HttpClient(spec, idle.get()).Post().body, "pong");
    EXPECT_EQ(HttpClient(spec, busy.get()).Post(HttpClient::MakeRequest("wait")).body, "pong");
}

TEST(ConnectionPool, RefusesALimitThatIsNone)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const Ref<ConnectionSpec> spec = MakeTcpSpec(server);
    for (const long long limit : {0, -1}) {
        EXPECT_EQ(
            GetArgumentError([&] { MakePool(spec, limit); }),
            "Invalid argument : The idle limit of " + std::to_string(limit)
                + " microseconds is not positive.");
    }
}
