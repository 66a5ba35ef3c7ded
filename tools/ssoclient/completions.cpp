#include "completions.h"

#include <functional>

namespace {

/** `text` as one word of a shell. */
std::string Quote(const std::string& text)
{
    std::string quoted = "'";
    for (const char character : text) {
        quoted += character == '\'' ? std::string("'\\''") : std::string(1, character);
    }
    return quoted + "'";
}

/** For fish, whose quotes know backslashes. */
std::string QuoteForFish(const std::string& text)
{
    std::string quoted = "'";
    for (const char character : text) {
        quoted += (character == '\'' || character == '\\' ? "\\" : "") + std::string(1, character);
    }
    return quoted + "'";
}

bool TakesFile(const OptionDescription& option)
{
    return option.value == "FILE" || option.value == "PEM" || option.value == "KEY"
           || option.name == "FILE";
}

/** The commands below the program, as in `acquire password`; empty for the program. */
std::string GetPath(const CommandDescription& command)
{
    std::string path;
    for (std::size_t i = 1; i < command.path.size(); ++i) {
        path += (path.empty() ? "" : " ") + command.path[i];
    }
    return path;
}

std::string ListCommands(const CommandDescription& command)
{
    std::string names;
    for (const CommandDescription& below : command.commands) {
        names += (names.empty() ? "" : " ") + below.path.back();
    }
    return names;
}

std::string ListOptions(
    const CommandDescription& command,
    const std::function<bool(const OptionDescription&)>& isWanted,
    const std::string& between)
{
    std::string names;
    for (const OptionDescription& option : command.options) {
        if (!option.isPositional && isWanted(option)) {
            names += (names.empty() ? "" : between) + "--" + option.name;
        }
    }
    return names;
}

void ForEachCommand(
    const CommandDescription& command, const std::function<void(const CommandDescription&)>& visit)
{
    visit(command);
    for (const CommandDescription& below : command.commands) {
        ForEachCommand(below, visit);
    }
}

std::string WriteBashCase(const CommandDescription& command)
{
    const auto isAny = [](const OptionDescription&) { return true; };
    const auto isOther = [](const OptionDescription& option) {
        return !option.value.empty() && !TakesFile(option);
    };
    return "        " + Quote(GetPath(command))
           + ")\n            commands=" + Quote(ListCommands(command))
           + "\n            options=" + Quote(ListOptions(command, isAny, " "))
           + "\n            files=" + Quote(" " + ListOptions(command, TakesFile, " ") + " ")
           + "\n            values=" + Quote(" " + ListOptions(command, isOther, " ") + " ")
           + " ;;\n";
}

/** For `_arguments`, where brackets and colons have a meaning. */
std::string EscapeForZsh(const std::string& text)
{
    std::string escaped;
    for (const char character : text) {
        const bool isSpecial =
            character == '[' || character == ']' || character == ':' || character == '\\';
        escaped += (isSpecial ? "\\" : "") + std::string(1, character);
    }
    return escaped;
}

std::string WriteZshOption(const OptionDescription& option)
{
    const std::string action = TakesFile(option) ? "_files" : " ";
    if (option.isPositional) {
        return Quote(":" + EscapeForZsh(option.name) + ":" + action);
    }
    std::string spec =
        (option.mayRepeat ? "*--" : "--") + option.name + "[" + EscapeForZsh(option.text) + "]";
    if (!option.value.empty()) {
        spec += ":" + EscapeForZsh(option.value) + ":" + action;
    }
    return Quote(spec);
}

std::string WriteZshCase(const CommandDescription& command)
{
    std::string text = "        " + Quote(GetPath(command)) + ")\n";
    if (!command.commands.empty()) {
        std::string values;
        for (const CommandDescription& below : command.commands) {
            values +=
                " \\\n                " + Quote(below.path.back() + ":" + EscapeForZsh(below.text));
        }
        return text + "            commands=(" + values + ")\n            _describe command "
               + "commands ;;\n";
    }
    text += "            _arguments -s";
    for (const OptionDescription& option : command.options) {
        text += " \\\n                " + WriteZshOption(option);
    }
    return text + " ;;\n";
}

std::string WriteFishLines(const CommandDescription& command)
{
    const std::string begin = "complete -c ssoclient -n "
                              + QuoteForFish("__ssoclient_at " + QuoteForFish(GetPath(command)));
    std::string lines;
    for (const CommandDescription& below : command.commands) {
        lines += begin + " -f -a " + below.path.back() + " -d " + QuoteForFish(below.text) + "\n";
    }
    for (const OptionDescription& option : command.options) {
        if (option.isPositional) {
            lines += begin + (TakesFile(option) ? " -F\n" : " -f\n");
            continue;
        }
        lines += begin + " -l " + option.name
                 + (option.value.empty() ? ""
                    : TakesFile(option)  ? " -r -F"
                                         : " -x")
                 + " -d " + QuoteForFish(option.text) + "\n";
    }
    return lines;
}

/** The shell's list of all commands that have commands below, for a walk along the words. */
std::string ListPaths(const CommandDescription& program)
{
    std::string paths = "|";
    ForEachCommand(
        program, [&](const CommandDescription& command) { paths += GetPath(command) + "|"; });
    return paths;
}

} // namespace

std::string WriteBashCompletion(const CommandDescription& program)
{
    std::string cases;
    ForEachCommand(
        program, [&](const CommandDescription& command) { cases += WriteBashCase(command); });
    return R"(# bash completion for ssoclient

_ssoclient()
{
    local current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD-1]}
    local paths=)"
           + Quote(ListPaths(program)) + R"( path='' longer word i
    local commands='' options='' files='' values=''
    for ((i = 1; i < COMP_CWORD; i++)); do
        word=${COMP_WORDS[i]}
        longer="${path:+$path }$word"
        [[ $paths == *"|$longer|"* ]] || break
        path=$longer
    done
    case $path in
)" + cases + R"(    esac
    COMPREPLY=()
    if [[ $files == *" $previous "* ]]; then
        mapfile -t COMPREPLY < <(compgen -f -- "$current")
        compopt -o filenames 2>/dev/null
    elif [[ $values == *" $previous "* ]]; then
        return
    elif [[ $current == -* ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$options" -- "$current")
    elif [[ -n $commands ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$commands" -- "$current")
    else
        mapfile -t COMPREPLY < <(compgen -f -- "$current")
        compopt -o filenames 2>/dev/null
    fi
}
complete -F _ssoclient ssoclient
)";
}

std::string WriteZshCompletion(const CommandDescription& program)
{
    std::string cases;
    ForEachCommand(
        program, [&](const CommandDescription& command) { cases += WriteZshCase(command); });
    return R"(#compdef ssoclient

_ssoclient() {
    local paths=)"
           + Quote(ListPaths(program)) + R"( path_typed='' longer
    local -a commands
    local -i i=2
    while (( i < CURRENT )); do
        longer="${path_typed:+$path_typed }${words[i]}"
        [[ $paths == *"|$longer|"* ]] || break
        path_typed=$longer
        (( i++ ))
    done
    words=(ssoclient "${(@)words[i,-1]}")
    (( CURRENT -= i - 2 ))
    case $path_typed in
)" + cases + R"(    esac
}

_ssoclient "$@"
)";
}

std::string WriteFishCompletion(const CommandDescription& program)
{
    std::string lines;
    ForEachCommand(
        program, [&](const CommandDescription& command) { lines += WriteFishLines(command); });
    return R"(# fish completion for ssoclient

# Whether the words that are typed name this command and none below it.
function __ssoclient_at
    set -l paths )"
           + QuoteForFish(ListPaths(program)) + R"(
    set -l typed
    for word in (commandline -opc)[2..-1]
        set -l longer (string join ' ' -- $typed $word)
        string match -q -- "*|$longer|*" $paths; or break
        set typed $typed $word
    end
    test "$argv[1]" = (string join ' ' -- $typed | string collect --allow-empty)
end

complete -c ssoclient -f
)" + lines;
}
