#include "HttpClient.h"
#include "support/ClientSocket.h"
#include "support/TestTls.h"

#include "quillon/ssl/SSLContext.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <future>

#include <sys/inotify.h>
#include <unistd.h>

using namespace Quillon::Http;
using namespace Testing;
using Quillon::InvalidArgumentException;
using Quillon::Ref;
using Quillon::Crypto::Certificate;
using Quillon::Ssl::CreateSSLContext;
using Quillon::Ssl::SSLContext;
using Quillon::Ssl::SSLContextOptions;
using testing::EndsWith;
using testing::StartsWith;

namespace {

Ref<const Certificate> ToCertificate(const Identity& identity)
{
    const std::vector<unsigned char> der = identity.GetDer();
    return Quillon::Crypto::CreateCertificate(der.data(), der.size());
}

Ref<SSLContext> Trust(const Identity& authority)
{
    SSLContextOptions options;
    options.useSystemAuthorities = false;
    options.authorities.push_back(ToCertificate(authority));
    return CreateSSLContext(options);
}

/** An authority; one has another name than the other, as real ones do. */
Identity MakeAuthority()
{
    static int count = 0;
    CertificateOptions options;
    options.commonName = "Test authority " + std::to_string(++count);
    options.isAuthority = true;
    return MakeIdentity(options);
}

Identity MakeServerIdentity(const Identity& authority, const std::string& names)
{
    CertificateOptions options;
    options.commonName = "Test server";
    options.alternativeNames = names;
    return MakeIdentity(options, &authority);
}

/** A TLS server for `names` below a test authority, and the means to talk to it. */
class TlsTest : public testing::Test
{
protected:
    static constexpr char Host[] = "sts.test";

    explicit TlsTest(const std::string& names = "DNS:sts.test,IP:127.0.0.1")
        : authority(MakeAuthority())
        , identity(MakeServerIdentity(authority, names))
        , tls(identity)
        , server(AnswerAll(MakeReply("200 OK", "pong")), tls.GetStreams())
        , context(Trust(authority))
    {}

    Ref<ConnectionSpec> MakeSpec(
        SSLContext* sslContext,
        const std::string& host,
        const std::string& peer,
        const TestServer& to) const
    {
        Ref<ConnectionSpec> tcp;
        CreateTCPConnectionSpec("127.0.0.1", to.GetPort(), false, tcp);
        Ref<ConnectionSpec> spec;
        CreateSSLConnectionSpec(tcp.get(), sslContext, host, peer, spec);
        return spec;
    }
    Ref<ConnectionSpec> MakeSpec(const std::string& peer = "", const std::string& host = Host) const
    {
        return MakeSpec(context.get(), host, peer, server);
    }

    std::string GetRefusal(
        const std::string& reason, const std::string& name, const std::string& host = Host) const
    {
        return "The TLS certificate of " + Describe(server, host) + " is refused: " + reason
               + ". It must name \"" + name + "\" and lead to a trusted authority.";
    }

    int CountResumed() const
    {
        int count = 0;
        for (const SeenHandshake& seen : tls.GetHandshakes()) {
            count += seen.resumed ? 1 : 0;
        }
        return count;
    }

    const Identity authority;
    const Identity identity;
    TlsServer tls;
    const TestServer server;
    const Ref<SSLContext> context;
};

TEST_F(TlsTest, AcceptsATrustedServerOfThatName)
{
    EXPECT_EQ("pong", HttpClient(MakeSpec()).Post().body);
}

TEST_F(TlsTest, AcceptsATrustedServerOfThatAddress)
{
    EXPECT_EQ("pong", HttpClient(MakeSpec("", "127.0.0.1")).Post().body);
}

TEST_F(TlsTest, AsksForTheHostByName)
{
    HttpClient(MakeSpec()).Post();
    EXPECT_EQ("sts.test", tls.GetHandshakes().at(0).serverName);
}

TEST_F(TlsTest, AsksForNoNameIfTheHostIsAnAddress)
{
    HttpClient(MakeSpec("", "127.0.0.1")).Post();
    EXPECT_EQ("", tls.GetHandshakes().at(0).serverName);
}

TEST_F(TlsTest, RefusesAnotherName)
{
    EXPECT_EQ(
        GetRefusal("hostname mismatch", "other.test", "other.test"),
        HttpClient(MakeSpec("", "other.test")).PostAndFail());
}

TEST_F(TlsTest, RefusesAnotherAddress)
{
    EXPECT_EQ(
        GetRefusal("IP address mismatch", "127.0.0.2", "127.0.0.2"),
        HttpClient(MakeSpec("", "127.0.0.2")).PostAndFail());
}

TEST_F(TlsTest, RefusesAnUntrustedAuthority)
{
    const Ref<SSLContext> other = Trust(MakeAuthority());
    HttpClient client(MakeSpec(other.get(), Host, "", server));
    EXPECT_EQ(GetRefusal("unable to get local issuer certificate", Host), client.PostAndFail());
}

/** Makes the server warn that it does not know the name, and go on [RFC 6066 3]. */
void MakeItWarn(SSL_CTX* server)
{
    SSL_CTX_set_max_proto_version(server, TLS1_2_VERSION);
    SSL_CTX_set_tlsext_servername_callback(
        server, +[](SSL*, int* alert, void*) {
            *alert = SSL_AD_UNRECOGNIZED_NAME;
            return SSL_TLSEXT_ERR_ALERT_WARNING;
        });
}

TEST_F(TlsTest, TakesNoWarningForTheEnd)
{
    MakeItWarn(tls.GetContext());
    EXPECT_EQ("pong", HttpClient(MakeSpec()).Post().body);
}

TEST_F(TlsTest, RefusesAnUntrustedAuthorityThatWarns)
{
    MakeItWarn(tls.GetContext());
    const Ref<SSLContext> other = Trust(MakeAuthority());
    HttpClient client(MakeSpec(other.get(), Host, "", server));
    EXPECT_EQ(GetRefusal("unable to get local issuer certificate", Host), client.PostAndFail());
}

TEST_F(TlsTest, RefusesAnotherKeyThatWarns)
{
    MakeItWarn(tls.GetContext());
    EXPECT_THAT(
        HttpClient(MakeSpec(MakeAuthority().GetPin())).PostAndFail(),
        testing::HasSubstr(" is not the pinned one, "));
}

TEST_F(TlsTest, KeepsTheTrustOfContextsApart)
{
    const Identity otherAuthority = MakeAuthority();
    const Ref<SSLContext> other = Trust(otherAuthority);
    TlsServer otherTls(MakeServerIdentity(otherAuthority, "DNS:sts.test"));
    const TestServer otherServer(AnswerAll(MakeReply("200 OK", "pong")), otherTls.GetStreams());
    for (int round = 0; round < 2; ++round) {
        EXPECT_EQ("pong", HttpClient(MakeSpec(context.get(), Host, "", server)).Post().body);
        EXPECT_EQ("pong", HttpClient(MakeSpec(other.get(), Host, "", otherServer)).Post().body);
        EXPECT_THAT(
            HttpClient(MakeSpec(other.get(), Host, "", server)).PostAndFail(),
            StartsWith("The TLS certificate of " + Describe(server, Host) + " is refused: "));
        EXPECT_THAT(
            HttpClient(MakeSpec(context.get(), Host, "", otherServer)).PostAndFail(),
            StartsWith("The TLS certificate of " + Describe(otherServer, Host) + " is refused: "));
    }
}

TEST_F(TlsTest, RefusesAServerThatOnlyTheSystemCouldTrust)
{
    SSLContextOptions options;
    const Ref<SSLContext> system = CreateSSLContext(options);
    HttpClient client(MakeSpec(system.get(), Host, "", server));
    EXPECT_EQ(GetRefusal("unable to get local issuer certificate", Host), client.PostAndFail());
}

TEST_F(TlsTest, AcceptsACertificateThatIsTrustedItself)
{
    const Ref<SSLContext> pinned = Trust(identity);
    EXPECT_EQ("pong", HttpClient(MakeSpec(pinned.get(), Host, "", server)).Post().body);
}

// [RFC 1122 4.2.3.6]
TEST_F(TlsTest, ProbesIdleConnectionsIfItsTcpDoes)
{
    for (const bool keepAlive : {false, true}) {
        Ref<ConnectionSpec> tcp;
        CreateTCPConnectionSpec("127.0.0.1", server.GetPort(), keepAlive, tcp);
        Ref<ConnectionSpec> spec;
        CreateSSLConnectionSpec(tcp.get(), context.get(), Host, "", spec);
        HttpClient client(spec);
        client.Post();
        EXPECT_EQ(keepAlive, IsProbed(FindClientSocket(server.GetPort())));
    }
}

TEST_F(TlsTest, RefusesATrustedCertificateOfAnotherName)
{
    const Ref<SSLContext> pinned = Trust(identity);
    EXPECT_EQ(
        GetRefusal("hostname mismatch", "other.test", "other.test"),
        HttpClient(MakeSpec(pinned.get(), "other.test", "", server)).PostAndFail());
}

TEST_F(TlsTest, RefusesAnExpiredCertificate)
{
    CertificateOptions options;
    options.alternativeNames = "DNS:sts.test";
    options.notBeforeSec = -7200;
    options.notAfterSec = -3600;
    TlsServer expired(MakeIdentity(options, &authority));
    const TestServer other(AnswerAll(MakeReply("200 OK", "pong")), expired.GetStreams());
    EXPECT_EQ(
        "The TLS certificate of " + Describe(other, Host)
            + " is refused: certificate has expired. It must name \"sts.test\" and lead to a "
              "trusted authority.",
        HttpClient(MakeSpec(context.get(), Host, "", other)).PostAndFail());
}

// [RFC 9525 2]: only the alternative names count, and a certificate may have none.
TEST_F(TlsTest, RefusesTheHostAsACommonName)
{
    CertificateOptions options;
    options.commonName = Host;
    TlsServer nameless(MakeIdentity(options, &authority));
    const TestServer other(AnswerAll(MakeReply("200 OK", "pong")), nameless.GetStreams());
    EXPECT_THAT(
        HttpClient(MakeSpec(context.get(), Host, "", other)).PostAndFail(),
        StartsWith("The TLS certificate of " + Describe(other, Host) + " is refused: "));
}

TEST_F(TlsTest, RefusesACertificateThatIsNotYetValid)
{
    CertificateOptions options;
    options.alternativeNames = "DNS:sts.test";
    options.notBeforeSec = 3600;
    options.notAfterSec = 7200;
    TlsServer early(MakeIdentity(options, &authority));
    const TestServer other(AnswerAll(MakeReply("200 OK", "pong")), early.GetStreams());
    EXPECT_THAT(
        HttpClient(MakeSpec(context.get(), Host, "", other)).PostAndFail(),
        StartsWith(
            "The TLS certificate of " + Describe(other, Host)
            + " is refused: certificate is not yet valid."));
}

TEST_F(TlsTest, AcceptsThePeerNameInPlaceOfTheHost)
{
    EXPECT_EQ("pong", HttpClient(MakeSpec("sts.test", "alias.test")).Post().body);
    EXPECT_EQ("alias.test", tls.GetHandshakes().at(0).serverName);
}

TEST_F(TlsTest, AcceptsThePeerAddressInPlaceOfTheHost)
{
    EXPECT_EQ("pong", HttpClient(MakeSpec("127.0.0.1", "alias.test")).Post().body);
}

TEST_F(TlsTest, RefusesAServerThatHasTheHostsNameButNotThePeers)
{
    EXPECT_EQ(
        GetRefusal("hostname mismatch", "peer.test"),
        HttpClient(MakeSpec("peer.test")).PostAndFail());
}

TEST_F(TlsTest, AcceptsThePinnedKey)
{
    HttpClient client(MakeSpec(identity.GetPin()));
    EXPECT_EQ("pong", client.Post().body);
    EXPECT_EQ("pong", client.Post().body);
}

TEST_F(TlsTest, RefusesAnotherKeyThanThePinnedOne)
{
    const std::string pin = MakeAuthority().GetPin();
    EXPECT_EQ(
        "The TLS key of " + Describe(server, Host) + " is not the pinned one, " + pin + ".",
        HttpClient(MakeSpec(pin)).PostAndFail());
}

TEST_F(TlsTest, RefusesAnotherKeyOnEveryConnection)
{
    const std::string refusal = "The TLS key of " + Describe(server, Host)
                                + " is not the pinned one, " + authority.GetPin() + ".";
    const Ref<ConnectionSpec> spec = MakeSpec(authority.GetPin());
    HttpClient client(spec);
    EXPECT_EQ(refusal, client.PostAndFail());
    EXPECT_EQ(refusal, client.PostAndFail());
    EXPECT_EQ(refusal, HttpClient(spec).PostAndFail());
}

TEST_F(TlsTest, RefusesAnotherKeyWhenTheTls12SessionCouldBeResumed)
{
    SSL_CTX_set_max_proto_version(tls.GetContext(), TLS1_2_VERSION);
    const std::string refusal = "The TLS key of " + Describe(server, Host)
                                + " is not the pinned one, " + authority.GetPin() + ".";
    const Ref<ConnectionSpec> spec = MakeSpec(authority.GetPin());
    EXPECT_EQ(refusal, HttpClient(spec).PostAndFail());
    EXPECT_EQ(refusal, HttpClient(spec).PostAndFail());
}

TEST_F(TlsTest, RefusesAPinnedKeyUnderAnotherName)
{
    EXPECT_EQ(
        GetRefusal("hostname mismatch", "other.test", "other.test"),
        HttpClient(MakeSpec(identity.GetPin(), "other.test")).PostAndFail());
}

TEST_F(TlsTest, RefusesAPinnedKeyWithoutTrust)
{
    const Ref<SSLContext> other = Trust(MakeAuthority());
    EXPECT_EQ(
        GetRefusal("unable to get local issuer certificate", Host),
        HttpClient(MakeSpec(other.get(), Host, identity.GetPin(), server)).PostAndFail());
}

TEST_F(TlsTest, ResumesSessionsBetweenAgentsOfOneSpec)
{
    const Ref<ConnectionSpec> spec = MakeSpec();
    for (int count = 0; count < 4; ++count) {
        EXPECT_EQ("pong", HttpClient(spec).Post().body);
    }
    EXPECT_EQ(4, server.GetConnectionCount());
    EXPECT_EQ(3, CountResumed());
}

// Also if the connection that offered it came to nothing. [RFC 8446 C.4]
TEST_F(TlsTest, OffersATls13TicketOnce)
{
    SSL_CTX_set_num_tickets(tls.GetContext(), 1);
    std::atomic<int> connections{0};
    const TestServer closing(
        AnswerAll(MakeReply("200 OK", "pong")),
        [&connections, streams = tls.GetStreams()](int descriptor) {
            return ++connections == 2 ? nullptr : streams(descriptor);
        });
    const Ref<ConnectionSpec> spec = MakeSpec(context.get(), Host, "", closing);
    EXPECT_EQ("pong", HttpClient(spec).Post().body);
    EXPECT_NE("", HttpClient(spec).PostAndFail());
    EXPECT_EQ("pong", HttpClient(spec).Post().body);
    EXPECT_EQ(2U, tls.GetHandshakes().size());
    EXPECT_EQ(0, CountResumed());
}

TEST_F(TlsTest, ResumesTls12Sessions)
{
    SSL_CTX_set_max_proto_version(tls.GetContext(), TLS1_2_VERSION);
    const Ref<ConnectionSpec> spec = MakeSpec();
    for (int count = 0; count < 4; ++count) {
        EXPECT_EQ("pong", HttpClient(spec).Post().body);
    }
    EXPECT_EQ(3, CountResumed());
}

TEST_F(TlsTest, ResumesSessionsWithThePinnedKey)
{
    const Ref<ConnectionSpec> spec = MakeSpec(identity.GetPin());
    HttpClient(spec).Post();
    HttpClient(spec).Post();
    EXPECT_EQ(1, CountResumed());
}

TEST_F(TlsTest, ResumesNoSessionOfAnotherSpec)
{
    HttpClient(MakeSpec()).Post();
    HttpClient(MakeSpec()).Post();
    HttpClient(MakeSpec(identity.GetPin())).Post();
    HttpClient(MakeSpec("127.0.0.1")).Post();
    const Ref<SSLContext> other = Trust(identity);
    HttpClient(MakeSpec(other.get(), Host, "", server)).Post();
    EXPECT_EQ(0, CountResumed());
    EXPECT_EQ(5U, tls.GetHandshakes().size());
}

TEST_F(TlsTest, SendsOverOneConnectionPerAgent)
{
    HttpClient client(MakeSpec());
    client.Post();
    client.Post();
    client.Post();
    EXPECT_EQ(1, server.GetConnectionCount());
}

TEST_F(TlsTest, RefusesTls11)
{
    // Old versions are only possible at the lowest security level.
    SSL_CTX_set_cipher_list(tls.GetContext(), "DEFAULT:@SECLEVEL=0");
    SSL_CTX_set_min_proto_version(tls.GetContext(), TLS1_VERSION);
    SSL_CTX_set_max_proto_version(tls.GetContext(), TLS1_1_VERSION);
    EXPECT_THAT(
        HttpClient(MakeSpec()).PostAndFail(),
        StartsWith("The TLS handshake with " + Describe(server, Host) + " failed: "));
}

TEST_F(TlsTest, AcceptsTls12)
{
    SSL_CTX_set_max_proto_version(tls.GetContext(), TLS1_2_VERSION);
    EXPECT_EQ("pong", HttpClient(MakeSpec()).Post().body);
}

TEST_F(TlsTest, ReportsAServerWithoutTls)
{
    const TestServer plain([](ServerConnection& connection) {
        connection.Write("HTTP/1.1 400 Bad Request\r\n\r\n");
        connection.WaitForClose();
    });
    EXPECT_THAT(
        HttpClient(MakeSpec(context.get(), Host, "", plain)).PostAndFail(),
        StartsWith("The TLS handshake with " + Describe(plain, Host) + " failed: "));
}

TEST_F(TlsTest, ShowsTheClientCertificate)
{
    CertificateOptions options;
    options.commonName = "Test client";
    const Identity client = MakeIdentity(options, &authority);
    SSL_CTX_set_verify(
        tls.GetContext(),
        SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT,
        [](int, X509_STORE_CTX*) { return 1; });
    SSLContextOptions contextOptions;
    contextOptions.useSystemAuthorities = false;
    contextOptions.authorities.push_back(ToCertificate(authority));
    contextOptions.clientCertificates = {ToCertificate(client), ToCertificate(authority)};
    contextOptions.clientKey = Quillon::Crypto::CreatePrivateKey(client.GetKeyPem());
    const Ref<SSLContext> own = CreateSSLContext(contextOptions);
    EXPECT_EQ("pong", HttpClient(MakeSpec(own.get(), Host, "", server)).Post().body);
    EXPECT_EQ("Test client", tls.GetHandshakes().at(0).clientCommonName);
}

/** The failure of a client that shows `client`, or nothing, to a server that refuses it. */
class ClientCertificateTest : public TlsTest
{
protected:
    std::string GetFailure(const Identity* client, int maxVersion, int verdict)
    {
        static int refusal = 0;
        refusal = verdict;
        SSL_CTX_set_max_proto_version(tls.GetContext(), maxVersion);
        SSL_CTX_set_verify(
            tls.GetContext(),
            SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT,
            [](int, X509_STORE_CTX* store) {
                X509_STORE_CTX_set_error(store, refusal);
                return 0;
            });
        SSLContextOptions options;
        options.useSystemAuthorities = false;
        options.authorities.push_back(ToCertificate(authority));
        if (client != nullptr) {
            options.clientCertificates = {ToCertificate(*client)};
            options.clientKey = Quillon::Crypto::CreatePrivateKey(client->GetKeyPem());
        }
        const Ref<SSLContext> own = CreateSSLContext(options);
        return HttpClient(MakeSpec(own.get(), Host, "", server)).PostAndFail();
    }
};

// [RFC 8446 6.2]
TEST_F(ClientCertificateTest, IsToldFromTheServers)
{
    CertificateOptions clientOptions;
    clientOptions.commonName = "Test client";
    const Identity client = MakeIdentity(clientOptions, &authority);
    const std::string start =
        "The server " + Describe(server, Host) + " refuses the client's TLS certificate: ";
    for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
        EXPECT_EQ(
            start + "certificate expired.",
            GetFailure(&client, version, X509_V_ERR_CERT_HAS_EXPIRED));
        EXPECT_EQ(
            start + "unknown CA.",
            GetFailure(&client, version, X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT_LOCALLY));
        EXPECT_EQ(
            start + "certificate revoked.", GetFailure(&client, version, X509_V_ERR_CERT_REVOKED));
    }
}

TEST_F(ClientCertificateTest, IsMissed)
{
    EXPECT_EQ(
        "The server " + Describe(server, Host)
            + " refuses a client without a TLS certificate: certificate required.",
        GetFailure(nullptr, TLS1_3_VERSION, X509_V_OK));
}

TEST_F(TlsTest, TellsWhyTheServerRefusesTheHandshake)
{
    SSL_CTX_set_min_proto_version(tls.GetContext(), TLS1_2_VERSION);
    SSL_CTX_set_max_proto_version(tls.GetContext(), TLS1_2_VERSION);
    SSL_CTX_set_cipher_list(tls.GetContext(), "aNULL:@SECLEVEL=0");
    EXPECT_EQ(
        "The TLS handshake with " + Describe(server, Host)
            + " failed: the server refuses it: handshake failure.",
        HttpClient(MakeSpec()).PostAndFail());
}

/** Answers with `bytes` over TLS and ends, with or without the notice that TLS has for it. */
TestServer::Handler AnswerAndEnd(const std::string& bytes, bool withNotice)
{
    return [bytes, withNotice](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write(bytes);
        if (!withNotice) {
            connection.GetStream().EndWithoutNotice();
        }
    };
}

TEST_F(TlsTest, ReportsAReplyThatIsCutInItsHead)
{
    const std::string head =
        "HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: 0\r\n\r\n";
    for (std::size_t size = 0; size <= head.size(); ++size) {
        for (const bool withNotice : {true, false}) {
            const TestServer cutting(
                AnswerAndEnd(head.substr(0, size), withNotice), tls.GetStreams());
            HttpClient client(MakeSpec(context.get(), Host, "", cutting));
            EXPECT_EQ(size == head.size(), client.PostAndFail().empty()) << size << withNotice;
        }
    }
}

// Whoever can cut the connection could otherwise choose where the reply ends.
// [RFC 8446 6.1], [RFC 9112 9.8]
TEST_F(TlsTest, RefusesAReplyWithoutLengthThatEndsWithoutNotice)
{
    const std::string reply = "HTTP/1.1 200 OK\r\n\r\nbody";
    const TestServer honest(AnswerAndEnd(reply, true), tls.GetStreams());
    EXPECT_EQ("body", HttpClient(MakeSpec(context.get(), Host, "", honest)).Post().body);
    // Also on a connection that another exchange has opened.
    const TestServer second(
        [&](ServerConnection& connection) {
            connection.ReadRequest();
            connection.Write(MakeReply("200 OK", "pong"));
            connection.ReadRequest();
            connection.Write(reply);
        },
        tls.GetStreams());
    HttpClient client(MakeSpec(context.get(), Host, "", second));
    EXPECT_EQ("pong", client.Post().body);
    EXPECT_EQ("body", client.Post().body);
    const TestServer cut(AnswerAndEnd(reply, false), tls.GetStreams());
    EXPECT_EQ(
        "The reply of " + Describe(cut, Host)
            + " ended too early: the TLS connection ended without notice.",
        HttpClient(MakeSpec(context.get(), Host, "", cut)).PostAndFail());
}

TEST_F(TlsTest, TellsInWordsThatTheServerHasNoTls)
{
    const TestServer plain([](ServerConnection& connection) {
        connection.Write("HTTP/1.1 400 Bad Request\r\n\r\n");
        connection.WaitForClose();
    });
    EXPECT_EQ(
        "The TLS handshake with " + Describe(plain, Host) + " failed: wrong version number.",
        HttpClient(MakeSpec(context.get(), Host, "", plain)).PostAndFail());
}

TEST_F(TlsTest, DoesNotRenegotiate)
{
    SSL_CTX_set_max_proto_version(tls.GetContext(), TLS1_2_VERSION);
    static std::atomic<bool> wasRefused{false};
    SSL_CTX_set_info_callback(tls.GetContext(), [](const SSL*, int where, int result) {
        if ((where & SSL_CB_READ_ALERT) == SSL_CB_READ_ALERT) {
            wasRefused = wasRefused || (result & 0xFF) == SSL_AD_NO_RENEGOTIATION;
        }
    });
    std::promise<void> closed;
    const TestServer asking(
        [&](ServerConnection& connection) {
            connection.ReadRequest();
            connection.GetStream().AskForANewHandshake();
            connection.Write(MakeReply("200 OK", "pong"));
            connection.WaitForClose();
            closed.set_value();
        },
        tls.GetStreams());
    {
        HttpClient client(MakeSpec(context.get(), Host, "", asking));
        const Ref<ClientRequest> request = HttpClient::MakeRequest();
        request->SetTimeout(10'000'000);
        client.PostAndFail(request); // how it ends is the server's affair
    }
    closed.get_future().wait();
    EXPECT_TRUE(wasRefused);
}

/** The failure of an exchange with a server of such a certificate. */
class WeakServerTest : public TlsTest
{
protected:
    std::string GetFailure(const CertificateOptions& options)
    {
        CertificateOptions weak = options;
        weak.alternativeNames = "DNS:sts.test";
        const Identity shown = MakeIdentity(weak, &authority);
        TlsServer weakTls(shown, 0);
        const TestServer other(AnswerAll(MakeReply("200 OK", "pong")), weakTls.GetStreams());
        return HttpClient(MakeSpec(context.get(), Host, "", other)).PostAndFail();
    }
};

TEST_F(WeakServerTest, IsRefused)
{
    CertificateOptions shortKey;
    shortKey.rsaBits = 1024;
    EXPECT_NE("", GetFailure(shortKey));
    CertificateOptions oldDigest;
    oldDigest.digest = EVP_sha1();
    EXPECT_NE("", GetFailure(oldDigest));
    CertificateOptions good;
    good.rsaBits = 2048;
    EXPECT_EQ("", GetFailure(good));
}

class WildcardTest : public TlsTest
{
protected:
    WildcardTest()
        : TlsTest("DNS:*.example.test")
    {}
};

TEST_F(WildcardTest, AcceptsOneLabel)
{
    EXPECT_EQ("pong", HttpClient(MakeSpec("", "sts.example.test")).Post().body);
}

TEST_F(WildcardTest, RefusesTwoLabelsAndNone)
{
    EXPECT_EQ(
        GetRefusal("hostname mismatch", "a.b.example.test", "a.b.example.test"),
        HttpClient(MakeSpec("", "a.b.example.test")).PostAndFail());
    EXPECT_EQ(
        GetRefusal("hostname mismatch", "example.test", "example.test"),
        HttpClient(MakeSpec("", "example.test")).PostAndFail());
}

class PartialWildcardTest : public TlsTest
{
protected:
    PartialWildcardTest()
        : TlsTest("DNS:s*.example.test")
    {}
};

// [RFC 9525 6.3]: a wildcard is a whole label.
TEST_F(PartialWildcardTest, IsNoName)
{
    EXPECT_EQ(
        GetRefusal("hostname mismatch", "sts.example.test", "sts.example.test"),
        HttpClient(MakeSpec("", "sts.example.test")).PostAndFail());
}

TEST_F(TlsTest, RefusesMalformedPins)
{
    const std::string notDigest = "\" is not the Base64 of a SHA-256 digest.";
    for (const std::string pin :
         {"sha256//",
          "sha256//AAAA",
          "sha256//AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA=",
          "sha256//AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA= "}) {
        EXPECT_EQ("Invalid argument : The pinned key \"" + pin + notDigest, GetArgumentError([&] {
                      MakeSpec(pin);
                  }));
    }
    for (const std::string pin :
         {"sha256//*",
          "sha256//AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA",
          "sha256//AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA=;sha256//AAAA"}) {
        EXPECT_THAT(
            GetArgumentError([&] { MakeSpec(pin); }),
            StartsWith("Invalid argument : The pinned key \"" + pin + "\" is not Base64: "));
    }
}

TEST_F(TlsTest, RefusesMalformedPeerNames)
{
    for (const std::string name :
         {".sts.test",
          "*.test",
          "sts.test.",
          "sha1//AAAA",
          "SHA256//AAAA",
          "a b",
          "sts.test:443"}) {
        EXPECT_EQ(
            "Invalid argument : \"" + name + "\" is not a host name or IP address.",
            GetArgumentError([&] { MakeSpec(name); }));
    }
}

TEST_F(TlsTest, RefusesSpecsWithoutTheirParts)
{
    const Ref<ConnectionSpec> plain = MakeTcpSpec(server);
    const Ref<ConnectionSpec> secure = MakeSpec();
    Ref<ConnectionSpec> out;
    EXPECT_EQ("Invalid argument : There is no SSL context.", GetArgumentError([&] {
                  CreateSSLConnectionSpec(plain.get(), nullptr, Host, "", out);
              }));
    EXPECT_EQ("Invalid argument : There is no TCP connection spec.", GetArgumentError([&] {
                  CreateSSLConnectionSpec(nullptr, context.get(), Host, "", out);
              }));
    EXPECT_EQ(
        "Invalid argument : The connection spec for TCP is one for TLS.", GetArgumentError([&] {
            CreateSSLConnectionSpec(secure.get(), context.get(), Host, "", out);
        }));
}

// Where the system has no such file, trusting it would fail.
TEST(LoadSSLContext, DoesNotOpenTheSystemsAuthorities)
{
    const int watch = ::inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
    ASSERT_GE(watch, 0);
    ::inotify_add_watch(watch, X509_get_default_cert_file(), IN_OPEN);
    Quillon::Ssl::LoadSSLContext(TEST_DATA_DIR "/keys/sts-cert.pem");
    std::array<char, 4096> events{};
    EXPECT_EQ(-1, ::read(watch, events.data(), events.size()));
    ::close(watch);
}

TEST(CreateSSLContext, RefusesToTrustNobody)
{
    SSLContextOptions options;
    options.useSystemAuthorities = false;
    EXPECT_EQ(
        "Invalid argument : There is no trusted certificate authority.",
        GetArgumentError([&] { CreateSSLContext(options); }));
}

TEST(CreateSSLContext, RefusesHalfAClientIdentity)
{
    const Identity authority = MakeAuthority();
    SSLContextOptions options;
    options.clientCertificates.push_back(ToCertificate(authority));
    EXPECT_EQ(
        "Invalid argument : There is a client certificate, but no client key.",
        GetArgumentError([&] { CreateSSLContext(options); }));
    options.clientCertificates.clear();
    options.clientKey = Quillon::Crypto::CreatePrivateKey(authority.GetKeyPem());
    EXPECT_EQ(
        "Invalid argument : There is a client key, but no client certificate.",
        GetArgumentError([&] { CreateSSLContext(options); }));
}

TEST(CreateSSLContext, RefusesAKeyOfAnotherCertificate)
{
    const Identity authority = MakeAuthority();
    const Identity other = MakeAuthority();
    SSLContextOptions options;
    options.clientCertificates.push_back(ToCertificate(authority));
    options.clientKey = Quillon::Crypto::CreatePrivateKey(other.GetKeyPem());
    try {
        CreateSSLContext(options);
        FAIL() << "accepted";
    } catch (const Quillon::Crypto::CryptoException& error) {
        EXPECT_EQ(
            "The client key does not belong to the client certificate of "
                + options.clientCertificates.front()->GetSubjectName() + ": key values mismatch",
            std::string(error.what()));
    }
}

} // namespace
