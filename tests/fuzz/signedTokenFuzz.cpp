#include "fuzz/fuzzing.h"
#include "hostile/TokenTable.h"

#include <regex>
#include <set>

// Whatever is done to a signed token without the key: if it is still accepted, it says what one of
// the genuine ones says.
namespace {

using namespace HostileTests;

/**
 * Without the blanks at the ends of values, which whoever passes a token on can take off by a
 * comment beside them; docs/threat-model.md says what follows.
 */
std::string WithoutOuterBlanks(const std::string& facts)
{
    static const std::regex Blanks(R"re(( |\\(9|10|13);)*"( |\\(9|10|13);)*)re");
    return std::regex_replace(facts, Blanks, "\"");
}

/** All that the tokens of the table say which the same service signed, under the same clock. */
struct Genuine
{
    Conditions conditions;
    std::set<std::string> facts;
};

Genuine ReadGenuine()
{
    const TokenCase& first = GetTokenCase("accepted/bearer.xml");
    Genuine genuine{GetConditions(first), {}};
    for (const TokenCase& tokenCase : GetTokenTable()) {
        const Verdict verdict = Judge(ReadToken(tokenCase), genuine.conditions);
        if (verdict.IsAccepted()) {
            genuine.facts.insert(WithoutOuterBlanks(*verdict.facts));
        }
    }
    Fuzzing::Require(
        genuine.facts.size() > 30,
        "only " + std::to_string(genuine.facts.size()) + " genuine tokens differ");
    return genuine;
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    static const Genuine genuine = ReadGenuine();
    const std::string text(Fuzzing::ToText(data, size));
    for (const auto& judge : {&Judge, &JudgeInDom}) {
        const Verdict verdict = judge(text, genuine.conditions);
        Fuzzing::Require(
            !verdict.IsAccepted() || genuine.facts.count(WithoutOuterBlanks(*verdict.facts)) == 1,
            "accepted with other facts:\n" + verdict.facts.value_or(""));
    }
    return 0;
}
