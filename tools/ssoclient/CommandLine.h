#pragma once

#include "CommandDescription.h"

#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

// The parser of the command line. Its own headers take longer to compile than the rest of a
// command, so that only one source includes them.

namespace CLI {
class App;
class Option;
} // namespace CLI

/** An option that was added to a command; lives as long as the `CommandLine`. */
class Option
{
public:
    explicit Option(CLI::Option& option) noexcept
        : _option(&option)
    {}

    Option Required() const;
    /** The value is refused with the text that `check` returns, unless that is empty. */
    Option Check(std::string (*check)(const std::string& value)) const;
    Option Between(long long least, long long most) const;
    Option Needs(const Option& other) const;
    Option Excludes(const Option& other) const;
    /** What the help calls the value. */
    Option ValueName(const std::string& name) const;
    /** The help shows the value that the variable had when this was called. */
    Option ShowDefault() const;

private:
    CLI::Option* _option;
};

/** A command, which may have commands below it; lives as long as the `CommandLine`. */
class Command
{
public:
    using TextSink = std::function<void(const std::string&)>;
    using Pair = std::pair<std::string, std::string>;
    using PairsSink = std::function<void(const std::vector<Pair>&)>;

    explicit Command(CLI::App& app) noexcept
        : _app(&app)
    {}

    Command AddCommand(const std::string& name, const std::string& description) const;

    /** The same command; the help shows what is added through it under this heading. */
    Command InGroup(const std::string& heading) const;

    /** The help ends with this call of the command. */
    void ShowExample(const std::string& call) const;

    /** Parsing calls `action` if the command line names this command. */
    void WhenNamed(const std::function<void()>& action) const;

    // Each adds an option whose value parsing puts into `value`, which must outlive the parsing. A
    // name without dashes is that of a positional argument.
    Option AddOption(
        const std::string& name, std::string& value, const std::string& description) const;
    Option AddOption(
        const std::string& name,
        std::optional<std::string>& value,
        const std::string& description) const;
    Option AddOption(
        const std::string& name,
        std::vector<std::string>& value,
        const std::string& description) const;
    Option AddOption(
        const std::string& name,
        std::set<std::string>& value,
        const std::string& description) const;
    /** The value is a number of seconds. */
    Option AddOption(
        const std::string& name, long long& value, const std::string& description) const;
    Option AddOption(
        const std::string& name, const TextSink& sink, const std::string& description) const;

    /** Adds an option of two words that may repeat; `sink` gets all of them. */
    Option AddPairOption(
        const std::string& name, const PairsSink& sink, const std::string& description) const;

    void AddFlag(const std::string& name, bool& value, const std::string& description) const;
    void AddFlag(
        const std::string& name,
        const std::function<void()>& action,
        const std::string& description) const;

private:
    CLI::Option* Place(CLI::Option* option) const;

    CLI::App* _app;
    std::string _group;
};

/** The command line of a program. */
class CommandLine
{
public:
    CommandLine(
        const std::string& program, const std::string& version, const std::string& description);
    CommandLine(const CommandLine&) = delete;
    CommandLine& operator=(const CommandLine&) = delete;
    ~CommandLine();

    /** The command that all others are added to. */
    Command GetRoot() const;

    /**
     * Sets the variables and calls the functions that were given for what the arguments name.
     *
     * @return false if help or the version was asked for, which has then been printed.
     * @throws UsageError  the arguments are not those that were added. The text names what is not
     *                     understood before what is missing, and never a word that belongs to no
     *                     option: it may be a password.
     */
    bool Parse(const std::vector<std::string>& arguments) const;

    /** The long names of the options that the command has which the arguments begin with. */
    std::vector<std::string> GetOptions(const std::vector<std::string>& arguments) const;

    /** All commands with their options, as the help describes them. */
    CommandDescription Describe() const;

    /** What `--help` of the program prints. */
    std::string GetHelp() const;

private:
    std::unique_ptr<CLI::App> _app;
};

/** Converts as the parser does. @return false if `text` is no number, or too large a one. */
bool ToNumber(const std::string& text, long long& number);
