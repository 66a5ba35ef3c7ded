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

ExitCode AcquireGss(const AcquireGssOptions& options)
{
    const auto service = options.service.CreateService(
        ReadCertificates(options.service.trustFiles), options.identity.Read());
    SsoClient::Gss::KerberosOptions kerberos = options.kerberos;
    kerberos.url = options.service.url;
    const auto handler = SsoClient::Gss::CreateKerberosNegotiationHandler(kerberos);
    TokenOutput output(options.output);
    output.Show(service->AcquireTokenByGSS(options.token.spec, *handler));
    return ExitCode::DONE;
}

void AddKerberosTo(CLI::App& command, SsoClient::Gss::KerberosOptions& options)
{
    command
        .add_option(
            "--service",
            options.service,
            "The Kerberos service, SERVICE@HOST or SERVICE/HOST[@REALM] (default: HTTP@ and the "
            "host of the URL)")
        ->check(CheckName)
        ->type_name("NAME");
    CLI::Option* const ccache =
        command
            .add_option(
                "--ccache",
                options.ccache,
                "Credential cache with the ticket (default: the cache that kinit fills)")
            ->check(CheckNotEmpty)
            ->type_name("NAME");
    CLI::Option* const keytab =
        command
            .add_option(
                "--keytab", options.keytab, "Keytab with the principal's key, in place of a cache")
            ->check(CheckNotEmpty)
            ->type_name("FILE");
    CLI::Option* const principal =
        command
            .add_option("--principal", options.principal, "Principal to log on as with the keytab")
            ->check(CheckName)
            ->type_name("NAME");
    keytab->needs(principal)->excludes(ccache);
    principal->needs(keytab)->excludes(ccache);
}

} // namespace

void AddAcquireGssCommand(CLI::App& parent, Action& action)
{
    CLI::App* command =
        parent.add_subcommand("gss", "Acquire a token with a Kerberos ticket, by SPNEGO");
    const auto options = std::make_shared<AcquireGssOptions>();
    options->service.AddTo(*command);
    AddKerberosTo(*command, options->kerberos);
    options->identity.AddTo(*command);
    options->token.AddTo(*command);
    options->token.AddBearerTo(*command);
    options->output.AddOutTo(*command);
    options->output.AddJsonTo(*command);
    command->callback([options, &action] { action = [options] { return AcquireGss(*options); }; });
}
