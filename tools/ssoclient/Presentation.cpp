#include "Presentation.h"

#include "Terminal.h"

void Presentation::AddTo(const Command& command)
{
    command.AddFlag("--json", json, "Print JSON: the facts, or the failure");
    command.AddFlag("--quiet", quiet, "Print nothing but failures, and what --out - asks for");
    command.AddFlag(
        "--explain", explain, "Add to a failure what can be done about it, as terminals see it");
}

bool Presentation::HasReader() const
{
    return !quiet && IsTerminal();
}
