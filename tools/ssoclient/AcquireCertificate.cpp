#include "Commands.h"
#include "IdentityOptions.h"
#include "ServiceOptions.h"
#include "TokenOutput.h"
#include "TokenSpecOptions.h"

#include <memory>

namespace {

struct AcquireCertificateOptions
{
    ServiceOptions service;
    IdentityOptions identity;
    TokenSpecOptions token;
    OutputOptions output;
};

ExitCode AcquireCertificate(const AcquireCertificateOptions& options)
{
    const auto service = options.service.CreateService(
        ReadCertificates(options.service.trustFiles), options.identity.Read());
    TokenOutput output(options.output);
    output.Show(service->AcquireTokenByCertificate(options.token.spec));
    return ExitCode::DONE;
}

} // namespace

void AddAcquireCertificateCommand(const Command& parent, Action& action)
{
    const Command command = parent.AddCommand(
        "certificate", "Acquire a holder-of-key token with one's own key and certificate");
    const auto options = std::make_shared<AcquireCertificateOptions>();
    options->service.AddTo(command);
    options->identity.AddRequiredTo(command);
    options->token.AddTo(command);
    options->output.AddOutTo(command);
    options->output.AddJsonTo(command);
    command.WhenNamed(
        [options, &action] { action = [options] { return AcquireCertificate(*options); }; });
}
