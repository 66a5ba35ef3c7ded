#include "manPages.h"

#include "ExitCode.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace {

/** Text that is shown as it is [man(7)]: nothing in it is an escape or begins a request. */
std::string Escape(const std::string& text)
{
    std::string escaped;
    bool isLineStart = true;
    for (const char character : text) {
        if (isLineStart && (character == '.' || character == '\'')) {
            escaped += "\\&";
        }
        if (character == '\\') {
            escaped += "\\e";
        } else if (character == '-') {
            escaped += "\\-"; // a hyphen that can be copied to a shell
        } else {
            escaped += character;
        }
        isLineStart = character == '\n';
    }
    return escaped;
}

std::string Join(const std::vector<std::string>& words, const std::string& between)
{
    std::string text;
    for (const std::string& word : words) {
        text += (text.empty() ? "" : between) + word;
    }
    return text;
}

std::string WriteOption(const OptionDescription& option)
{
    std::string names = option.isPositional ? option.name : "\\-\\-" + Escape(option.name);
    if (!option.shortName.empty()) {
        names = "\\-" + option.shortName + "\\fR, \\fB" + names;
    }
    std::string text = ".TP\n\\fB" + names + "\\fR";
    if (!option.value.empty()) {
        text += " \\fI" + Escape(option.value) + "\\fR" + (option.mayRepeat ? " ..." : "");
    }
    return text + "\n" + Escape(option.text) + (option.isRequired ? " (required)" : "") + "\n";
}

/** The options under their headings, which come in the order of their first options. */
std::string WriteOptions(const CommandDescription& command)
{
    std::vector<std::pair<std::string, std::string>> groups;
    for (const OptionDescription& option : command.options) {
        const auto known = std::find_if(groups.begin(), groups.end(), [&](const auto& group) {
            return group.first == option.group;
        });
        if (known == groups.end()) {
            groups.emplace_back(option.group, WriteOption(option));
        } else {
            known->second += WriteOption(option);
        }
    }
    std::string text = ".SH OPTIONS\n";
    for (const auto& [heading, options] : groups) {
        text += ".SS \"" + Escape(heading) + "\"\n" + options;
    }
    return text;
}

std::string WriteCommands(const CommandDescription& command)
{
    std::string text;
    for (const CommandDescription& below : command.commands) {
        text +=
            ".TP\n\\fB" + Escape(Join(below.path, "-")) + "\\fR(1)\n" + Escape(below.text) + "\n";
    }
    return text.empty() ? "" : ".SH COMMANDS\n" + text;
}

std::string WriteExample(const CommandDescription& command)
{
    constexpr char Heading[] = "Example:\n";
    if (command.footer.rfind(Heading, 0) != 0) {
        return "";
    }
    return ".SH EXAMPLE\n.nf\n" + Escape(command.footer.substr(sizeof Heading - 1)) + "\n.fi\n";
}

std::string WriteSynopsis(const CommandDescription& command)
{
    std::string text = ".SH SYNOPSIS\n\\fB" + Escape(Join(command.path, " ")) + "\\fR";
    text += command.commands.empty() ? " [\\fIOPTIONS\\fR]" : " \\fICOMMAND\\fR";
    for (const OptionDescription& option : command.options) {
        text += option.isPositional ? " \\fI" + Escape(option.name) + "\\fR" : "";
    }
    return text + "\n";
}

std::string WritePage(const CommandDescription& command, const std::string& version)
{
    const std::string name = Join(command.path, "-");
    // Without a date, so that one source always makes one page.
    return ".TH \"" + Escape(name) + "\" \"1\" \"\" \"SsoClient " + Escape(version)
           + "\" \"User commands\"\n.SH NAME\n" + Escape(name) + " \\- " + Escape(command.text)
           + "\n" + WriteSynopsis(command) + WriteCommands(command) + WriteOptions(command)
           + WriteExample(command) + ".SH \"EXIT STATUS\"\n" + Escape(DescribeExitCodes()) + "\n";
}

void AddPages(
    const CommandDescription& command,
    const std::string& version,
    std::map<std::string, std::string>& pages)
{
    pages[Join(command.path, "-") + ".1"] = WritePage(command, version);
    for (const CommandDescription& below : command.commands) {
        AddPages(below, version, pages);
    }
}

} // namespace

std::map<std::string, std::string> WriteManPages(
    const CommandDescription& program, const std::string& version)
{
    std::map<std::string, std::string> pages;
    AddPages(program, version, pages);
    return pages;
}
