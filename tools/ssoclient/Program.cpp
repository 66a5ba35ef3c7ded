#include "Program.h"

#include "Versions.h"

std::unique_ptr<CommandLine> MakeCommandLine(Invocation& invocation)
{
    auto commandLine = std::make_unique<CommandLine>(
        "ssoclient",
        DescribeVersions(),
        "Obtains, renews, validates and verifies SAML 2.0 tokens.");
    const Command program = commandLine->GetRoot();
    const Command acquire = program.AddCommand("acquire", "Acquire a token from a token service");
    AddAcquirePasswordCommand(acquire, invocation);
    AddAcquireCertificateCommand(acquire, invocation);
    AddAcquireTokenCommand(acquire, invocation);
    AddAcquireGssCommand(acquire, invocation);
    AddKeepCommand(program, invocation);
    AddRenewCommand(program, invocation);
    AddValidateCommand(program, invocation);
    AddInspectCommand(program, invocation);
    AddDoctorCommand(program, invocation);
    AddProfileCommand(program, invocation);
    return commandLine;
}
