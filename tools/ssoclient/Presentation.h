#pragma once

#include "CommandLine.h"

#include <string>

/** How a command speaks to its user. */
struct Presentation
{
    bool json = false;
    bool quiet = false;
    bool explain = false;

    void AddTo(const Command& command);

    /** Whether somebody is there to read what a script has no use for. */
    bool HasReader() const;

    /** Whether a failure is followed by a line on what can be done about it. */
    bool ShowsHints() const { return explain || HasReader(); }

    /** Whether the description of a token is followed by lines that explain it. */
    bool ShowsExplanations() const;
};
