#include "Commands.h"

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

ExitCode Run(int argc, char** argv)
{
    const CommandLine commandLine(
        "ssoclient", SSOCLIENT_VERSION, "Obtains, renews, validates and verifies SAML 2.0 tokens.");
    Action action;
    AddCommands(commandLine.GetRoot(), action);
    if (!commandLine.Parse(argc, argv)) {
        return ExitCode::DONE;
    }
    if (!action) {
        throw UsageError("A subcommand is required");
    }
    return action();
}

} // namespace

int main(int argc, char** argv)
{
    try {
        return static_cast<int>(Run(argc, argv));
    } catch (const std::exception& error) {
        ReportFailure(Quillon::GetClassName(error), error.what());
        return static_cast<int>(GetExitCode(error));
    }
}
