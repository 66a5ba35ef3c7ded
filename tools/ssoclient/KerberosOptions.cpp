#include "KerberosOptions.h"

#include "Arguments.h"

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
