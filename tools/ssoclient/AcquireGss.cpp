#include "Commands.h"
#include "IdentityOptions.h"
#include "KerberosOptions.h"
#include "ServiceOptions.h"
#include "TokenOutput.h"
#include "TokenSpecOptions.h"

#include <memory>

namespace {

struct AcquireGssOptions
{
    ServiceOptions service;
    SsoClient::Gss::KerberosOptions kerberos;
    IdentityOptions identity;
    TokenSpecOptions token;
    OutputOptions output;
};

ExitCode AcquireGss(const AcquireGssOptions& options, const Presentation& presentation)
{
    const auto service = options.service.CreateService(
        ReadCertificates(options.service.trustFiles), options.identity.Read());
    SsoClient::Gss::KerberosOptions kerberos = options.kerberos;
    kerberos.url = options.service.url;
    const auto handler = SsoClient::Gss::CreateKerberosNegotiationHandler(kerberos);
    TokenOutput output(options.output, presentation);
    output.Show(options.service.Await(
        presentation, [&] { return service->AcquireTokenByGSS(options.token.spec, *handler); }));
    return ExitCode::DONE;
}

} // namespace

void AddAcquireGssCommand(const Command& parent, Invocation& invocation)
{
    const Command command =
        parent.AddCommand("gss", "Acquire a token with a Kerberos ticket, by SPNEGO");
    const auto options = std::make_shared<AcquireGssOptions>();
    options->service.AddTo(command, invocation.exchanges);
    AddKerberosTo(command, options->kerberos);
    options->identity.AddTo(command);
    options->token.AddTo(command);
    options->service.dialect.AddIssueTo(command, options->token.spec);
    options->token.AddBearerTo(command);
    options->output.AddOutTo(command);
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient acquire gss --url https://sts.example.com/sts \\\n      --trust "
                        "sts.pem --out token.xml");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return AcquireGss(*options, invocation.presentation);
        };
    });
}
