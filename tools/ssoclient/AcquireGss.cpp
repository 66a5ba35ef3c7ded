#include "Arguments.h"
#include "Commands.h"
#include "IdentityOptions.h"
#include "ServiceOptions.h"
#include "TokenOutput.h"
#include "TokenSpecOptions.h"

#include "ssoClientGss/KerberosNegotiationHandler.h"

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

void AddKerberosTo(const Command& command, SsoClient::Gss::KerberosOptions& options)
{
    command
        .AddOption(
            "--service",
            options.service,
            "The Kerberos service, SERVICE@HOST or SERVICE/HOST[@REALM] (default: HTTP@ and the "
            "host of the URL)")
        .Check(CheckName)
        .ValueName("NAME");
    const Option ccache =
        command
            .AddOption(
                "--ccache",
                options.ccache,
                "Credential cache with the ticket (default: the cache that kinit fills)")
            .Check(CheckNotEmpty)
            .ValueName("NAME");
    const Option keytab =
        command
            .AddOption(
                "--keytab", options.keytab, "Keytab with the principal's key, in place of a cache")
            .Check(CheckNotEmpty)
            .ValueName("FILE");
    const Option principal =
        command
            .AddOption("--principal", options.principal, "Principal to log on as with the keytab")
            .Check(CheckName)
            .ValueName("NAME");
    keytab.Needs(principal).Excludes(ccache);
    principal.Needs(keytab).Excludes(ccache);
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
