#include "Profile.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "Files.h"
#include "Neighbour.h"
#include "PrivateKeys.h"
#include "tomlText.h"

#include "quillon/MessageFormatter.h"

#define TOML_ENABLE_FORMATTERS 0
#include <toml++/toml.h>

#include <algorithm>
#include <cstdlib>

using Quillon::MessageFormatter;

namespace {

using Words = std::vector<std::string>;

constexpr char ProfileOption[] = "--profile";

struct Key
{
    const char* name;
    bool isFile;
    bool mayRepeat;
};
constexpr Key Keys[] = {
    {"url", false, false},
    {"trust", true, true},
    {"ca", true, true},
    {"user", false, false},
    {"key", true, false},
    {"cert", true, false},
};

Words GetKeyNames()
{
    Words names;
    for (const Key& key : Keys) {
        names.emplace_back(key.name);
    }
    return names;
}

std::string Join(const Words& words)
{
    std::string text;
    for (const std::string& word : words) {
        text += (text.empty() ? "" : ", ") + word;
    }
    return text;
}

/** The end of a sentence about a name that there is not. */
std::string SuggestOneOf(const std::string& typed, const Words& names)
{
    const std::string near = FindNeighbour(typed, names);
    return near.empty() ? ", only " + Join(names) : "; did you mean " + near + "?";
}

[[noreturn]] void ThrowAt(
    const std::string& file, const toml::source_region& place, const std::string& what)
{
    throw UsageError(MessageFormatter::ASPrint("`%1' line %2: %3", file, place.begin.line, what));
}

toml::table ParseToml(const std::string& text, const std::string& file)
{
    if (const long line = FindForeignCharacter(text); line != 0) {
        throw UsageError(MessageFormatter::ASPrint(
            "`%1' line %2: a character that is not ASCII stands outside of quotes", file, line));
    }
    try {
        return toml::parse(text);
    } catch (const toml::parse_error& error) {
        ThrowAt(file, error.source(), std::string(error.description()));
    }
}

const toml::table& FindTable(
    const toml::table& root, const std::string& file, const std::string& name)
{
    const toml::node* const node = root.get(name);
    if (node == nullptr) {
        Words names;
        for (const auto& entry : root) {
            names.emplace_back(entry.first.str());
        }
        throw UsageError(MessageFormatter::ASPrint(
            "`%1' has no profile `%2'%3",
            file,
            name,
            names.empty() ? "" : SuggestOneOf(name, names)));
    }
    if (!node->is_table()) {
        ThrowAt(file, node->source(), "`" + name + "' is no profile, which begins with [NAME]");
    }
    return *node->as_table();
}

std::string Resolve(const std::string& value, const Key& key, const std::string& file)
{
    const bool isWhole = value.front() == '/' || (key.name == std::string("key") && IsUri(value));
    return !key.isFile || isWhole ? value : file.substr(0, file.rfind('/') + 1) + value;
}

/** @param isItem  whether `node` stands in an array. */
std::string ReadText(
    const toml::node& node, const Key& key, const std::string& file, bool isItem = false)
{
    const toml::value<std::string>* const text = node.as_string();
    if (text == nullptr) {
        const bool mayBeArray = key.mayRepeat && !isItem;
        ThrowAt(
            file,
            node.source(),
            MessageFormatter::ASPrint(
                "%1 must be a text in quotes%2",
                key.name,
                mayBeArray ? ", or an array of such" : ""));
    }
    if (text->get().empty()) {
        ThrowAt(file, node.source(), std::string(key.name) + " must not be empty");
    }
    return Resolve(text->get(), key, file);
}

Words ReadValues(const toml::node& node, const Key& key, const std::string& file)
{
    const toml::array* const items = node.as_array();
    if (items == nullptr || !key.mayRepeat) {
        return {ReadText(node, key, file)};
    }
    if (items->empty()) {
        ThrowAt(file, items->source(), std::string(key.name) + " must not be empty");
    }
    Words values;
    for (const toml::node& item : *items) {
        values.push_back(ReadText(item, key, file, true));
    }
    return values;
}

const Key& FindKey(const toml::key& name, const std::string& file)
{
    const std::string text(name.str());
    const auto* const found = std::find_if(
        std::begin(Keys), std::end(Keys), [&](const Key& key) { return text == key.name; });
    if (found == std::end(Keys)) {
        ThrowAt(
            file,
            name.source(),
            "there is no key `" + text + "'" + SuggestOneOf(text, GetKeyNames()));
    }
    return *found;
}

/** The words of a command line before those that are none of its options. */
Words GetOptionWords(const Words& arguments)
{
    return Words(arguments.begin(), std::find(arguments.begin(), arguments.end(), "--"));
}

bool IsGiven(const Words& words, const std::string& option)
{
    return std::any_of(words.begin(), words.end(), [&](const std::string& word) {
        return word == option || word.rfind(option + "=", 0) == 0;
    });
}

/** The last value of an option; empty if it has none, which the parser tells. */
std::string FindValue(const Words& words, const std::string& option)
{
    std::string value;
    for (std::size_t i = 0; i < words.size(); ++i) {
        if (words[i].rfind(option + "=", 0) == 0) {
            value = words[i].substr(option.size() + 1);
        } else if (words[i] == option && i + 1 < words.size()) {
            value = words[i + 1];
        }
    }
    return value;
}

std::string GetEnvironment(const char* name)
{
    const char* const value = std::getenv(name);
    return value == nullptr ? "" : value;
}

} // namespace

std::string GetProfileFile()
{
    constexpr char Name[] = "/ssoclient/config.toml";
    // A relative path is to be ignored [XDG Base Directory Specification, Basics].
    const std::string configuration = GetEnvironment("XDG_CONFIG_HOME");
    if (!configuration.empty() && configuration.front() == '/') {
        return configuration + Name;
    }
    const std::string home = GetEnvironment("HOME");
    if (home.empty()) {
        throw UsageError("--profile: neither XDG_CONFIG_HOME nor HOME says where profiles are");
    }
    return home + "/.config" + Name;
}

Profile ParseProfile(const std::string& text, const std::string& file, const std::string& name)
{
    const toml::table root = ParseToml(text, file);
    Profile profile = {name, file, {}};
    for (const auto& [key, node] : FindTable(root, file, name)) {
        const Key& known = FindKey(key, file);
        profile.values[known.name] = ReadValues(node, known, file);
    }
    return profile;
}

Profile ReadProfile(const std::string& name)
{
    const std::string file = GetProfileFile();
    return ParseProfile(ReadFile(file), file, name);
}

void AddProfileTo(const Command& command)
{
    command
        .AddOption(
            ProfileOption,
            [](const std::string&) {},
            "Take url, trust, ca, user, key and cert from this profile of "
            "~/.config/ssoclient/config.toml; options win over it")
        .Check(CheckNotEmpty)
        .ValueName("NAME");
}

std::vector<std::string> AddProfile(
    const std::vector<std::string>& arguments, const std::vector<std::string>& options)
{
    const Words given = GetOptionWords(arguments);
    const std::string name = FindValue(given, ProfileOption);
    const auto isOption = [&](const std::string& word) {
        return std::find(options.begin(), options.end(), word) != options.end();
    };
    if (name.empty() || !isOption(&ProfileOption[2])) {
        return arguments;
    }
    Words words = given;
    for (const auto& [key, values] : ReadProfile(name).values) {
        const std::string option = "--" + key;
        if (!isOption(key) || IsGiven(given, option)) {
            continue;
        }
        for (const std::string& value : values) {
            words.push_back(MessageFormatter::ASPrint("%1=%2", option, value));
        }
    }
    words.insert(words.end(), arguments.begin() + static_cast<long>(given.size()), arguments.end());
    return words;
}
