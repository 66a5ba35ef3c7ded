#pragma once

#include <string>
#include <vector>

/** What the command line says of one of its options. */
struct OptionDescription
{
    std::string shortName; ///< one letter; empty if there is none
    std::string name;      ///< without dashes; of a positional argument, what the help calls it
    std::string value;     ///< what the help calls its value; empty if it takes none
    std::string text;
    std::string group; ///< the heading that it stands under
    bool isPositional = false;
    bool isRequired = false;
    bool mayRepeat = false;
};

/** What the command line says of one of its commands: the one source of help and documents. */
struct CommandDescription
{
    std::vector<std::string> path; ///< as typed: the program, then the commands
    std::string text;
    std::string footer; ///< an example; may be empty
    std::vector<OptionDescription> options;
    std::vector<CommandDescription> commands;
};
