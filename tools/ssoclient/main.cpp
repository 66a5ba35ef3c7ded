#include "Failure.h"
#include "Profile.h"
#include "Program.h"
#include "Terminal.h"

#include <algorithm>
#include <iostream>

namespace {

ExitCode Run(const std::vector<std::string>& arguments, Invocation& invocation)
{
    const std::unique_ptr<CommandLine> commandLine = MakeCommandLine(invocation);
    if (arguments.empty() && IsTerminal()) {
        std::cerr << commandLine->GetHelp();
    }
    const std::vector<std::string> words =
        AddProfile(arguments, commandLine->GetOptions(arguments));
    return commandLine->Parse(words) ? invocation.action() : ExitCode::DONE;
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
        const Presentation& presentation = invocation.presentation;
        if (!invocation.passage.empty() && presentation.ShowsHints() && !presentation.json) {
            Notice("passage: " + invocation.passage);
        }
        return static_cast<int>(GetExitCode(error));
    }
}
