#include "Commands.h"
#include "PresentedToken.h"
#include "ServiceOptions.h"
#include "TokenOutput.h"

#include <memory>

namespace {

struct ValidateOptions
{
    ServiceOptions service;
    std::string tokenFile;
};

ExitCode Validate(const ValidateOptions& options)
{
    const CertificateList trusted = ReadCertificates(options.service.trustFiles);
    const auto service = options.service.CreateService(trusted);
    const bool isValid = service->ValidateSubject(*ReadToken(options.tokenFile, trusted));
    PrintLine(isValid ? "valid" : "invalid");
    return isValid ? ExitCode::DONE : ExitCode::REFUSED;
}

} // namespace

void AddValidateCommand(const Command& parent, Action& action)
{
    const Command command =
        parent.AddCommand("validate", "Ask the service whether a token's subject is valid");
    const auto options = std::make_shared<ValidateOptions>();
    options->service.AddTo(command);
    AddTokenTo(command, options->tokenFile);
    command.WhenNamed([options, &action] { action = [options] { return Validate(*options); }; });
}
