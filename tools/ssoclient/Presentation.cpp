#include "Presentation.h"

#include "Terminal.h"

#include <unistd.h>

void Presentation::AddTo(const Command& owner)
{
    const Command command = owner.InGroup("What is printed");
    command.AddFlag("--json", json, "Print JSON: the facts, or the failure");
    command.AddFlag("--quiet", quiet, "Print nothing but failures, and what --out - asks for");
    command.AddFlag(
        "--explain",
        explain,
        "Add what can be done about a failure, and what an inspected token means, as at a "
        "terminal");
}

bool Presentation::HasReader() const
{
    return !quiet && IsTerminal();
}

bool Presentation::ShowsExplanations() const
{
    return !json && !quiet && (explain || ::isatty(STDOUT_FILENO) == 1);
}
