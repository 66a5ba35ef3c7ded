#include "Commands.h"
#include "IdentityOptions.h"
#include "PresentedToken.h"
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
    const CertificateList trusted = ReadCertificates(options.service.trustFiles);
    const auto service = options.service.CreateService(trusted, options.identity.Read());
    TokenOutput output(options.output, presentation);
    const std::string& presentedFile = options.service.dialect.GetPresentedFile();
    const auto presented = presentedFile.empty()
                               ? boost::shared_ptr<const SsoClient::SamlToken>()
                               : ReadToken(presentedFile, trusted, options.service);
    output.Show(options.service.Await(presentation, [&] {
        return presented ? service->AcquireTokenByToken(*presented, options.token.spec)
                         : service->AcquireTokenByCertificate(options.token.spec);
    }));
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
    options->service.dialect.AddIssueTo(command, options->token.spec);
    options->service.dialect.AddDelegatingTo(command);
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
