#include "ServiceOptions.h"

#include "Arguments.h"
#include "ExitCode.h"

#include "quillon/MessageFormatter.h"
#include "quillon/http/HttpURL.h"
#include "quillon/service/Logger.h"

namespace {

/**
 * With authorities of its own the connection trusts those alone, otherwise the system's; a plain
 * `http` connection needs neither.
 */
Quillon::Ref<Quillon::Ssl::SSLContext> CreateContext(const ServiceOptions& service)
{
    bool isHttps = false;
    std::string host;
    int port = 0;
    std::string path;
    Quillon::Http::ParseHttpURL(service.url, isHttps, host, port, path);
    if (!isHttps) {
        return {};
    }
    Quillon::Ssl::SSLContextOptions options;
    options.useSystemAuthorities = service.authorityFiles.empty();
    options.authorities = ReadCertificates(service.authorityFiles);
    try {
        return Quillon::Ssl::CreateSSLContext(options);
    } catch (const Quillon::Crypto::CryptoException& error) {
        throw UsageError(Quillon::MessageFormatter::ASPrint("cannot set up TLS: %1", error.what()));
    }
}

/** The library's logger writes to standard error unless it is given another sink. */
void EnableTraceLines()
{
    Quillon::Service::GetApp()
        ->GetLogFacility()
        .GetLogger("SsoClient")
        ->SetLevel(Quillon::Service::LOG_LEVEL_TRACE);
}

} // namespace

void ServiceOptions::AddTo(const Command& command)
{
    command.AddOption("--url", url, "The token service, https://HOST[:PORT]/PATH")
        .Required()
        .ValueName("URL");
    AddTrustTo(command, trustFiles);
    command
        .AddOption(
            "--ca",
            authorityFiles,
            "PEM files with the authorities to trust for TLS (default: the system's)")
        .Check(CheckNotEmpty)
        .ValueName("PEM");
    command
        .AddOption(
            "--peer",
            peer,
            "What the TLS server must prove: another host name, or sha256//BASE64 of its public "
            "key (default: the host name of the URL)")
        .Check(CheckNotEmpty)
        .ValueName("TEXT");
    command.AddFlag("--verbose", verbose, "Write the library's trace lines to standard error");
}

boost::shared_ptr<SsoClient::SecurityTokenService> ServiceOptions::CreateService(
    const CertificateList& trusted,
    const boost::optional<SsoClient::HolderOfKeyConfig>& identity) const
{
    if (verbose) {
        EnableTraceLines();
    }
    // The service keeps the context by reference, so it may go when this returns.
    const Quillon::Ref<Quillon::Ssl::SSLContext> context = CreateContext(*this);

    SsoClient::SecurityTokenServiceConfig config;
    config.url = url;
    config.trustedCertificates = trusted;
    config.sslPeerParameter = peer;
    config.holderOfKeyConfig = identity;
    config.sslContext = context.get();
    return SsoClient::CreateSecurityTokenService(config);
}
