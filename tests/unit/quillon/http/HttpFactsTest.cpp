#include "HttpClient.h"
#include "NameLookup.h"
#include "support/TestTls.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>

using namespace Quillon::Http;
using namespace Testing;
using Quillon::Ref;
using Quillon::Crypto::Certificate;
using Quillon::Ssl::SSLContext;
using Quillon::Ssl::SSLContextOptions;
using testing::StartsWith;

namespace {

Ref<const Certificate> ToCertificate(const Identity& identity)
{
    const std::vector<unsigned char> der = identity.GetDer();
    return Quillon::Crypto::CreateCertificate(der.data(), der.size());
}

/** What the observer of an exchange is told, after the exchange has ended one way or another. */
ExchangeFacts Observe(
    const Ref<ConnectionSpec>& spec,
    const Ref<ClientRequest>& request = HttpClient::MakeRequest("ping", "/sts?tenant=1"))
{
    std::promise<ExchangeFacts> told;
    request->SetObserver([&](const ExchangeFacts& facts) { told.set_value(facts); });
    HttpClient(spec).PostAndFail(request);
    return told.get_future().get();
}

/** A TLS server for sts.test, with the authority above it. */
class ObservedTls : public testing::Test
{
protected:
    ObservedTls()
        : authority(MakeIdentity({"Test authority", "", true}))
        , identity(MakeIdentity({"Test server", "DNS:sts.test"}, &authority))
        , tls(identity)
        , server(AnswerAll(MakeReply("200 OK", "pong")), tls.GetStreams())
    {
        SSL_CTX_add1_chain_cert(tls.GetContext(), authority.certificate.get());
    }

    Ref<ConnectionSpec> MakeSpec(const Identity& trusted, const std::string& peer = "") const
    {
        SSLContextOptions options;
        options.useSystemAuthorities = false;
        options.authorities.push_back(ToCertificate(trusted));
        Ref<ConnectionSpec> spec;
        CreateSSLConnectionSpec(
            MakeTcpSpec(server).get(), CreateSSLContext(options).get(), "sts.test", peer, spec);
        return spec;
    }

    /** The chain as the server shows it, whatever the client thinks of it. */
    void ExpectChain(const ExchangeFacts& facts) const
    {
        ASSERT_EQ(facts.certificates.size(), 2U);
        EXPECT_EQ(facts.certificates.front()->GetEncoded(), identity.GetDer());
        EXPECT_EQ(facts.certificates.back()->GetEncoded(), authority.GetDer());
    }

    const Identity authority;
    const Identity identity;
    TlsServer tls;
    const TestServer server;
};

} // namespace

TEST(Observer, IsToldOfAnAnswer)
{
    const TestServer server(AnswerAll(MakeReply(
        "503 Gone",
        "",
        "Date: Fri, 20 Nov 2026 12:00:00 GMT\r\nLOCATION: https://other.test/x\r\n")));
    const ExchangeFacts facts = Observe(MakeTcpSpec(server));
    EXPECT_EQ(facts.server, Describe(server));
    EXPECT_EQ(facts.path, "/sts?tenant=1");
    EXPECT_EQ(facts.address, "127.0.0.1:" + std::to_string(server.GetPort()));
    EXPECT_EQ(facts.status, 503);
    EXPECT_EQ(facts.location, "https://other.test/x");
    ASSERT_TRUE(facts.date);
    EXPECT_EQ(facts.date->ToString(), "2026-11-20T12:00:00.000Z");
    EXPECT_EQ(facts.failure, "");
    EXPECT_EQ(facts.tlsVersion, "");
    EXPECT_TRUE(facts.certificates.empty());
}

TEST(Observer, IsToldWhatWentOverTheWire)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong pong")));
    const ExchangeFacts facts = Observe(MakeTcpSpec(server));
    EXPECT_EQ(facts.sentOctets, 4); // ping
    EXPECT_EQ(facts.receivedOctets, 9);
    EXPECT_TRUE(facts.isSent);
    EXPECT_FALSE(facts.isConnectionReused);
    EXPECT_FALSE(facts.isSessionResumed);
    EXPECT_FALSE(facts.retryAfterSeconds);
}

TEST(Observer, IsToldThatNothingWasSent)
{
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec("127.0.0.1", 1, false, spec);
    const ExchangeFacts facts = Observe(spec);
    EXPECT_FALSE(facts.isSent);
    EXPECT_FALSE(facts.isConnectionReused);
    EXPECT_EQ(facts.times.connection, 0);
    EXPECT_EQ(facts.sentOctets, 0);
}

TEST(Observer, IsToldOfAConnectionThatWasThere)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(MakeTcpSpec(server));
    client.Post();
    std::promise<ExchangeFacts> told;
    const Ref<ClientRequest> request = HttpClient::MakeRequest("ping", "/sts");
    request->SetObserver([&](const ExchangeFacts& facts) { told.set_value(facts); });
    client.Post(request);
    const ExchangeFacts facts = told.get_future().get();
    EXPECT_TRUE(facts.isConnectionReused);
    EXPECT_TRUE(facts.isSent);
    EXPECT_EQ(facts.times.handshake, 0);
}

TEST(Observer, IsToldWhenToComeAgain)
{
    const std::string date = "Date: Fri, 20 Nov 2026 12:00:00 GMT\r\n";
    const auto observe = [&](const std::string& fields) {
        const TestServer server(AnswerAll(MakeReply("503 Busy", "", fields)));
        return Observe(MakeTcpSpec(server)).retryAfterSeconds.value_or(-1);
    };
    EXPECT_EQ(observe("Retry-After: 120\r\n"), 120);
    EXPECT_EQ(observe("retry-after: 0\r\n"), 0);
    EXPECT_EQ(observe("Retry-After: Fri, 20 Nov 2026 12:00:07 GMT\r\n" + date), 7);
    EXPECT_EQ(observe("Retry-After: Fri, 20 Nov 2026 11:59:59 GMT\r\n" + date), 0);
    for (const std::string value :
         {"",
          "-1",
          "1.5",
          "12 s",
          "soon",
          "99999999999999999999",
          "Fri, 20 Nov 2026 12:00:07 GMT"}) {
        EXPECT_EQ(observe("Retry-After: " + value + "\r\n"), -1) << value;
    }
}

TEST(Observer, IsToldTheTimesInTheirOrder)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const ExchangeTimes times = Observe(MakeTcpSpec(server)).times;
    EXPECT_GT(times.connection, 0);
    EXPECT_GE(times.connection, times.nameLookup);
    EXPECT_EQ(times.handshake, 0);
    EXPECT_GE(times.firstByte, times.connection);
    EXPECT_GE(times.end, times.firstByte);
}

TEST(Observer, IsToldNoDateThatIsNone)
{
    for (const std::string date : {"", "Date: yesterday\r\n", "Date: 99999999999\r\n"}) {
        const TestServer server(AnswerAll(MakeReply("200 OK", "pong", date)));
        EXPECT_FALSE(Observe(MakeTcpSpec(server)).date) << date;
    }
}

TEST(Observer, IsToldNoFieldOfAnInterimReply)
{
    const TestServer server(AnswerAll(
        "HTTP/1.1 103 Early Hints\r\nLocation: /early\r\n\r\n" + MakeReply("200 OK", "pong")));
    EXPECT_EQ(Observe(MakeTcpSpec(server)).location, "");
}

TEST(Observer, IsToldOfAFailure)
{
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec("127.0.0.1", 1, false, spec);
    const ExchangeFacts facts = Observe(spec);
    EXPECT_THAT(facts.failure, StartsWith("Cannot connect to 127.0.0.1 port 1: "));
    EXPECT_EQ(facts.status, 0);
}

TEST(Observer, MayThrow)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetObserver([](const ExchangeFacts&) { throw std::runtime_error("no"); });
    EXPECT_EQ(HttpClient(server).Post(request).body, "pong");
}

TEST_F(ObservedTls, TellsTheChainAndTheVersion)
{
    const ExchangeFacts facts = Observe(MakeSpec(authority));
    ExpectChain(facts);
    EXPECT_EQ(facts.tlsVersion, "TLSv1.3");
    EXPECT_THAT(facts.tlsCipher, StartsWith("TLS_"));
    EXPECT_EQ(facts.status, 200);
    EXPECT_GT(facts.times.handshake, facts.times.connection);
}

TEST_F(ObservedTls, TellsThatASessionIsTakenUpAgain)
{
    const Ref<ConnectionSpec> spec = MakeSpec(authority);
    const ExchangeFacts first = Observe(spec);
    EXPECT_FALSE(first.isSessionResumed);
    const ExchangeFacts second = Observe(spec);
    EXPECT_TRUE(second.isSessionResumed);
    EXPECT_FALSE(second.isConnectionReused);
}

TEST_F(ObservedTls, TellsTheChainThatIsRefused)
{
    const ExchangeFacts facts = Observe(MakeSpec(MakeIdentity({"Another authority", "", true})));
    ExpectChain(facts);
    EXPECT_THAT(facts.failure, testing::HasSubstr(" is refused: "));
}

TEST_F(ObservedTls, TellsTheChainOfAnotherKeyThanThePinnedOne)
{
    const ExchangeFacts facts = Observe(MakeSpec(authority, authority.GetPin()));
    ExpectChain(facts);
    EXPECT_THAT(facts.failure, testing::HasSubstr(" is not the pinned one, "));
    EXPECT_EQ(GetPin(*facts.certificates.front()), identity.GetPin());
}

TEST_F(ObservedTls, TellsTheSameOfAConnectionThatWasKept)
{
    HttpClient client(MakeSpec(authority));
    for (int round = 0; round < 2; ++round) {
        std::promise<ExchangeFacts> told;
        const Ref<ClientRequest> request = HttpClient::MakeRequest();
        request->SetObserver([&](const ExchangeFacts& facts) { told.set_value(facts); });
        client.Post(request);
        ExpectChain(told.get_future().get());
    }
    EXPECT_EQ(server.GetConnectionCount(), 1);
}

TEST(ConnectTimeout, EndsALookUpThatHangs)
{
    NameLookup::Block block;
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec(NameLookup::BlockedHost, 80, false, spec);
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetConnectTimeout(Short);
    EXPECT_EQ(
        HttpClient(spec).PostAndFail(request),
        "There was no connection to blocked.invalid port 80 within 0.05 seconds.");
}

TEST_F(ObservedTls, ConnectTimeoutEndsAHandshakeThatHangs)
{
    const TestServer mute([](ServerConnection& connection) { connection.WaitForClose(); });
    Ref<ConnectionSpec> spec;
    CreateSSLConnectionSpec(
        MakeTcpSpec(mute).get(), Quillon::Ssl::CreateSSLContext({}).get(), "127.0.0.1", "", spec);
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetConnectTimeout(Short);
    const ExchangeFacts facts = Observe(spec, request);
    EXPECT_EQ(
        facts.failure, "There was no connection to " + Describe(mute) + " within 0.05 seconds.");
    EXPECT_EQ(facts.tlsVersion, "");
}

TEST(ConnectTimeout, IsOverWithTheConnection)
{
    const TestServer server([](ServerConnection& connection) { connection.WaitForClose(); });
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetConnectTimeout(Short);
    request->SetTimeout(2 * Short);
    EXPECT_EQ(
        HttpClient(server).PostAndFail(request),
        "There was no complete reply from " + Describe(server) + " within 0.1 seconds.");
}

TEST(ConnectTimeout, LeavesALookUpTheWholeTimeIfItIsLonger)
{
    NameLookup::Block block;
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec(NameLookup::BlockedHost, 80, false, spec);
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetConnectTimeout(2 * Short);
    request->SetTimeout(Short);
    EXPECT_EQ(
        HttpClient(spec).PostAndFail(request),
        "There was no complete reply from blocked.invalid port 80 within 0.05 seconds.");
}
