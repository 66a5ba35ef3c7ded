#include "Commands.h"
#include "Terminal.h"

#include <iostream>

namespace {

void AddCommands(const Command& program, Action& action)
{
    const Command acquire = program.AddCommand("acquire", "Acquire a token from a token service");
    AddAcquirePasswordCommand(acquire, action);
    AddAcquireCertificateCommand(acquire, action);
    AddAcquireTokenCommand(acquire, action);
    AddAcquireGssCommand(acquire, action);
    AddRenewCommand(program, action);
    AddValidateCommand(program, action);
    AddInspectCommand(program, action);
}

ExitCode Run(const std::vector<std::string>& arguments)
{
    const CommandLine commandLine(
        "ssoclient", SSOCLIENT_VERSION, "Obtains, renews, validates and verifies SAML 2.0 tokens.");
    Action action;
    AddCommands(commandLine.GetRoot(), action);
    if (arguments.empty() && IsTerminal()) {
        std::cerr << commandLine.GetHelp();
    }
    return commandLine.Parse(arguments) ? action() : ExitCode::DONE;
}

} // namespace

int main(int argc, char** argv)
{
    try {
        return static_cast<int>(Run({argv + 1, argv + argc}));
    } catch (const std::exception& error) {
        ReportFailure(Quillon::GetClassName(error), error.what());
        return static_cast<int>(GetExitCode(error));
    }
}
