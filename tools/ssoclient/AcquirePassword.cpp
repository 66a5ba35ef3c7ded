#include "Commands.h"
#include "IdentityOptions.h"
#include "PasswordOptions.h"
#include "PresentedToken.h"
#include "Secret.h"
#include "ServiceOptions.h"
#include "TokenOutput.h"
#include "TokenSpecOptions.h"

#include <memory>

namespace {

struct AcquirePasswordOptions
{
    ServiceOptions service;
    IdentityOptions identity;
    TokenSpecOptions token;
    OutputOptions output;
    PasswordOptions password;
};

using TokenPtr = boost::shared_ptr<const SsoClient::SamlToken>;

/** Asks for a token of the one whose token the user presents. */
TokenPtr AcquireForAnother(
    const AcquirePasswordOptions& options,
    const std::string& password,
    const Presentation& presentation)
{
    const CertificateList trusted = ReadCertificates(options.service.trustFiles);
    const auto service = options.service.CreateService(
        trusted,
        options.identity.Read(),
        SsoClient::PasswordCredentials(options.password.user, password));
    const TokenPtr presented =
        ReadToken(options.service.dialect.GetPresentedFile(), trusted, options.service);
    return options.service.Await(
        presentation, [&] { return service->AcquireTokenByToken(*presented, options.token.spec); });
}

ExitCode AcquirePassword(const AcquirePasswordOptions& options, const Presentation& presentation)
{
    const auto service = options.service.CreateService(
        ReadCertificates(options.service.trustFiles), options.identity.Read());
    TokenOutput output(options.output, presentation);
    Quillon::Wiped password;
    GetPassword(options.password.file, password);
    if (!options.service.dialect.GetPresentedFile().empty()) {
        output.Show(AcquireForAnother(options, password.Get(), presentation));
        return ExitCode::DONE;
    }
    output.Show(options.service.Await(presentation, [&] {
        return service->AcquireToken(options.password.user, password.Get(), options.token.spec);
    }));
    return ExitCode::DONE;
}

} // namespace

void AddAcquirePasswordCommand(const Command& parent, Invocation& invocation)
{
    const Command command =
        parent.AddCommand("password", "Acquire a token with a user name and a password");
    const auto options = std::make_shared<AcquirePasswordOptions>();
    options->service.AddTo(command, invocation.exchanges);
    options->password.AddTo(command).Required();
    options->identity.AddTo(command);
    options->token.AddTo(command);
    options->service.dialect.AddIssueTo(command, options->token.spec);
    options->service.dialect.AddDelegatingTo(command);
    options->token.AddBearerTo(command);
    options->output.AddOutTo(command);
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient acquire password --url https://sts.example.com/sts \\\n      "
                        "--trust sts.pem --user alice@example.com --out token.xml");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return AcquirePassword(*options, invocation.presentation);
        };
    });
}
