#include "Arguments.h"
#include "Commands.h"
#include "IdentityOptions.h"
#include "PresentedToken.h"
#include "ServiceOptions.h"
#include "TokenOutput.h"

#include <memory>

namespace {

struct RenewOptions
{
    ServiceOptions service;
    IdentityOptions identity;
    OutputOptions output;
    std::string tokenFile;
    long long lifetimeSec = 0;
};

ExitCode Renew(const RenewOptions& options, const Presentation& presentation)
{
    const CertificateList trusted = ReadCertificates(options.service.trustFiles);
    const auto service = options.service.CreateService(trusted, options.identity.Read());
    TokenOutput output(options.output, presentation);
    const auto presented = ReadToken(options.tokenFile, trusted, options.service);
    output.Show(options.service.Await(
        presentation, [&] { return service->RenewToken(*presented, options.lifetimeSec); }));
    return ExitCode::DONE;
}

} // namespace

void AddRenewCommand(const Command& parent, Invocation& invocation)
{
    const Command command = parent.AddCommand("renew", "Renew a holder-of-key token");
    const auto options = std::make_shared<RenewOptions>();
    options->service.AddTo(command, invocation.exchanges);
    AddTokenTo(command, options->tokenFile);
    command
        .AddOption(
            "--lifetime", options->lifetimeSec, "Lifetime of the new token, from now, in seconds")
        .Required()
        .Check(CheckLifetime)
        .ValueName("SEC");
    options->identity.AddRequiredTo(command);
    options->output.AddOutTo(command);
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient renew --url https://sts.example.com/sts \\\n      --trust "
                        "sts.pem --key service.key --cert service.pem \\\n      --token token.xml "
                        "--lifetime 3600 --out renewed.xml");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return Renew(*options, invocation.presentation);
        };
    });
}
