#include "ServiceOptions.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "Profile.h"

#include "quillon/MessageFormatter.h"
#include "quillon/StringUtil.h"
#include "quillon/http/HttpURL.h"
#include "quillon/service/Logger.h"

#include <arpa/inet.h>
#include <netinet/in.h>

#include <algorithm>

namespace {

constexpr long long MicrosecondsPerSecond = 1'000'000;
constexpr long long MaxTimeoutSec = 86'400;

/** Who does not answer by then is not there, or cannot be reached. */
constexpr long long MaxConnectSec = 10;

Server ParseServer(const std::string& url)
{
    Server server;
    std::string path;
    Quillon::Http::ParseHttpURL(url, server.isHttps, server.host, server.port, path);
    return server;
}

/** Whether what is sent to `host` does not leave the machine [RFC 6761 6.3, RFC 1122 3.2.1.3]. */
bool IsLoopback(const std::string& host)
{
    in_addr v4 = {};
    in6_addr v6 = {};
    return Quillon::StringUtil::ToLower(host) == "localhost"
           || (::inet_pton(AF_INET, host.c_str(), &v4) == 1 && (ntohl(v4.s_addr) >> 24) == 127)
           || (::inet_pton(AF_INET6, host.c_str(), &v6) == 1 && IN6_IS_ADDR_LOOPBACK(&v6));
}

/** Passwords and tokens go through `http` in the clear. */
void RequireSecureOrWanted(const Server& server, bool insecureHttp)
{
    if (!server.isHttps && !insecureHttp && !IsLoopback(server.host)) {
        throw UsageError("--url: http: would send everything in the clear; use https:, or say "
                         "--insecure-http");
    }
}

/**
 * With authorities of its own the connection trusts those alone, otherwise the system's; a plain
 * `http` connection needs neither.
 */
Quillon::Ref<Quillon::Ssl::SSLContext> CreateContext(const ServiceOptions& service)
{
    if (!service.RequireServer().isHttps) {
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

/** The library's loggers write to standard error unless they are given another sink. */
void EnableTraceLines()
{
    Quillon::Service::LogFacility& loggers = Quillon::Service::GetApp()->GetLogFacility();
    for (const char* const name : {"SsoClient", "SsoClient.Exchange"}) {
        loggers.GetLogger(name)->SetLevel(Quillon::Service::LOG_LEVEL_TRACE);
    }
}

void AddPeerTo(const Command& command, ServiceOptions& options)
{
    command
        .AddOption(
            "--ca",
            options.authorityFiles,
            "PEM files with the authorities to trust for TLS (default: the system's)")
        .Check(CheckNotEmpty)
        .ValueName("PEM");
    command
        .AddOption(
            "--peer",
            options.peer,
            "What the TLS server must prove: another host name, or sha256//BASE64 of its public "
            "key (default: the host name of the URL)")
        .Check(CheckNotEmpty)
        .ValueName("TEXT");
}

} // namespace

void ServiceOptions::AddTo(const Command& owner, ExchangeRecord& record, Trust trust)
{
    _record = &record;
    const Command command = owner.InGroup("The service");
    command.AddOption("--url", url, "The token service, https://HOST[:PORT]/PATH")
        .Required()
        .ValueName("URL");
    AddProfileTo(command);
    const Option trustOption = AddTrustTo(command, trustFiles);
    if (trust == Trust::REQUIRED) {
        trustOption.Required();
    }
    AddPeerTo(command, *this);
    command.AddFlag(
        "--insecure-http", insecureHttp, "Let an http: URL lead to another machine, in the clear");
    command
        .AddOption(
            "--timeout",
            timeoutSec,
            "Limit of each exchange with the service in seconds; connecting has at most 10 of them")
        .Between(1, MaxTimeoutSec)
        .ValueName("SEC")
        .ShowDefault();
    command.AddFlag(
        "--verbose",
        verbose,
        "Write what the library does, and what is exchanged with the service, to standard error");
    dialect.AddTo(owner);
}

boost::shared_ptr<SsoClient::SecurityTokenService> ServiceOptions::CreateService(
    const CertificateList& trusted,
    const boost::optional<SsoClient::HolderOfKeyConfig>& identity,
    const boost::optional<SsoClient::PasswordCredentials>& credentials) const
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
    config.dialect = dialect.Make();
    config.credentials = credentials;
    config.sslContext = context.get();
    return SsoClient::CreateSecurityTokenService(config, GetExchangeOptions());
}

SsoClient::ExchangeOptions ServiceOptions::GetExchangeOptions() const
{
    SsoClient::ExchangeOptions options;
    options.timeoutMicroseconds = timeoutSec * MicrosecondsPerSecond;
    options.connectTimeoutMicroseconds =
        std::min(timeoutSec, MaxConnectSec) * MicrosecondsPerSecond;
    if (_record != nullptr) {
        options.observer = [record = _record](const Quillon::Http::ExchangeFacts& facts) {
            record->Note(facts);
        };
    }
    return options;
}

Server ServiceOptions::RequireServer() const
{
    Server server = ParseServer(url);
    RequireSecureOrWanted(server, insecureHttp);
    return server;
}

std::string ServiceOptions::GetServer() const
{
    const Server server = ParseServer(url);
    const bool isV6 = server.host.find(':') != std::string::npos;
    return Quillon::MessageFormatter::ASPrint(
        "%1://%2:%3",
        server.isHttps ? "https" : "http",
        isV6 ? "[" + server.host + "]" : server.host,
        server.port);
}
