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

ExitCode AcquireToken(const AcquireTokenOptions& options)
{
    const CertificateList trusted = ReadCertificates(options.service.trustFiles);
    const auto service = options.service.CreateService(trusted, options.identity.Read());
    TokenOutput output(options.output);
    const auto presented = ReadToken(options.tokenFile, trusted);
    output.Show(service->AcquireTokenByToken(*presented, options.token.spec));
    return ExitCode::DONE;
}

} // namespace

void AddAcquireTokenCommand(const Command& parent, Action& action)
{
    const Command command = parent.AddCommand(
        "token", "Acquire a token by presenting another, for delegation or other properties");
    const auto options = std::make_shared<AcquireTokenOptions>();
    options->service.AddTo(command);
    AddTokenTo(command, options->tokenFile);
    options->identity.AddRequiredTo(command);
    options->token.AddTo(command);
    options->token.AddBearerTo(command);
    options->output.AddOutTo(command);
    options->output.AddJsonTo(command);
    command.WhenNamed(
        [options, &action] { action = [options] { return AcquireToken(*options); }; });
}
