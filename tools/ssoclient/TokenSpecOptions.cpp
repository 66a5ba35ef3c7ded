#include "TokenSpecOptions.h"

#include "Arguments.h"
#include "ExitCode.h"

#include <algorithm>

namespace {

/** The words of one `--advice`. */
using AdviceWords = Command::Pair;

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

constexpr char SpecGroup[] = "The token that is asked for";

void AddAdvice(std::vector<SsoClient::Advice>& advice, const AdviceWords& words)
{
    const auto& [source, attribute] = words;
    const std::size_t end = attribute.find('=');
    if (end == 0 || end == std::string::npos) {
        throw UsageError("--advice: `" + attribute + "' is not NAME=VALUE");
    }
    SsoClient::Advice& ofSource = FindOrAdd(advice, &SsoClient::Advice::source, source);
    FindOrAdd(ofSource.attributes, &SsoClient::AdviceAttribute::name, attribute.substr(0, end))
        .values.push_back(attribute.substr(end + 1));
}

} // namespace

void TokenSpecOptions::AddTo(const Command& owner)
{
    const Command command = owner.InGroup(SpecGroup);
    command.AddOption("--lifetime", spec.tokenLifetimeSec, "Lifetime of the token in seconds")
        .ShowDefault()
        .Check(CheckLifetime)
        .ValueName("SEC");
    command.AddFlag("--renewable", spec.renewable, "Ask for a token that can be renewed");
    command.AddFlag("--delegable", spec.delegable, "Ask for a token that can be delegated");
    command
        .AddOption(
            "--delegate-to",
            [this](const std::string& name) { spec.delegateTo = name; },
            "Ask for a token delegated to this principal")
        .Check(CheckName)
        .ValueName("NAME");
    command.AddOption("--audience", spec.audienceRestriction, "Restrict the token to these parties")
        .Check(CheckNotEmptyText)
        .ValueName("URI");
    command
        .AddPairOption(
            "--advice",
            [this](const std::vector<AdviceWords>& entries) {
                for (const AdviceWords& entry : entries) {
                    AddAdvice(spec.advice, entry);
                }
            },
            "Ask for this attribute in the token's advice; may repeat")
        .Check(CheckText)
        .ValueName("SOURCE NAME=VALUE");
}

void TokenSpecOptions::AddBearerTo(const Command& command)
{
    command.InGroup(SpecGroup).AddFlag(
        "--bearer",
        [this] { spec.confirmation = SsoClient::TokenSpec::CONFIRMATION_BEARER; },
        "Ask for a bearer token, although there is a key");
}
