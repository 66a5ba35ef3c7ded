#include "Commands.h"
#include "IdentityOptions.h"
#include "PresentedToken.h"
#include "ServiceOptions.h"
#include "TokenOutput.h"

#include <memory>

namespace {

struct ValidateOptions
{
    ServiceOptions service;
    IdentityOptions identity;
    std::string tokenFile;
};

/** Without a dialect nobody signs the request, and a key that goes unused would mislead. */
void RequireUseOfKey(const ValidateOptions& options)
{
    if (options.identity.key && !options.service.dialect.Make()) {
        throw UsageError("validate signs with --key in a --dialect only");
    }
}

ExitCode Validate(const ValidateOptions& options, const Presentation& presentation)
{
    RequireUseOfKey(options);
    const CertificateList trusted = ReadCertificates(options.service.trustFiles);
    const auto service = options.service.CreateService(trusted, options.identity.Read());
    const auto token = ReadToken(options.tokenFile, trusted, options.service);
    const bool isValid =
        options.service.Await(presentation, [&] { return service->ValidateSubject(*token); });
    ShowValidity(isValid, presentation);
    return isValid ? ExitCode::DONE : ExitCode::REFUSED;
}

} // namespace

void AddValidateCommand(const Command& parent, Invocation& invocation)
{
    const Command command =
        parent.AddCommand("validate", "Ask the service whether a token's subject is valid");
    const auto options = std::make_shared<ValidateOptions>();
    options->service.AddTo(command, invocation.exchanges);
    AddTokenTo(command, options->tokenFile);
    options->identity.AddTo(command);
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient validate --url https://sts.example.com/sts \\\n      --trust "
                        "sts.pem --token token.xml");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return Validate(*options, invocation.presentation);
        };
    });
}
