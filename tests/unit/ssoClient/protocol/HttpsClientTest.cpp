#include "ssoClient/protocol/HttpsClient.h"

#include "quillon/http/HttpException.h"
#include "ssoClient/Exceptions.h"
#include "support/ClientSocket.h"
#include "support/TestServer.h"
#include "support/TestTls.h"

#include <boost/bind/bind.hpp>
#include <boost/smart_ptr/make_shared.hpp>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <thread>
#include <type_traits>
#include <vector>

using namespace SsoClient;
using namespace Testing;
using Quillon::Exception;
using Quillon::InvalidArgumentException;
using Quillon::Reader;
using Quillon::Ref;
using Quillon::Http::ClientResponse;
using Quillon::Http::HttpStatus;
using Quillon::Ssl::SSLContext;
using Quillon::System::ScheduledItem;
using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;
using testing::Values;

namespace {

constexpr long long Generous = 60'000'000; // a time-out that no passing test reaches
constexpr long long Short = 50'000;        // a time-out that a test waits for

std::string ReadAll(const Ref<Reader>& reader)
{
    std::string text;
    char buffer[4096];
    while (const std::size_t count = reader->Read(buffer, sizeof buffer)) {
        text.append(buffer, count);
    }
    return text;
}

Request MakeRequest(const std::string& body = "<soapenv:Envelope/>")
{
    Request request;
    request.soapAction = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";
    request.body = body;
    return request;
}

HttpsClient MakeClient(const TestServer& server, long long timeout = Generous)
{
    return HttpsClient(server.GetUrl("/sts/STSService"), nullptr, "", timeout);
}

std::string Send(TransportSession& session, const Request& request = MakeRequest())
{
    Ref<Reader> response;
    session.SendRequest(request, response);
    return ReadAll(response);
}

/** The text of the `CommunicationException` that a request ends with; empty if it succeeds. */
std::string SendAndFail(TransportSession& session, const Request& request = MakeRequest())
{
    try {
        Send(session, request);
    } catch (const CommunicationException& error) {
        return error.what();
    }
    return "";
}

/** What the callback of an asynchronous request was told. */
struct Told
{
    bool hasError = false;
    std::string errorClass;
    std::string errorText;
    bool hasBody = false;
    std::string body;
};

Told SendAsync(TransportSession& session, const Request& request = MakeRequest())
{
    std::promise<Told> promise;
    Ref<ScheduledItem> pending;
    session.SendRequestAsync(
        request,
        [&](const Exception* error, Reader* body) {
            Told told;
            told.hasError = error != nullptr;
            told.errorClass = error != nullptr ? GetClassName(*error) : "";
            told.errorText = error != nullptr ? error->what() : "";
            told.hasBody = body != nullptr;
            told.body = body != nullptr ? ReadAll(Ref<Reader>(body)) : "";
            promise.set_value(told);
        },
        pending);
    return promise.get_future().get();
}

std::string GetArgumentError(
    const std::string& url, SSLContext* context = nullptr, const std::string& peer = "")
{
    try {
        HttpsClient(url, context, peer, Generous);
    } catch (const InvalidArgumentException& error) {
        return error.what();
    }
    return "";
}

TEST(HttpsClient, NeedsASslContextForHttps)
{
    EXPECT_EQ(
        "Invalid argument : HTTPS connection requested but no SSLContext provided.",
        GetArgumentError("https://sts.example.com/sts"));
}

TEST(HttpsClient, NeedsNoSslContextForHttp)
{
    EXPECT_EQ("", GetArgumentError("http://sts.example.com/sts"));
}

TEST(HttpsClient, RefusesAMalformedUrlBeforeTheMissingContext)
{
    EXPECT_THAT(
        GetArgumentError("https://sts.example.com:0/"),
        StartsWith("Invalid argument : The URL is malformed: "));
}

TEST(HttpsClient, RefusesAMalformedPeer)
{
    const Ref<SSLContext> context = Quillon::Ssl::CreateSSLContext({});
    EXPECT_THAT(
        GetArgumentError("https://sts.example.com/", context.get(), "sha256//AAAA"),
        StartsWith("Invalid argument : The pinned key \"sha256//AAAA\" "));
}

TEST(HttpsClient, KeepsTheSslContext)
{
    Ref<SSLContext> context = Quillon::Ssl::CreateSSLContext({});
    const HttpsClient client("https://127.0.0.1:1/", context.get(), "", Generous);
    context.reset();
    EXPECT_THROW(Send(*client.CreateSession()), Quillon::Http::HttpException);
}

// [SOAP11 6.1.1]
TEST(SendRequest, PostsTheBodyWithItsAction)
{
    std::promise<ReceivedRequest> received;
    const TestServer server([&](ServerConnection& connection) {
        received.set_value(*connection.ReadRequest());
        connection.Write(MakeReply("200 OK", "<reply/>"));
    });
    EXPECT_EQ("<reply/>", Send(*MakeClient(server).CreateSession()));
    const ReceivedRequest request = received.get_future().get();
    EXPECT_EQ("<soapenv:Envelope/>", request.body);
    EXPECT_THAT(request.head, StartsWith("POST /sts/STSService HTTP/1.1\r\n"));
    EXPECT_THAT(request.head, HasSubstr("\r\nContent-Type: text/xml\r\n"));
    EXPECT_THAT(
        request.head,
        HasSubstr("\r\nSOAPAction: "
                  "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue\"\r\n"));
}

TEST(SendRequest, SendsNoFurtherHeader)
{
    std::promise<std::string> head;
    const TestServer server([&](ServerConnection& connection) {
        head.set_value(connection.ReadRequest()->head);
        connection.Write(MakeReply("200 OK", "<reply/>"));
    });
    Send(*MakeClient(server).CreateSession());
    EXPECT_EQ(
        "POST /sts/STSService HTTP/1.1\r\nHost: 127.0.0.1:" + std::to_string(server.GetPort())
            + "\r\nUser-Agent: SsoClient/" SSOCLIENT_VERSION
              "\r\nAccept: */*\r\nContent-Type: text/xml\r\n"
              "SOAPAction: \"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue\"\r\n"
              "Content-Length: 19",
        head.get_future().get());
}

Request MakeSoap12Request()
{
    Request request = MakeRequest();
    request.soap = SoapVersion::SOAP_1_2;
    return request;
}

// [RFC 3902]
TEST(SendSoap12Request, SaysItsActionInTheContentTypeAlone)
{
    std::promise<std::string> head;
    const TestServer server([&](ServerConnection& connection) {
        head.set_value(connection.ReadRequest()->head);
        connection.Write(MakeReply("200 OK", "<reply/>"));
    });
    EXPECT_EQ("<reply/>", Send(*MakeClient(server).CreateSession(), MakeSoap12Request()));
    EXPECT_EQ(
        "POST /sts/STSService HTTP/1.1\r\nHost: 127.0.0.1:" + std::to_string(server.GetPort())
            + "\r\nUser-Agent: SsoClient/" SSOCLIENT_VERSION
              "\r\nAccept: */*\r\nContent-Type: application/soap+xml; charset=utf-8; "
              "action=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue\"\r\n"
              "Content-Length: 19",
        head.get_future().get());
}

// [SOAP12-2 7.5.1.2]
TEST(SendSoap12Request, TakesAFaultOfTheSender)
{
    const TestServer server(AnswerAll(MakeReply("400 Bad Request", "<fault/>")));
    EXPECT_EQ("<fault/>", Send(*MakeClient(server).CreateSession(), MakeSoap12Request()));
    EXPECT_EQ("<fault/>", SendAsync(*MakeClient(server).CreateSession(), MakeSoap12Request()).body);
    EXPECT_EQ(
        "Server returned error: 400 Bad Request", SendAndFail(*MakeClient(server).CreateSession()));
}

TEST(SendSoap12Request, TakesNoOtherError)
{
    const TestServer server(AnswerAll(MakeReply("401 Unauthorized", "<html/>")));
    EXPECT_EQ(
        "Server returned error: 401 Unauthorized",
        SendAndFail(*MakeClient(server).CreateSession(), MakeSoap12Request()));
}

TEST(SendRequest, HasIdleConnectionsNotProbed)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "<reply/>")));
    const boost::shared_ptr<TransportSession> session = MakeClient(server).CreateSession();
    Send(*session);
    EXPECT_FALSE(IsProbed(FindClientSocket(server.GetPort())));
}

TEST(SendRequest, RefusesAnActionThatWouldAddAHeader)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "")));
    Request request = MakeRequest();
    request.soapAction = "urn:x\"\r\nEvil: 1";
    Ref<Reader> response;
    EXPECT_THROW(
        MakeClient(server).CreateSession()->SendRequest(request, response),
        InvalidArgumentException);
    EXPECT_EQ(0, server.GetConnectionCount());
}

class AcceptedStatuses : public testing::TestWithParam<std::string>
{};

TEST_P(AcceptedStatuses, GiveTheBody)
{
    const TestServer server(AnswerAll(MakeReply(GetParam(), "body")));
    EXPECT_EQ("body", Send(*MakeClient(server).CreateSession()));
    const Told told = SendAsync(*MakeClient(server).CreateSession());
    EXPECT_FALSE(told.hasError);
    EXPECT_EQ("body", told.body);
}

INSTANTIATE_TEST_SUITE_P(
    SendRequest,
    AcceptedStatuses,
    Values("200 OK", "202 Accepted", "299 Odd", "500 Internal Server Error"));

class OtherStatuses : public testing::TestWithParam<std::string>
{};

TEST_P(OtherStatuses, AreServerErrors)
{
    const TestServer server(AnswerAndClose(MakeReply(GetParam(), "body")));
    const std::string text = "Server returned error: " + GetParam();
    EXPECT_EQ(text, SendAndFail(*MakeClient(server).CreateSession()));
    const Told told = SendAsync(*MakeClient(server).CreateSession());
    EXPECT_EQ("CommunicationException", told.errorClass);
    EXPECT_EQ(text, told.errorText);
    EXPECT_FALSE(told.hasBody);
}

INSTANTIATE_TEST_SUITE_P(
    SendRequest,
    OtherStatuses,
    Values(
        "300 Multiple Choices",
        "302 Found",
        "400 Bad Request",
        "404 Not Found",
        "499 Odd",
        "501 Not Implemented",
        "503 Service Unavailable",
        "600 Odd"));

TEST(SendRequest, TakesAFinal199ForAServerError)
{
    const TestServer server(AnswerAndClose("HTTP/1.1 199 Odd\r\nContent-Length: 0\r\n\r\n"));
    EXPECT_EQ("Server returned error: 199 Odd", SendAndFail(*MakeClient(server).CreateSession()));
}

/** What follows the status line of an answer that is only a server error. */
class DislikedBodies : public testing::TestWithParam<std::string>
{};

TEST_P(DislikedBodies, DoNotHideTheStatus)
{
    const TestServer server([](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write("HTTP/1.1 503 Service Unavailable\r\n" + GetParam());
        connection.WaitForClose();
    });
    constexpr long long Bound = 10'000'000; // of an exchange that would wait for the body
    EXPECT_EQ(
        "Server returned error: 503 Service Unavailable",
        SendAndFail(*MakeClient(server, Bound).CreateSession()));
    EXPECT_EQ(
        "Server returned error: 503 Service Unavailable",
        SendAsync(*MakeClient(server, Bound).CreateSession()).errorText);
}

INSTANTIATE_TEST_SUITE_P(
    SendRequest,
    DislikedBodies,
    Values(
        "Content-Encoding: gzip\r\nContent-Length: 4\r\n\r\nbody",
        "Content-Length: 9000000\r\n\r\nand so on",
        "Content-Length: 100\r\n\r\nshort",
        "Transfer-Encoding: chunked\r\n\r\nno chunk"));

// [SOAP11 6.2]
TEST(SendRequest, JudgesTheBodyOfASoapFault)
{
    const TestServer server(
        AnswerAndClose("HTTP/1.1 500 Internal Server Error\r\nContent-Length: 100\r\n\r\nshort"));
    EXPECT_THROW(Send(*MakeClient(server).CreateSession()), Quillon::Http::HttpException);
}

// [RFC 9112 4]
TEST(SendRequest, KeepsTheBlankBeforeAMissingReasonPhrase)
{
    const TestServer server(AnswerAll(MakeReply("404", "")));
    EXPECT_EQ("Server returned error: 404 ", SendAndFail(*MakeClient(server).CreateSession()));
}

TEST(SendRequest, PassesTheTransportsOwnExceptionThrough)
{
    const TestServer server(AnswerAndClose(""));
    try {
        Send(*MakeClient(server).CreateSession());
        FAIL() << "answered";
    } catch (const Exception& error) {
        EXPECT_EQ("HttpException", GetClassName(error));
        EXPECT_EQ(
            "The server 127.0.0.1 port " + std::to_string(server.GetPort())
                + " closed the connection without a reply.",
            std::string(error.what()));
    }
}

TEST(SendRequest, GivesUpAfterTheTimeOut)
{
    const TestServer server([](ServerConnection& connection) { connection.WaitForClose(); });
    try {
        Send(*MakeClient(server, Short).CreateSession());
        FAIL() << "answered";
    } catch (const Exception& error) {
        EXPECT_EQ("TimeoutException", GetClassName(error));
        EXPECT_EQ(
            "There was no complete reply from 127.0.0.1 port " + std::to_string(server.GetPort())
                + " within 0.05 seconds.",
            std::string(error.what()));
    }
}

TEST(SendRequestAsync, TurnsEveryFailureIntoACommunicationException)
{
    const TestServer server(AnswerAndClose(""));
    const Told told = SendAsync(*MakeClient(server).CreateSession());
    EXPECT_EQ("CommunicationException", told.errorClass);
    EXPECT_EQ(
        "The server 127.0.0.1 port " + std::to_string(server.GetPort())
            + " closed the connection without a reply.",
        told.errorText);
    EXPECT_FALSE(told.hasBody);
}

TEST(SendRequestAsync, ReportsTheTimeOut)
{
    const TestServer server([](ServerConnection& connection) { connection.WaitForClose(); });
    const Told told = SendAsync(*MakeClient(server, Short).CreateSession());
    EXPECT_EQ("CommunicationException", told.errorClass);
    EXPECT_THAT(told.errorText, EndsWith(" within 0.05 seconds."));
}

TEST(SendRequestAsync, GivesAnItemThatCallsItOff)
{
    std::promise<void> asked;
    std::promise<void> closed;
    const TestServer server([&](ServerConnection& connection) {
        connection.ReadRequest();
        asked.set_value();
        connection.WaitForClose();
        closed.set_value();
    });
    std::atomic<bool> called{false};
    const boost::shared_ptr<TransportSession> session = MakeClient(server).CreateSession();
    Ref<ScheduledItem> pending;
    session->SendRequestAsync(
        MakeRequest(), [&](const Exception*, Reader*) { called = true; }, pending);
    asked.get_future().wait();
    EXPECT_TRUE(pending->Cancel());
    closed.get_future().wait();
    EXPECT_FALSE(called);
}

TEST(SendRequestAsync, CallsBackOnceAlthoughItsItemIsLetGo)
{
    std::promise<void> asked;
    std::promise<void> mayAnswer;
    const TestServer server([&](ServerConnection& connection) {
        if (connection.ReadRequest()) {
            asked.set_value();
            mayAnswer.get_future().wait();
            connection.Write(MakeReply("200 OK", "body"));
        }
    });
    std::atomic<int> calls{0};
    std::promise<std::string> body;
    const boost::shared_ptr<TransportSession> session = MakeClient(server).CreateSession();
    Ref<ScheduledItem> pending;
    session->SendRequestAsync(
        MakeRequest(),
        [&](const Exception*, Reader* reader) {
            if (++calls == 1) {
                body.set_value(ReadAll(Ref<Reader>(reader)));
            }
        },
        pending);
    asked.get_future().wait();
    pending.reset();
    mayAnswer.set_value();
    std::future<std::string> told = body.get_future();
    ASSERT_EQ(std::future_status::ready, told.wait_for(std::chrono::seconds(10)));
    EXPECT_EQ("body", told.get());
    EXPECT_EQ(1, calls);
}

TEST(SendRequestAsync, CallsBackOnceWithAFailure)
{
    const TestServer server(AnswerAll(MakeReply("404 Not Found", "")));
    std::vector<std::string> told;
    std::promise<void> callbackIsGone;
    std::shared_ptr<void> guard(&told, [&](void*) { callbackIsGone.set_value(); });
    Ref<ScheduledItem> pending;
    MakeClient(server).CreateSession()->SendRequestAsync(
        MakeRequest(),
        [&told, guard](const Exception* error, Reader* reader) {
            EXPECT_EQ(nullptr, reader);
            told.emplace_back(error != nullptr ? error->what() : "nothing");
        },
        pending);
    guard.reset();
    pending.reset();
    callbackIsGone.get_future().wait(); // nobody can call it any more
    EXPECT_THAT(told, testing::ElementsAre(StartsWith("Server returned error: 404")));
}

/** The thread on which a request that this thread sends calls back. */
std::thread::id GetCallbackThread(const TestServer& server)
{
    std::promise<std::thread::id> thread;
    Ref<ScheduledItem> pending;
    const boost::shared_ptr<TransportSession> session = MakeClient(server).CreateSession();
    session->SendRequestAsync(
        MakeRequest(),
        [&](const Exception*, Reader*) { thread.set_value(std::this_thread::get_id()); },
        pending);
    return thread.get_future().get();
}

TEST(SendRequestAsync, CallsBackOnTheThreadOfTheHttpClient)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const std::thread::id first = GetCallbackThread(server);
    std::thread::id second;
    std::thread other([&] { second = GetCallbackThread(server); });
    const std::thread::id otherId = other.get_id();
    other.join();
    EXPECT_EQ(first, second);
    EXPECT_NE(first, std::this_thread::get_id());
    EXPECT_NE(second, otherId);
}

TEST(SendRequestAsync, CompletesAfterItsSessionIsGone)
{
    std::promise<void> mayAnswer;
    const TestServer server([&](ServerConnection& connection) {
        connection.ReadRequest();
        mayAnswer.get_future().wait();
        connection.Write(MakeReply("200 OK", "late"));
    });
    std::promise<std::string> body;
    Ref<ScheduledItem> pending;
    MakeClient(server).CreateSession()->SendRequestAsync(
        MakeRequest(),
        [&](const Exception*, Reader* reader) { body.set_value(ReadAll(Ref<Reader>(reader))); },
        pending);
    mayAnswer.set_value();
    EXPECT_EQ("late", body.get_future().get());
}

/** Gives each connection a cookie at its first request, and answers with the cookie it got. */
TestServer::Handler GiveCookies(std::atomic<int>& count)
{
    return [&count](ServerConnection& connection) {
        while (std::optional<ReceivedRequest> request = connection.ReadRequest()) {
            const std::size_t cookie = request->head.find("\r\nCookie: id=");
            if (cookie != std::string::npos) {
                connection.Write(MakeReply("200 OK", request->head.substr(cookie + 13, 1)));
            } else {
                connection.Write(MakeReply(
                    "200 OK",
                    "none",
                    "Set-Cookie: id=" + std::to_string(++count) + "; Path=/\r\n"));
            }
        }
    };
}

TEST(TransportSession, SharesCookiesBetweenItsRequestsOnly)
{
    std::atomic<int> count{0};
    const TestServer server(GiveCookies(count));
    const HttpsClient client = MakeClient(server);
    const boost::shared_ptr<TransportSession> first = client.CreateSession();
    const boost::shared_ptr<TransportSession> second = client.CreateSession();
    EXPECT_EQ("none", Send(*first));
    EXPECT_EQ("none", Send(*second));
    EXPECT_EQ("1", Send(*first));
    EXPECT_EQ("2", Send(*second));
    EXPECT_EQ("1", SendAsync(*first).body);
}

TEST(TransportSession, UsesOneConnectionForAllItsRequests)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")));
    const HttpsClient client = MakeClient(server);
    const boost::shared_ptr<TransportSession> session = client.CreateSession();
    Send(*session);
    Send(*session);
    EXPECT_EQ(1, server.GetConnectionCount());
    Send(*client.CreateSession());
    EXPECT_EQ(2, server.GetConnectionCount());
}

TEST(TransportSession, OutlivesItsClient)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")));
    const boost::shared_ptr<TransportSession> session = MakeClient(server).CreateSession();
    EXPECT_EQ("body", Send(*session));
}

namespace {

boost::shared_ptr<const Transport> MakeReusing(const TestServer& server, unsigned mostIdle = 8)
{
    return MakeClient(server).WithReuse(ConnectionReuse{mostIdle, Generous});
}

} // namespace

TEST(ReusingTransport, GivesAConnectionToOneSessionAfterTheOther)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")));
    const auto transport = MakeReusing(server);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ("body", Send(*transport->CreateSession()));
    }
    EXPECT_EQ(1, server.GetConnectionCount());
}

TEST(ReusingTransport, GivesNoCookiesWithTheConnection)
{
    std::atomic<int> count{0};
    const TestServer server(GiveCookies(count));
    const auto transport = MakeReusing(server);
    EXPECT_EQ("none", Send(*transport->CreateSession()));
    EXPECT_EQ("none", Send(*transport->CreateSession()));
    EXPECT_EQ(1, server.GetConnectionCount());
}

TEST(ReusingTransport, GivesAConnectionToOneSessionAtATime)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")));
    const auto transport = MakeReusing(server);
    const auto first = transport->CreateSession();
    const auto second = transport->CreateSession();
    for (int i = 0; i < 2; ++i) {
        Send(*first);
        Send(*second);
    }
    EXPECT_EQ(2, server.GetConnectionCount());
}

TEST(ReusingTransport, KeepsNoMoreThanItShould)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")));
    const auto transport = MakeReusing(server, 1);
    {
        const auto first = transport->CreateSession();
        const auto second = transport->CreateSession();
        Send(*first);
        Send(*second);
    }
    const auto first = transport->CreateSession();
    const auto second = transport->CreateSession();
    Send(*first);
    Send(*second);
    EXPECT_EQ(3, server.GetConnectionCount());
}

TEST(ReusingTransport, DoesNotPassOnTheConnectionOfANegotiation)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")));
    const auto transport = MakeReusing(server);
    SessionOptions options;
    options.isNegotiation = true;
    {
        const auto negotiation = transport->CreateControlledSession(options);
        Send(*negotiation);
        Send(*negotiation);
        EXPECT_EQ(1, server.GetConnectionCount());
    }
    Send(*transport->CreateSession());
    EXPECT_EQ(2, server.GetConnectionCount());
}

TEST(ReusingTransport, SharesNothingWithAnother)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")));
    const auto transport = MakeReusing(server);
    Send(*transport->CreateSession());
    Send(*transport->WithReuse(ConnectionReuse())->CreateSession());
    EXPECT_EQ(2, server.GetConnectionCount());
    const auto without = transport->WithReuse(boost::none);
    Send(*without->CreateSession());
    Send(*without->CreateSession());
    EXPECT_EQ(4, server.GetConnectionCount());
}

TEST(ControlledSession, HasNoLongerThanIsLeft)
{
    const TestServer server([](ServerConnection& connection) { connection.WaitForClose(); });
    SessionOptions options;
    options.timeLeft = [] { return Short; };
    const auto session = MakeClient(server).CreateControlledSession(options);
    Ref<Reader> response;
    EXPECT_THROW(session->SendRequest(MakeRequest(), response), Quillon::Http::TimeoutException);
    options.timeLeft = [] { return Generous; };
    const auto ownLimit = MakeClient(server, Short).CreateControlledSession(options);
    EXPECT_THROW(ownLimit->SendRequest(MakeRequest(), response), Quillon::Http::TimeoutException);
}

TEST(ControlledSession, EndsWhenItsExchangeIsCalledOff)
{
    std::promise<void> isSent;
    const TestServer server([&](ServerConnection& connection) {
        connection.ReadRequest();
        isSent.set_value();
        connection.WaitForClose();
    });
    std::promise<Ref<Quillon::System::ScheduledItem>> pending;
    SessionOptions options;
    options.onPending = [&](const Ref<Quillon::System::ScheduledItem>& item) {
        pending.set_value(item);
    };
    const auto session = MakeClient(server).CreateControlledSession(options);
    std::thread canceller([&] {
        isSent.get_future().wait();
        pending.get_future().get()->Cancel();
    });
    Ref<Reader> response;
    EXPECT_THROW(session->SendRequest(MakeRequest(), response), Quillon::Http::HttpException);
    canceller.join();
}

TEST(ControlledSession, TellsBothObservers)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")));
    std::vector<std::string> told;
    ExchangeOptions own;
    own.observer = [&](const auto&) { told.push_back("transport's"); };
    SessionOptions options;
    options.observer = [&](const auto&) { told.push_back("call's"); };
    const HttpsClient client(server.GetUrl("/sts"), nullptr, "", own);
    Send(*client.CreateControlledSession(options));
    EXPECT_THAT(told, testing::ElementsAre("call's", "transport's"));
    Send(*client.CreateSession());
    EXPECT_EQ(told.size(), 3U);
    Send(*MakeClient(server).CreateControlledSession(options));
    EXPECT_EQ(told.back(), "call's");
}

TEST(HttpsClient, TalksTlsToTheExpectedPeerOnly)
{
    CertificateOptions options;
    options.alternativeNames = "DNS:sts.test";
    const Identity identity = MakeIdentity(options);
    TlsServer tls(identity);
    const TestServer server(AnswerAll(MakeReply("200 OK", "body")), tls.GetStreams());
    const std::vector<unsigned char> der = identity.GetDer();
    Quillon::Ssl::SSLContextOptions trust;
    trust.useSystemAuthorities = false;
    trust.authorities.push_back(Quillon::Crypto::CreateCertificate(der.data(), der.size()));
    const Ref<SSLContext> context = Quillon::Ssl::CreateSSLContext(trust);
    const std::string url = "https://127.0.0.1:" + std::to_string(server.GetPort()) + "/sts";

    const HttpsClient named(url, context.get(), "sts.test", Generous);
    const boost::shared_ptr<TransportSession> session = named.CreateSession();
    EXPECT_EQ("body", Send(*session));
    EXPECT_FALSE(IsProbed(FindClientSocket(server.GetPort())));
    const HttpsClient unnamed(url, context.get(), "", Generous);
    EXPECT_THROW(Send(*unnamed.CreateSession()), Quillon::Http::HttpException);
    const HttpsClient misnamed(url, context.get(), "other.test", Generous);
    EXPECT_THROW(Send(*misnamed.CreateSession()), Quillon::Http::HttpException);
}

/** A reply of a status that the wire need not be able to carry. */
class FixedResponse final : public ClientResponse
{
public:
    FixedResponse(int code, const std::string& reason)
        : _status{code, reason}
        , _body(Quillon::CreateStringReader("body"))
    {}

    const HttpStatus& GetStatus() const noexcept override { return _status; }
    const Ref<Reader>& GetBody() const noexcept override { return _body; }

private:
    HttpStatus _status;
    Ref<Reader> _body;
};

std::string Translate(int code)
{
    const Ref<ClientResponse> response(new FixedResponse(code, "Reason"));
    boost::shared_ptr<Exception> error;
    Ref<Reader> body;
    TranslateResponse(nullptr, response.get(), error, body);
    EXPECT_NE(error == nullptr, body == nullptr);
    return error != nullptr ? GetClassName(*error) + ": " + error->what() : ReadAll(body);
}

TEST(TranslateResponse, AcceptsSuccessAndSoapFaults)
{
    EXPECT_EQ("body", Translate(200));
    EXPECT_EQ("body", Translate(299));
    EXPECT_EQ("body", Translate(500));
}

TEST(TranslateResponse, RefusesEveryOtherStatus)
{
    for (const int code : {0, 100, 199, 300, 404, 499, 501, 2000}) {
        EXPECT_EQ(
            "CommunicationException: Server returned error: " + std::to_string(code) + " Reason",
            Translate(code));
    }
}

TEST(TranslateResponse, WrapsAnError)
{
    boost::shared_ptr<Exception> error;
    Ref<Reader> body;
    TranslateResponse(
        boost::make_shared<Quillon::InvalidStateException>("broken").get(), nullptr, error, body);
    EXPECT_EQ("CommunicationException", GetClassName(*error));
    EXPECT_EQ("broken", std::string(error->what()));
    EXPECT_EQ(nullptr, body);
}

TEST(TranslateResponse, StopsTheProcessWithoutErrorAndResponse)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    boost::shared_ptr<Exception> error;
    Ref<Reader> body;
    EXPECT_DEATH(
        TranslateResponse(nullptr, nullptr, error, body),
        "^PanicVerify failed: response != __null \\(lib/ssoClient/HttpsClient:116\\)\n$");
}

TEST(AsyncTranslateResponse, RaisesTheEmptyFunctionErrorForAnEmptyCallback)
{
    const Ref<ClientResponse> response(new FixedResponse(200, "OK"));
    EXPECT_THROW(
        AsyncTranslateResponse(ResponseCallback(), nullptr, response.get(), nullptr),
        boost::bad_function_call);
}

TEST(Request, OverwritesItsBodyWhenItGoes)
{
    alignas(Request) unsigned char memory[sizeof(Request)];
    Request* const request = new (memory) Request;
    request->body = "secret"; // short, so that it stands in the object itself
    const std::string_view bytes(reinterpret_cast<const char*>(memory), sizeof memory);
    ASSERT_NE(std::string_view::npos, bytes.find("secret"));
    request->~Request();
    EXPECT_EQ(std::string_view::npos, bytes.find("secret"));
}

// Bound without arguments, it takes whatever it is given.
static_assert(std::is_constructible_v<ResponseCallback, decltype(boost::bind(&noop))>);
static_assert(noexcept(noop()));

} // namespace
