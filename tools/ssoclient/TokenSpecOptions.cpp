#include "TokenSpecOptions.h"

#include "Arguments.h"

#include <CLI/Error.hpp>

#include <algorithm>
#include <utility>

namespace {

/** The words of one `--advice`. */
using AdviceWords = std::pair<std::string, std::string>;

/** The entry whose `key` is `value`; a new one at the end if there is none. */
template <class Entry>
Entry& FindOrAdd(std::vector<Entry>& entries, std::string Entry::*key, const std::string& value)
{
    const auto found = std::find_if(
        entries.begin(), entries.end(), [&](const Entry& entry) { return entry.*key == value; });
    if (found != entries.end()) {
        return *found;
    }
    Entry& added = entries.emplace_back();
    added.*key = value;
    return added;
}

void AddAdvice(std::vector<SsoClient::Advice>& advice, const AdviceWords& words)
{
    const auto& [source, attribute] = words;
    const std::size_t end = attribute.find('=');
    if (end == 0 || end == std::string::npos) {
        throw CLI::ValidationError("--advice", "`" + attribute + "' is not NAME=VALUE");
    }
    SsoClient::Advice& ofSource = FindOrAdd(advice, &SsoClient::Advice::source, source);
    FindOrAdd(ofSource.attributes, &SsoClient::AdviceAttribute::name, attribute.substr(0, end))
        .values.push_back(attribute.substr(end + 1));
}

} // namespace

void TokenSpecOptions::AddTo(CLI::App& command)
{
    command.add_option("--lifetime", spec.tokenLifetimeSec, "Lifetime of the token in seconds")
        ->capture_default_str()
        ->check(CheckLifetime)
        ->type_name("SEC");
    command.add_flag("--renewable", spec.renewable, "Ask for a token that can be renewed");
    command.add_flag("--delegable", spec.delegable, "Ask for a token that can be delegated");
    command
        .add_option_function<std::string>(
            "--delegate-to",
            [this](const std::string& name) { spec.delegateTo = name; },
            "Ask for a token delegated to this principal")
        ->check(CheckName)
        ->type_name("NAME");
    command
        .add_option("--audience", spec.audienceRestriction, "Restrict the token to these parties")
        ->check(CheckNotEmpty)
        ->type_name("URI");
    command
        .add_option_function<std::vector<AdviceWords>>(
            "--advice",
            [this](const std::vector<AdviceWords>& entries) {
                for (const AdviceWords& entry : entries) {
                    AddAdvice(spec.advice, entry);
                }
            },
            "Ask for this attribute in the token's advice; may repeat")
        ->allow_extra_args(false)
        ->type_name("SOURCE NAME=VALUE");
}

void TokenSpecOptions::AddBearerTo(CLI::App& command)
{
    command.add_flag_callback(
        "--bearer",
        [this] { spec.confirmation = SsoClient::TokenSpec::CONFIRMATION_BEARER; },
        "Ask for a bearer token, although there is a key");
}
