#include "Commands.h"
#include "IdentityOptions.h"
#include "PresentedToken.h"
#include "ServiceOptions.h"
#include "TokenOutput.h"
#include "TokenSpecOptions.h"

#include <memory>

namespace {

struct AcquireTokenOptions
{
    ServiceOptions service;
    IdentityOptions identity;
    TokenSpecOptions token;
    OutputOptions output;
    std::string tokenFile;
};

ExitCode AcquireToken(const AcquireTokenOptions& options, const Presentation& presentation)
{
    const CertificateList trusted = ReadCertificates(options.service.trustFiles);
    const auto service = options.service.CreateService(trusted, options.identity.Read());
    TokenOutput output(options.output, presentation);
    const auto presented = ReadToken(options.tokenFile, trusted, options.service);
    output.Show(options.service.Await(presentation, [&] {
        return service->AcquireTokenByToken(*presented, options.token.spec);
    }));
    return ExitCode::DONE;
}

} // namespace

void AddAcquireTokenCommand(const Command& parent, Invocation& invocation)
{
    const Command command = parent.AddCommand(
        "token", "Acquire a token by presenting another, for delegation or other properties");
    const auto options = std::make_shared<AcquireTokenOptions>();
    options->service.AddTo(command, invocation.exchanges);
    AddTokenTo(command, options->tokenFile);
    options->identity.AddRequiredTo(command);
    options->token.AddTo(command);
    options->service.dialect.AddIssueTo(command, options->token.spec);
    options->token.AddBearerTo(command);
    options->output.AddOutTo(command);
    invocation.presentation.AddTo(command);
    command.ShowExample(
        "ssoclient acquire token --url https://sts.example.com/sts \\\n      --trust sts.pem --key "
        "service.key --cert service.pem \\\n      --token users.xml --out token.xml");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return AcquireToken(*options, invocation.presentation);
        };
    });
}
