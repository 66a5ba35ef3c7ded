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

ExitCode AcquireCertificate(
    const AcquireCertificateOptions& options, const Presentation& presentation)
{
    const auto service = options.service.CreateService(
        ReadCertificates(options.service.trustFiles), options.identity.Read());
    TokenOutput output(options.output, presentation);
    output.Show(options.service.Await(
        presentation, [&] { return service->AcquireTokenByCertificate(options.token.spec); }));
    return ExitCode::DONE;
}

} // namespace

void AddAcquireCertificateCommand(const Command& parent, Invocation& invocation)
{
    const Command command = parent.AddCommand(
        "certificate", "Acquire a holder-of-key token with one's own key and certificate");
    const auto options = std::make_shared<AcquireCertificateOptions>();
    options->service.AddTo(command, invocation.exchanges);
    options->identity.AddRequiredTo(command);
    options->token.AddTo(command);
    options->output.AddOutTo(command);
    invocation.presentation.AddTo(command);
    command.ShowExample(
        "ssoclient acquire certificate --url https://sts.example.com/sts \\\n      --trust sts.pem "
        "--key service.key --cert service.pem \\\n      --renewable --out token.xml");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return AcquireCertificate(*options, invocation.presentation);
        };
    });
}
