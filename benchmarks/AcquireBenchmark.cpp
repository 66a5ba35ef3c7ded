#include "AcquireBenchmark.h"

#include "TestData.h"
#include "support/TestTls.h"

#include "ssoClient/CallOptions.h"
#include "ssoClient/CreateSamlToken.h"

#include <benchmark/benchmark.h>

namespace Benchmarks {

namespace {

using Certificates = std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>;

std::string MakeBody(const std::string& assertion)
{
    return "<S:Envelope xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\"><S:Body>"
           "<RequestSecurityTokenResponseCollection "
           "xmlns=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\">"
           "<RequestSecurityTokenResponse><RequestedSecurityToken>"
           + assertion
           + "</RequestedSecurityToken></RequestSecurityTokenResponse>"
             "</RequestSecurityTokenResponseCollection></S:Body></S:Envelope>";
}

/** A service that always issues the same token. */
struct Service
{
    const std::string assertion = ReadFile("tokens/accepted/bearer-4k.xml");
    const Certificates trusted =
        Quillon::Crypto::ParsePemCertificates(ReadFile("keys/sts-cert.pem"));
    const std::string reply = Testing::MakeReply("200 OK", MakeBody(assertion));
    const Testing::Identity identity =
        Testing::MakeIdentity({"benchmark", "DNS:localhost,IP:127.0.0.1"});
    Testing::TlsServer tls{identity};
    const Testing::TestServer server{Testing::AnswerAll(reply), tls.GetStreams()};
};

Service& GetService()
{
    static Service service;
    return service;
}

Quillon::Ref<Quillon::Ssl::SSLContext> MakeContext(const Testing::Identity& identity)
{
    const std::vector<unsigned char> der = identity.GetDer();
    Quillon::Ssl::SSLContextOptions options;
    options.useSystemAuthorities = false;
    options.authorities.push_back(Quillon::Crypto::CreateCertificate(der.data(), der.size()));
    return Quillon::Ssl::CreateSSLContext(options);
}

boost::shared_ptr<SsoClient::SecurityTokenService> MakeClient()
{
    static const auto context = MakeContext(GetService().identity);
    SsoClient::SecurityTokenServiceConfig config;
    config.url = "https://127.0.0.1:" + std::to_string(GetService().server.GetPort()) + "/sts";
    config.trustedCertificates = GetService().trusted;
    config.sslContext = context.get();
    SsoClient::CallOptions options;
    options.connectionReuse = SsoClient::ConnectionReuse();
    return SsoClient::WithOptions(SsoClient::CreateSecurityTokenService(config), options);
}

/** A connection that nothing is read from but as many octets as a reply has. */
class RawConnection
{
public:
    RawConnection()
    {
        const std::string target = "127.0.0.1:" + std::to_string(GetService().server.GetPort());
        BIO_set_conn_hostname(_bio.get(), target.c_str());
        if (BIO_do_connect(_bio.get()) != 1 || BIO_do_handshake(_bio.get()) != 1) {
            throw std::runtime_error("The raw connection fails");
        }
    }

    void Post(const std::string& request)
    {
        BIO_write(_bio.get(), request.data(), static_cast<int>(request.size()));
        std::size_t left = GetService().reply.size();
        char buffer[16384];
        while (left > 0) {
            const int count = BIO_read(_bio.get(), buffer, sizeof buffer);
            if (count <= 0) {
                throw std::runtime_error("The raw connection ended");
            }
            left -= static_cast<std::size_t>(count);
        }
    }

private:
    Testing::SslContextHandle _context{SSL_CTX_new(TLS_client_method())};
    std::unique_ptr<BIO, Testing::HandleDeleter<BIO_free_all>> _bio{
        BIO_new_ssl_connect(_context.get())};
};

void MeasureFloor(benchmark::State& state)
{
    RawConnection connection;
    const std::string body(1500, ' '); // about what a request has
    const std::string request = "POST /sts HTTP/1.1\r\nHost: 127.0.0.1\r\nContent-Length: "
                                + std::to_string(body.size()) + "\r\n\r\n" + body;
    for (auto _ : state) {
        connection.Post(request);
        benchmark::DoNotOptimize(
            SsoClient::CreateSamlToken(GetService().assertion, GetService().trusted));
    }
}

void MeasureOwn(benchmark::State& state)
{
    const auto client = MakeClient();
    SsoClient::TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    for (auto _ : state) {
        benchmark::DoNotOptimize(client->AcquireToken("user", "password", spec));
    }
}

} // namespace

void RegisterAcquireBenchmarks()
{
    benchmark::RegisterBenchmark("Floor/AcquireOverKeptConnection", MeasureFloor)->UseRealTime();
    benchmark::RegisterBenchmark("Own/AcquireOverKeptConnection", MeasureOwn)->UseRealTime();
}

} // namespace Benchmarks
