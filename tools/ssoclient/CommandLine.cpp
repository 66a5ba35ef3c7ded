#include "CommandLine.h"

#include "ExitCode.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <CLI/Validators.hpp>

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
    return Command(*_app->add_subcommand(name, description));
}

void Command::WhenNamed(const std::function<void()>& action) const
{
    _app->callback(action);
}

Option Command::AddOption(
    const std::string& name, std::string& value, const std::string& description) const
{
    return Option(*_app->add_option(name, value, description));
}

Option Command::AddOption(
    const std::string& name,
    std::optional<std::string>& value,
    const std::string& description) const
{
    return Option(*_app->add_option(name, value, description));
}

Option Command::AddOption(
    const std::string& name, std::vector<std::string>& value, const std::string& description) const
{
    return Option(*_app->add_option(name, value, description));
}

Option Command::AddOption(
    const std::string& name, std::set<std::string>& value, const std::string& description) const
{
    return Option(*_app->add_option(name, value, description));
}

Option Command::AddOption(
    const std::string& name, long long& value, const std::string& description) const
{
    return Option(*_app->add_option(name, value, description));
}

Option Command::AddOption(
    const std::string& name, const TextSink& sink, const std::string& description) const
{
    return Option(*_app->add_option_function<std::string>(name, sink, description));
}

Option Command::AddPairOption(
    const std::string& name, const PairsSink& sink, const std::string& description) const
{
    // Each pair needs the name before it, so that a third word is not taken for another pair.
    return Option(*_app->add_option_function<std::vector<Pair>>(name, sink, description)
                       ->allow_extra_args(false));
}

void Command::AddFlag(const std::string& name, bool& value, const std::string& description) const
{
    _app->add_flag(name, value, description);
}

void Command::AddFlag(
    const std::string& name,
    const std::function<void()>& action,
    const std::string& description) const
{
    _app->add_flag_callback(name, action, description);
}

CommandLine::CommandLine(
    const std::string& program, const std::string& version, const std::string& description)
    : _app(std::make_unique<CLI::App>(description, program))
{
    _app->set_version_flag("--version", program + " " + version);
}

CommandLine::~CommandLine() = default;

Command CommandLine::GetRoot() const
{
    return Command(*_app);
}

bool CommandLine::Parse(int argc, const char* const* argv) const
{
    try {
        _app->parse(argc, argv);
        return true;
    } catch (const CLI::Success& request) {
        _app->exit(request); // prints what was asked for
        return false;
    } catch (const CLI::ParseError& error) {
        throw UsageError(error.what());
    }
}

bool ToNumber(const std::string& text, long long& number)
{
    return CLI::detail::lexical_cast(text, number);
}
