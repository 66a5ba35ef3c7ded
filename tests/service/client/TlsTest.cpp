#include "Harness.h"

#include "support/Failure.h"
#include "support/TestTls.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::StartsWith;

namespace {

class TlsPeerOfSts : public HttpsStsTest
{
protected:
    std::string GetFailureToAcquire() const
    {
        return GetFailure([this] {
            MakeBearerService()->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
        });
    }

    std::string DescribeRefusal(const std::string& reason, const std::string& name) const
    {
        return "HttpException: The TLS certificate of " + DescribeServer() + " is refused: "
               + reason + ". It must name \"" + name + "\" and lead to a trusted authority.";
    }

    void Trust(const std::string& authorityPem)
    {
        Quillon::Ssl::SSLContextOptions options;
        options.useSystemAuthorities = false;
        options.authorities = Quillon::Crypto::ParsePemCertificates(authorityPem);
        sslContext = CreateSSLContext(options);
        config.sslContext = sslContext.get();
    }

    /** The pin of the key that the server shows. */
    std::string FetchPin() const
    {
        const std::string url = server.Url();
        const std::string start = "https://";
        const std::string address = url.substr(start.size(), url.rfind('/') - start.size());
        const Testing::SslContextHandle context(SSL_CTX_new(TLS_client_method()));
        const std::unique_ptr<BIO, Testing::HandleDeleter<BIO_free_all>> connection(
            BIO_new_ssl_connect(context.get()));
        BIO_set_conn_hostname(connection.get(), address.c_str());
        SSL* ssl = nullptr;
        if (BIO_do_handshake(connection.get()) != 1 || BIO_get_ssl(connection.get(), &ssl) != 1) {
            throw std::runtime_error("no TLS connection to the server");
        }
        Testing::Identity shown;
        shown.key.reset(X509_get_pubkey(SSL_get0_peer_certificate(ssl)));
        return shown.GetPin();
    }
};

} // namespace

TEST_F(TlsPeerOfSts, RefusesAuthorityThatIsNotTrusted)
{
    const StateDir other;
    const DevSts::Server sameNames(MakeServerOptions(other, false));
    Trust(other.Read("ca.pem"));
    EXPECT_EQ(
        GetFailureToAcquire(),
        DescribeRefusal("unable to get local issuer certificate", "127.0.0.1"));
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(TlsPeerOfSts, AcceptsOtherNameOfTheCertificate)
{
    config.sslPeerParameter = "localhost";
    EXPECT_EQ(GetFailureToAcquire(), "none");
}

TEST_F(TlsPeerOfSts, RefusesNameThatTheCertificateDoesNotHave)
{
    config.sslPeerParameter = "sts.example.test";
    EXPECT_EQ(GetFailureToAcquire(), DescribeRefusal("hostname mismatch", "sts.example.test"));
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(TlsPeerOfSts, RefusesAddressThatTheCertificateDoesNotHave)
{
    config.sslPeerParameter = "127.0.0.2";
    EXPECT_EQ(GetFailureToAcquire(), DescribeRefusal("IP address mismatch", "127.0.0.2"));
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(TlsPeerOfSts, AcceptsPinnedKey)
{
    config.sslPeerParameter = FetchPin();
    EXPECT_EQ(GetFailureToAcquire(), "none");
}

TEST_F(TlsPeerOfSts, RefusesKeyThatIsNotPinned)
{
    const std::string pin = "sha256//" + std::string(43, 'A') + "=";
    config.sslPeerParameter = pin;
    EXPECT_EQ(
        GetFailureToAcquire(),
        "HttpException: The TLS key of " + DescribeServer() + " is not the pinned one, " + pin
            + ".");
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(TlsPeerOfSts, StillVerifiesTheAuthorityOfPinnedKey)
{
    config.sslPeerParameter = FetchPin();
    const StateDir other;
    const DevSts::Server sameNames(MakeServerOptions(other, false));
    Trust(other.Read("ca.pem"));
    EXPECT_EQ(
        GetFailureToAcquire(),
        DescribeRefusal("unable to get local issuer certificate", "127.0.0.1"));
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(TlsPeerOfSts, RefusesPlainServerBehindHttpsUrl)
{
    DevSts::Server plain(MakeServerOptions(state, true));
    plain.Start();
    config.url = Replaced(plain.Url(), "http:", "https:");
    EXPECT_THAT(
        GetFailureToAcquire(), StartsWith("HttpException: The TLS handshake with 127.0.0.1"));
    EXPECT_TRUE(plain.ReceivedRequests().empty());
}
