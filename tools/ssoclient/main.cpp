#include "Commands.h"
#include "Failure.h"
#include "Profile.h"
#include "Terminal.h"
#include "Versions.h"

#include <algorithm>
#include <iostream>

namespace {

void AddCommands(const Command& program, Invocation& invocation)
{
    const Command acquire = program.AddCommand("acquire", "Acquire a token from a token service");
    AddAcquirePasswordCommand(acquire, invocation);
    AddAcquireCertificateCommand(acquire, invocation);
    AddAcquireTokenCommand(acquire, invocation);
    AddAcquireGssCommand(acquire, invocation);
    AddRenewCommand(program, invocation);
    AddValidateCommand(program, invocation);
    AddInspectCommand(program, invocation);
    AddDoctorCommand(program, invocation);
    AddProfileCommand(program, invocation);
}

ExitCode Run(const std::vector<std::string>& arguments, Invocation& invocation)
{
    const CommandLine commandLine(
        "ssoclient",
        DescribeVersions(),
        "Obtains, renews, validates and verifies SAML 2.0 tokens.");
    AddCommands(commandLine.GetRoot(), invocation);
    if (arguments.empty() && IsTerminal()) {
        std::cerr << commandLine.GetHelp();
    }
    const std::vector<std::string> words = AddProfile(arguments, commandLine.GetOptions(arguments));
    return commandLine.Parse(words) ? invocation.action() : ExitCode::DONE;
}

} // namespace

int main(int argc, char** argv)
{
    const std::vector<std::string> arguments(argv + 1, argv + argc);
    Invocation invocation;
    try {
        return static_cast<int>(Run(arguments, invocation));
    } catch (const std::exception& error) {
        // A command line that is not understood may not have got as far as to set this.
        invocation.presentation.json |=
            std::find(arguments.begin(), arguments.end(), "--json") != arguments.end();
        ReportFailure(error, invocation.exchanges.GetLatest(), invocation.presentation);
        return static_cast<int>(GetExitCode(error));
    }
}
