#pragma once

#include "quillon/crypto/Certificate.h"
#include "ssoClient/SamlToken.h"

#include <list>
#include <optional>
#include <string>
#include <vector>

namespace HostileTests {

using Certificates = std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>;

/** One way in which a token may be refused. Empty texts are not asked for. */
struct Refusal
{
    std::string className; ///< qualified; `Quillon::Exception` stands for any class below it
    std::string message;   ///< the whole text
    std::string prefix;
    std::string contains;
};

/** What the library said of a token: its facts, or the exception. */
struct Verdict
{
    std::optional<std::string> facts;
    std::string className;
    std::string message;

    bool IsAccepted() const { return facts.has_value(); }
};

/** The circumstances under which a token is judged. */
struct Conditions
{
    Certificates trusted;
    long long nowMicros = 0;
    long long toleranceSec = 0;
};

/**
 * Builds a token from `xml`. Only exceptions of the library become a verdict; anything else passes
 * through, and fails the test.
 */
Verdict Judge(const std::string& xml, const Conditions& conditions);

/** The same from a parsed document, of which the token is the root. */
Verdict JudgeInDom(const std::string& xml, const Conditions& conditions);

/** Everything that a token answers, one line each, as the table's facts are put too. */
std::string DescribeFacts(const SsoClient::SamlToken& token);

/** Whether the verdict is one of the refusals. */
bool IsAmong(const Verdict& verdict, const std::vector<Refusal>& refusals);

std::string Describe(const Verdict& verdict);
std::string Describe(const std::vector<Refusal>& refusals);

/** `text` between quotes, with quotes, backslashes and control characters escaped. */
std::string Quote(const std::string& text);

} // namespace HostileTests
