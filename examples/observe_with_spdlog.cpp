// Usage: observe_with_spdlog URL CA_PEM STS_PEM USER, with the password on standard input
//
// Writes what an operation does as lines of spdlog, and has the library's own log lines go there.
#include "quillon/service/Logger.h"
#include "ssoClient/CallOptions.h"
#include "ssoClient/Descriptions.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <spdlog/sinks/stdout_sinks.h>
#include <spdlog/spdlog.h>

#include <algorithm>
#include <iostream>
#include <string>

// What the library's sink is given is on one line already; texts of the service in events are not.
static std::string OnOneLine(std::string text)
{
    constexpr std::size_t MaxBytes = 200;
    text.resize(std::min(text.size(), MaxBytes));
    for (char& octet : text) {
        octet = octet >= ' ' && octet <= '~' ? octet : '?';
    }
    return text;
}

// spdlog keeps its own exceptions back, so that nothing leaves these functions.
class Lines final : public SsoClient::OperationObserver
{
public:
    void OnBegin(const SsoClient::ObservedOperation& operation) noexcept override
    {
        spdlog::info("{} {} begins", operation.id, operation.name);
    }
    void OnExchange(
        const SsoClient::ObservedOperation& operation,
        const Quillon::Http::ExchangeFacts& facts) noexcept override
    {
        spdlog::info(
            "{} {}: HTTP status {} after {} us, {} octets sent, {} received, {}, {} connection",
            operation.id,
            OnOneLine(facts.server),
            facts.status,
            facts.times.end,
            facts.sentOctets,
            facts.receivedOctets,
            facts.tlsVersion,
            facts.isConnectionReused ? "kept" : "new");
    }
    void OnFault(
        const SsoClient::ObservedOperation& operation,
        const SsoClient::SoapFault& fault) noexcept override
    {
        const std::string text = fault.texts.empty() ? "" : fault.texts.front().text;
        spdlog::warn("{} fault {}: {}", operation.id, OnOneLine(fault.code.text), OnOneLine(text));
    }
    void OnEnd(
        const SsoClient::ObservedOperation& operation,
        const SsoClient::OperationOutcome& outcome) noexcept override
    {
        if (outcome.succeeded) {
            spdlog::info("{} done after {} us", operation.id, outcome.durationMicroseconds);
        } else {
            spdlog::error("{} failed: {}", operation.id, outcome.exceptionClass);
        }
    }
};

static void WriteToSpdlog(const std::string& logger, int level, const std::string& text)
{
    const bool isWarning = level <= Quillon::Service::LOG_LEVEL_WARNING;
    spdlog::log(isWarning ? spdlog::level::warn : spdlog::level::debug, "{}: {}", logger, text);
}

int main(int argc, char** argv)
try {
    if (argc != 5) {
        return 2;
    }
    spdlog::set_default_logger(spdlog::stderr_logger_mt("sso"));
    Quillon::Service::GetApp()->GetLogFacility().SetSink(WriteToSpdlog);
    const auto sslContext = Quillon::Ssl::LoadSSLContext(argv[2]); // who vouches for servers
    SsoClient::SecurityTokenServiceConfig config;
    config.url = argv[1];
    config.trustedCertificates = Quillon::Crypto::LoadPemCertificates(argv[3]); // who signs
    config.sslContext = sslContext.get();
    std::string password;
    std::getline(std::cin, password);

    SsoClient::CallOptions calls;
    calls.observer = boost::make_shared<Lines>();
    const auto service = WithOptions(CreateSecurityTokenService(config), calls);
    const auto token = service->AcquireToken(argv[4], password, {});
    std::cout << (token ? CreateRedactedDescription(*token) : "no token") << "\n";
    return token ? 0 : 1;
} catch (const std::exception& error) {
    std::cerr << Quillon::GetClassName(error) << ": " << error.what() << "\n";
    return 1;
}
