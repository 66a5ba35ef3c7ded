#include "Commands.h"
#include "Reachability.h"
#include "ServiceOptions.h"
#include "examinations.h"

#include "quillon/system/Clock.h"
#include "ssoClient/Exceptions.h"

#include <algorithm>
#include <iterator>
#include <memory>

namespace {

using Quillon::Http::ExchangeFacts;
using Quillon::System::GetUtcDateTime;

// No service has them. The user's own are never asked for: this command is run when something is
// wrong with the service.
constexpr char MadeUpUser[] = "ssoclient-doctor-made-this-up@example.invalid";
constexpr char MadeUpPassword[] = "made up by ssoclient doctor";

constexpr int ConnectTimeoutMs = 10'000;

/** What a request with made-up credentials came to. */
struct DryRun
{
    std::optional<ExchangeFacts> exchange;
    std::exception_ptr failure;
    bool isHttps = false;
};

DryRun Try(const ServiceOptions& options, const Invocation& invocation)
{
    const auto service = options.CreateService(ReadCertificates(options.trustFiles));
    DryRun run;
    try {
        options.Await(invocation.presentation, [&] {
            return service->AcquireToken(MadeUpUser, MadeUpPassword, SsoClient::TokenSpec());
        });
    } catch (const Quillon::Exception&) {
        run.failure = std::current_exception();
    }
    run.exchange = invocation.exchanges.GetLatest();
    run.isHttps = options.RequireServer().isHttps;
    return run;
}

void Append(std::vector<Finding>& findings, std::vector<Finding> more)
{
    std::move(more.begin(), more.end(), std::back_inserter(findings));
}

/** @param failure  what the request ended with; null if it was granted. */
void Judge(const DryRun& run, const std::exception* failure, std::vector<Finding>& findings)
{
    if (run.exchange && run.isHttps) {
        Append(findings, ExamineTls(*run.exchange, failure, GetUtcDateTime()));
        if (FailedInTls(*run.exchange)) {
            return; // that is told
        }
    }
    if (run.exchange && run.exchange->status != 0) {
        findings.push_back(ExamineClock(*run.exchange, GetUtcDateTime()));
    }
    findings.push_back(ExamineAnswer(run.exchange, failure));
}

void ExamineService(
    const ServiceOptions& options, const Invocation& invocation, std::vector<Finding>& findings)
{
    const DryRun run = Try(options, invocation);
    if (!run.failure) {
        Judge(run, nullptr, findings);
        return;
    }
    try {
        std::rethrow_exception(run.failure);
    } catch (const std::exception& failure) {
        Judge(run, &failure, findings);
    }
}

bool CanConnect(const std::vector<Finding>& findings)
{
    return std::any_of(findings.begin(), findings.end(), [](const Finding& finding) {
        return finding.part == "tcp" && finding.health == Health::GOOD;
    });
}

ExitCode Examine(const ServiceOptions& options, const Invocation& invocation)
{
    const Server server = options.RequireServer();
    std::vector<Finding> findings =
        ExamineTrust(ReadCertificates(options.trustFiles), GetUtcDateTime());
    Append(findings, ExamineReachability(server.host, server.port, ConnectTimeoutMs));
    if (!server.isHttps) {
        findings.push_back(
            {Health::NOTE, "tls", "http: everything goes in the clear", "use an https: URL"});
    }
    if (CanConnect(findings)) {
        ExamineService(options, invocation, findings);
    }
    ShowFindings(findings, invocation.presentation);
    const bool isBad = std::any_of(findings.begin(), findings.end(), [](const Finding& finding) {
        return finding.health == Health::BAD;
    });
    return isBad ? ExitCode::REFUSED : ExitCode::DONE;
}

} // namespace

void AddDoctorCommand(const Command& parent, Invocation& invocation)
{
    const Command command = parent.AddCommand(
        "doctor", "Examine a token service, from the name to an answer, without credentials");
    const auto options = std::make_shared<ServiceOptions>();
    options->AddTo(command, invocation.exchanges, ServiceOptions::Trust::OPTIONAL);
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient doctor --url https://sts.example.com/sts --trust sts.pem");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] { return Examine(*options, invocation); };
    });
}
