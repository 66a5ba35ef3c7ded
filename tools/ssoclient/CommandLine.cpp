#include "CommandLine.h"

#include "ExitCode.h"
#include "HelpFormat.h"
#include "Neighbour.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <CLI/Validators.hpp>

#include <algorithm>
#include <array>
#include <cctype>

namespace {

using Words = std::vector<std::string>;

bool IsOption(const std::string& word)
{
    return word.size() > 1 && word[0] == '-' && word != "--";
}

/** The command that the words named last. */
const CLI::App& GetNamedCommand(const CLI::App& app)
{
    const std::vector<CLI::App*> named = app.get_subcommands();
    return named.empty() ? app : GetNamedCommand(*named.front());
}

/** The command as it is typed, with those above it. */
std::string GetPath(const CLI::App& app)
{
    return app.get_parent() == nullptr ? app.get_name()
                                       : GetPath(*app.get_parent()) + " " + app.get_name();
}

Words GetCommandNames(const CLI::App& app)
{
    Words names;
    for (const CLI::App* command : app.get_subcommands({})) {
        names.push_back(command->get_name());
    }
    return names;
}

const CLI::App* FindCommand(const CLI::App& parent, const std::string& name)
{
    const auto found = parent.get_subcommands(
        [&](const CLI::App* command) { return command->get_name() == name; });
    return found.empty() ? nullptr : found.front();
}

Words GetOptionNames(const CLI::App& app)
{
    Words names;
    for (const CLI::Option* option : app.get_options()) {
        const Words& longNames = option->get_lnames();
        names.insert(names.end(), longNames.begin(), longNames.end());
    }
    return names;
}

/** The first word that belongs to nothing, with the command that it was left to. */
std::pair<const CLI::App*, std::string> FindUnknownWord(const CLI::App& app)
{
    const Words unknown = app.remaining();
    if (!unknown.empty()) {
        return {&app, unknown.front()};
    }
    const std::vector<CLI::App*> named = app.get_subcommands();
    return named.empty() ? std::pair<const CLI::App*, std::string>() : FindUnknownWord(*named[0]);
}

/**
 * The option that a word begins with. What follows it may be a secret, and what does not look like
 * an option may be one itself: empty then.
 */
std::string GetShownOption(const std::string& word)
{
    constexpr std::size_t MaxShown = 32;
    if (word[1] != '-') {
        return std::isalpha(static_cast<unsigned char>(word[1])) != 0 ? word.substr(0, 2) : "";
    }
    const std::string name = word.substr(0, word.find('='));
    const bool isPlain =
        name.find_first_not_of("abcdefghijklmnopqrstuvwxyz0123456789-") == std::string::npos;
    return isPlain && name.size() <= MaxShown ? name : "";
}

std::string DescribeUnknownOption(const CLI::App& command, const std::string& word)
{
    const std::string shown = GetShownOption(word);
    if (shown.empty()) {
        return GetPath(command) + " has no such option, which is not shown: it may be a secret";
    }
    const std::string text = GetPath(command) + " has no option " + shown;
    const bool isLong = shown.size() > 2;
    const std::string near = isLong ? FindNeighbour(shown.substr(2), GetOptionNames(command)) : "";
    return near.empty() ? text : text + "; did you mean --" + near + "?";
}

/** Only a word that is nearly a command is shown. Any other may be anything, a secret included. */
std::string DescribeUnknownCommand(const CLI::App& parent, const std::string& word)
{
    const Words names = GetCommandNames(parent);
    const std::string near = FindNeighbour(word, names);
    return near.empty()
               ? GetPath(parent) + " has no such command, only " + CLI::detail::join(names, ", ")
               : GetPath(parent) + " has no command " + word + "; did you mean " + near + "?";
}

/** Names the option that the last `word` of the arguments comes after. */
std::string DescribeSurplusWord(
    const CLI::App& command, const std::string& word, const Words& arguments)
{
    const Words options = GetOptionNames(command);
    const auto isKnown = [&](const std::string& argument) {
        return IsOption(argument)
               && std::find(options.begin(), options.end(), argument.substr(2)) != options.end();
    };
    const auto at = std::find(arguments.rbegin(), arguments.rend(), word);
    const auto before = std::find_if(at, arguments.rend(), isKnown);
    return "there is an argument too many" + (before == arguments.rend() ? "" : " after " + *before)
           + ", not shown because it may be a secret";
}

std::string DescribeUnknownWord(
    const CLI::App& command, const std::string& word, const Words& arguments)
{
    if (IsOption(word)) {
        return DescribeUnknownOption(command, word);
    }
    return GetCommandNames(command).empty() ? DescribeSurplusWord(command, word, arguments)
                                            : DescribeUnknownCommand(command, word);
}

[[noreturn]] void ThrowUsageError(const CLI::App& command, const std::string& what)
{
    throw UsageError(what + " (see: " + GetPath(command) + " --help)");
}

/** The parser's own words, but for a value that stands where there can be none. */
std::string DescribeBadValue(const std::string& error)
{
    const std::size_t end = error.find(" was given a disallowed flag override");
    return end == std::string::npos ? error : "--" + error.substr(0, end) + " takes no value";
}

/** What was typed and is not understood comes before what was not typed or has a bad value. */
[[noreturn]] void ThrowParseError(
    const CLI::App& program, const CLI::ParseError& error, const Words& arguments)
{
    const auto [command, word] = FindUnknownWord(program);
    if (command != nullptr) {
        // Words after `--` are left to the commands above.
        const CLI::App& place = IsOption(word) ? *command : GetNamedCommand(*command);
        ThrowUsageError(place, DescribeUnknownWord(place, word, arguments));
    }
    ThrowUsageError(GetNamedCommand(program), DescribeBadValue(error.what()));
}

void RequireCommand(const CLI::App& named)
{
    const Words names = GetCommandNames(named);
    if (!names.empty()) {
        ThrowUsageError(
            named, GetPath(named) + " needs a command: " + CLI::detail::join(names, ", "));
    }
}

/** `help COMMAND...` and `version` mean `COMMAND... --help` and `--version`. */
Words TranslateWordsForOptions(const CLI::App& program, const Words& arguments)
{
    if (arguments == Words{"version"}) {
        return {"--version"};
    }
    if (arguments.empty() || arguments[0] != "help") {
        return arguments;
    }
    const CLI::App* command = &program;
    Words translated(arguments.begin() + 1, arguments.end());
    for (const std::string& word : translated) {
        const CLI::App* below = FindCommand(*command, word);
        if (below == nullptr) {
            ThrowUsageError(*command, DescribeUnknownWord(*command, word, arguments));
        }
        command = below;
    }
    translated.emplace_back("--help");
    return translated;
}

struct Unit
{
    char letter;
    long long seconds;
};
constexpr std::array<Unit, 4> Units = {{{'s', 1}, {'m', 60}, {'h', 3600}, {'d', 86400}}};

/** The words after a value that has a unit: how it is written here. Empty for another value. */
std::string ExplainUnit(const std::string& value)
{
    constexpr long long MaxCount = 1'000'000;
    long long count = 0;
    const auto unit = std::find_if(Units.begin(), Units.end(), [&](const Unit& candidate) {
        return !value.empty() && candidate.letter == value.back();
    });
    if (unit == Units.end() || !ToNumber(value.substr(0, value.size() - 1), count) || count < 0
        || count > MaxCount) {
        return "";
    }
    return ": write " + std::to_string(count * unit->seconds);
}

std::string CheckSeconds(const std::string& value)
{
    long long seconds = 0;
    return ToNumber(value, seconds)
               ? ""
               : "`" + value + "' is not a number of seconds" + ExplainUnit(value);
}

OptionDescription Describe(const CLI::Option& option)
{
    OptionDescription description;
    description.isPositional = option.get_positional();
    description.shortName = option.get_snames().empty() ? "" : option.get_snames().front();
    description.name =
        description.isPositional ? option.get_name(true) : option.get_lnames().front();
    const bool takesValue = option.get_items_expected_max() > 0;
    // Behind the value's name the parser adds what it checks.
    const std::string value = option.get_type_name();
    description.value =
        takesValue && !description.isPositional ? value.substr(0, value.find(':')) : "";
    description.text = option.get_description();
    description.group = option.get_group();
    description.isRequired = option.get_required();
    description.mayRepeat = option.get_items_expected_max() > 1;
    return description;
}

CommandDescription Describe(const CLI::App& app)
{
    CommandDescription description;
    if (app.get_parent() != nullptr) {
        description.path = Describe(*app.get_parent()).path;
    }
    description.path.push_back(app.get_name());
    description.text = app.get_description();
    description.footer = app.get_footer();
    for (const CLI::Option* option : app.get_options()) {
        description.options.push_back(Describe(*option));
    }
    return description;
}

CommandDescription DescribeAll(const CLI::App& app)
{
    CommandDescription description = Describe(app);
    for (const CLI::App* command : app.get_subcommands({})) {
        description.commands.push_back(DescribeAll(*command));
    }
    return description;
}

/** The parser's help, wrapped to the terminal, with the exit codes at the end. */
class HelpFormatter : public CLI::Formatter
{
public:
    std::string make_description(const CLI::App* app) const override
    {
        return Wrap(CLI::Formatter::make_description(app), 0);
    }
    std::string make_option(const CLI::Option* option, bool isPositional) const override
    {
        return FormatEntry(
            make_option_name(option, isPositional) + make_option_opts(option),
            make_option_desc(option));
    }
    std::string make_subcommand(const CLI::App* command) const override
    {
        return FormatEntry(command->get_name(), command->get_description());
    }
    std::string make_footer(const CLI::App* app) const override
    {
        return "\n" + app->get_footer() + (app->get_footer().empty() ? "" : "\n\n")
               + Wrap("Exit codes: " + DescribeExitCodes(), 0);
    }
};

} // namespace

Option Option::Required() const
{
    _option->required();
    return *this;
}

Option Option::Check(std::string (*check)(const std::string& value)) const
{
    _option->check(check);
    return *this;
}

Option Option::Between(long long least, long long most) const
{
    _option->check(CLI::Range(least, most));
    return *this;
}

Option Option::Needs(const Option& other) const
{
    _option->needs(other._option);
    return *this;
}

Option Option::Excludes(const Option& other) const
{
    _option->excludes(other._option);
    return *this;
}

Option Option::ValueName(const std::string& name) const
{
    _option->type_name(name);
    return *this;
}

Option Option::ShowDefault() const
{
    _option->capture_default_str();
    return *this;
}

Command Command::AddCommand(const std::string& name, const std::string& description) const
{
    // None is an error too, which the program tells: the parser would tell it of an unknown one as
    // well, without naming the word.
    _app->require_subcommand(0, 1);
    CLI::App* command = _app->add_subcommand(name, description);
    command->set_version_flag("--version", _app->version());
    return Command(*command);
}

Command Command::InGroup(const std::string& heading) const
{
    Command same(*_app);
    same._group = heading;
    return same;
}

void Command::ShowExample(const std::string& call) const
{
    _app->footer("Example:\n  " + call);
}

CLI::Option* Command::Place(CLI::Option* option) const
{
    if (!_group.empty()) {
        option->group(_group);
    }
    return option;
}

void Command::WhenNamed(const std::function<void()>& action) const
{
    _app->callback(action);
}

Option Command::AddOption(
    const std::string& name, std::string& value, const std::string& description) const
{
    return Option(*Place(_app->add_option(name, value, description)));
}

Option Command::AddOption(
    const std::string& name,
    std::optional<std::string>& value,
    const std::string& description) const
{
    return Option(*Place(_app->add_option(name, value, description)));
}

Option Command::AddOption(
    const std::string& name, std::vector<std::string>& value, const std::string& description) const
{
    return Option(*Place(_app->add_option(name, value, description)));
}

Option Command::AddOption(
    const std::string& name, std::set<std::string>& value, const std::string& description) const
{
    return Option(*Place(_app->add_option(name, value, description)));
}

Option Command::AddOption(
    const std::string& name, long long& value, const std::string& description) const
{
    return Option(*Place(_app->add_option(name, value, description)->check(CheckSeconds)));
}

Option Command::AddOption(
    const std::string& name, const TextSink& sink, const std::string& description) const
{
    return Option(*Place(_app->add_option_function<std::string>(name, sink, description)));
}

Option Command::AddPairOption(
    const std::string& name, const PairsSink& sink, const std::string& description) const
{
    // Each pair needs the name before it, so that a third word is not taken for another pair.
    return Option(*Place(_app->add_option_function<std::vector<Pair>>(name, sink, description)
                             ->allow_extra_args(false)));
}

void Command::AddFlag(const std::string& name, bool& value, const std::string& description) const
{
    Place(_app->add_flag(name, value, description)->disable_flag_override());
}

void Command::AddFlag(
    const std::string& name,
    const std::function<void()>& action,
    const std::string& description) const
{
    Place(_app->add_flag_callback(name, action, description)->disable_flag_override());
}

CommandLine::CommandLine(
    const std::string& program, const std::string& version, const std::string& description)
    : _app(std::make_unique<CLI::App>(description, program))
{
    _app->set_version_flag("--version", program + " " + version);
    _app->formatter(std::make_shared<HelpFormatter>());
}

CommandLine::~CommandLine() = default;

Command CommandLine::GetRoot() const
{
    return Command(*_app);
}

std::string CommandLine::GetHelp() const
{
    return _app->help();
}

std::vector<std::string> CommandLine::GetOptions(const std::vector<std::string>& arguments) const
{
    const CLI::App* command = _app.get();
    for (const std::string& word : arguments) {
        const CLI::App* below = FindCommand(*command, word);
        if (below == nullptr) {
            break;
        }
        command = below;
    }
    return GetOptionNames(*command);
}

CommandDescription CommandLine::Describe() const
{
    return DescribeAll(*_app);
}

bool CommandLine::Parse(const std::vector<std::string>& arguments) const
{
    try {
        std::vector<std::string> reversed = TranslateWordsForOptions(*_app, arguments);
        std::reverse(reversed.begin(), reversed.end());
        _app->parse(std::move(reversed)); // takes them from the end
    } catch (const CLI::Success& request) {
        _app->exit(request); // prints what was asked for
        return false;
    } catch (const CLI::ParseError& error) {
        ThrowParseError(*_app, error, arguments);
    }
    RequireCommand(GetNamedCommand(*_app));
    return true;
}

bool ToNumber(const std::string& text, long long& number)
{
    return CLI::detail::lexical_cast(text, number);
}
