#include "fuzz/fuzzing.h"
#include "hostile/TokenTable.h"

#include <map>
#include <set>

// Whatever is done to a signed token without the key: if it is still accepted, it says what one of
// the genuine ones says.
namespace {

using namespace HostileTests;

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
            genuine.facts.insert(*verdict.facts);
        }
    }
    Fuzzing::Require(genuine.facts.size() > 50, "there are hardly any genuine tokens");
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
            !verdict.IsAccepted() || genuine.facts.count(*verdict.facts) == 1,
            "accepted with other facts:\n" + verdict.facts.value_or(""));
    }
    return 0;
}
