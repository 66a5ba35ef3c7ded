// Usage: observe_with_prometheus URL CA_PEM STS_PEM USER, with the password on standard input
//
// Counts with prometheus-cpp what operations, exchanges, refreshes and caches do, and prints the
// metrics as a scraper would get them. A server would give the registry to a prometheus::Exposer.
#include "ssoClient/CallOptions.h"
#include "ssoClientRuntime/TokenSource.h"
#include "ssoClientRuntime/TokenVerifier.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <prometheus/counter.h>
#include <prometheus/histogram.h>
#include <prometheus/registry.h>
#include <prometheus/text_serializer.h>

#include <iostream>
#include <string>

// The labels are names of this library's own: what a service sends, such as the code of a fault,
// would let it make as many time series as it likes. An observer must not throw, and ends the
// process if there is no memory for a new series.
class Metrics final : public SsoClient::OperationObserver
{
public:
    explicit Metrics(prometheus::Registry& registry)
        : _operations(prometheus::BuildCounter()
                          .Name("sso_operations_total")
                          .Help("Operations that have ended, by the class of failure.")
                          .Register(registry))
        , _faults(prometheus::BuildCounter()
                      .Name("sso_faults_total")
                      .Help("Faults that the token service has answered with.")
                      .Register(registry))
        , _exchanges(prometheus::BuildHistogram()
                         .Name("sso_exchange_seconds")
                         .Help("How long exchanges with the token service took.")
                         .Register(registry))
        , _refreshes(prometheus::BuildCounter()
                         .Name("sso_refreshes_total")
                         .Help("Attempts to have another token, by the class of failure.")
                         .Register(registry))
        , _lookUps(prometheus::BuildCounter()
                       .Name("sso_cache_look_ups_total")
                       .Help("What caches were asked for.")
                       .Register(registry))
    {}

    void OnEnd(
        const SsoClient::ObservedOperation& operation,
        const SsoClient::OperationOutcome& outcome) noexcept override
    {
        _operations.Add({{"operation", operation.name}, {"failure", outcome.exceptionClass}})
            .Increment();
    }
    void OnFault(
        const SsoClient::ObservedOperation& operation,
        const SsoClient::SoapFault& /*fault*/) noexcept override
    {
        _faults.Add({{"operation", operation.name}}).Increment();
    }
    void OnExchange(
        const SsoClient::ObservedOperation& operation,
        const Quillon::Http::ExchangeFacts& facts) noexcept override
    {
        static const prometheus::Histogram::BucketBoundaries Seconds{
            0.01, 0.03, 0.1, 0.3, 1, 3, 10};
        const char* const connection = facts.isConnectionReused ? "kept" : "new";
        _exchanges.Add({{"operation", operation.name}, {"connection", connection}}, Seconds)
            .Observe(static_cast<double>(facts.times.end) / 1e6);
    }
    void OnRefreshEnd(
        const SsoClient::ObservedRefresh& refresh,
        const SsoClient::OperationOutcome& outcome) noexcept override
    {
        const char* const how = refresh.isRenewal ? "renewal" : "acquisition";
        _refreshes.Add({{"how", how}, {"failure", outcome.exceptionClass}}).Increment();
    }
    void OnCacheHit(const SsoClient::ObservedCache& cache) noexcept override
    {
        _lookUps.Add({{"cache", cache.name}, {"outcome", "hit"}}).Increment();
    }
    void OnCacheMiss(const SsoClient::ObservedCache& cache) noexcept override
    {
        _lookUps.Add({{"cache", cache.name}, {"outcome", "miss"}}).Increment();
    }

private:
    prometheus::Family<prometheus::Counter>& _operations;
    prometheus::Family<prometheus::Counter>& _faults;
    prometheus::Family<prometheus::Histogram>& _exchanges;
    prometheus::Family<prometheus::Counter>& _refreshes;
    prometheus::Family<prometheus::Counter>& _lookUps;
};

static void UseService(char** argv, const boost::shared_ptr<Metrics>& metrics)
{
    const auto sslContext = Quillon::Ssl::LoadSSLContext(argv[2]); // who vouches for servers
    SsoClient::SecurityTokenServiceConfig config;
    config.url = argv[1];
    config.trustedCertificates = Quillon::Crypto::LoadPemCertificates(argv[3]); // who signs
    config.sslContext = sslContext.get();
    std::string password;
    std::getline(std::cin, password);

    SsoClient::CallOptions calls;
    calls.observer = metrics;
    SsoClient::TokenSourceOptions source;
    source.operationObserver = metrics;
    SsoClient::TokenVerifierOptions verifying;
    verifying.observer = metrics;
    const auto tokens = CreatePasswordTokenSource(
        WithOptions(CreateSecurityTokenService(config), calls),
        [&] { return SsoClient::PasswordCredentials(argv[4], password); },
        {},
        source);
    const auto verifier = CreateTokenVerifier(config.trustedCertificates, verifying);
    const auto token = tokens->GetToken();
    verifier->Verify(token->ToXml()); // as those do who are shown it, again and again
    verifier->Verify(token->ToXml());
}

int main(int argc, char** argv)
try {
    if (argc != 5) {
        return 2;
    }
    prometheus::Registry registry;
    int exitCode = 0;
    try {
        UseService(argv, boost::make_shared<Metrics>(registry));
    } catch (const Quillon::Exception& error) {
        std::cerr << Quillon::GetClassName(error) << ": " << error.what() << "\n";
        exitCode = 1;
    }
    std::cout << prometheus::TextSerializer().Serialize(registry.Collect());
    return exitCode;
} catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
}
