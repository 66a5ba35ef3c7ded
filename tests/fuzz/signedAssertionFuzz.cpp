#include "fuzz/fuzzing.h"
#include "quillon/system/Clock.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "unit/ssoClient/assertion/AssertionTable.h"

#include <set>

// The same for assertions of any producer, encrypted ones too: changed without the key, they say
// nothing else.
namespace {

const SsoClient::AssertionRules& GetRules()
{
    static const SsoClient::AssertionRules rules = [] {
        SsoClient::AssertionRules result;
        result.decryptionKeys = {GetTestKey("client")};
        return result;
    }();
    return rules;
}

std::set<std::string> ReadGenuine()
{
    std::set<std::string> facts;
    for (const AssertionTable::Row& row : AssertionTable::GetRows()) {
        if (row.facts.empty()) {
            continue;
        }
        try {
            facts.insert(AssertionTable::DescribeFacts(
                *AssertionTable::Verify(AssertionTable::Read(row), GetRules())));
        } catch (const Quillon::Exception&) {
            continue; // it needs rules of its own
        }
    }
    Fuzzing::Require(facts.size() > 50, "there are hardly any genuine assertions");
    return facts;
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    static const std::set<std::string> genuine = ReadGenuine();
    try {
        const auto assertion =
            AssertionTable::Verify(std::string(Fuzzing::ToText(data, size)), GetRules());
        const std::string facts = AssertionTable::DescribeFacts(*assertion);
        Fuzzing::Require(genuine.count(facts) == 1, "accepted with other facts:\n" + facts);
    } catch (const Quillon::Exception&) {
        return 0;
    }
    return 0;
}
