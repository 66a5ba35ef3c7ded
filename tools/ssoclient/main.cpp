#include "Commands.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>

namespace {

void AddCommands(CLI::App& app, Action& action)
{
    app.set_version_flag("--version", std::string("ssoclient ") + SSOCLIENT_VERSION);
    // None is an error too, which `Run` tells: the parser would tell it of an unknown one as well,
    // without naming the word.
    app.require_subcommand(0, 1);
    CLI::App* acquire = app.add_subcommand("acquire", "Acquire a token from a token service");
    acquire->require_subcommand(0, 1);
    AddAcquirePasswordCommand(*acquire, action);
    AddAcquireCertificateCommand(*acquire, action);
    AddAcquireTokenCommand(*acquire, action);
    AddAcquireGssCommand(*acquire, action);
    AddRenewCommand(app, action);
    AddValidateCommand(app, action);
    AddInspectCommand(app, action);
}

ExitCode Run(int argc, char** argv)
{
    CLI::App app("Obtains, renews, validates and verifies SAML 2.0 tokens.", "ssoclient");
    Action action;
    AddCommands(app, action);
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& request) {
        app.exit(request); // prints the help or the version that was asked for
        return ExitCode::DONE;
    } catch (const CLI::ParseError& error) {
        throw UsageError(error.what());
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
