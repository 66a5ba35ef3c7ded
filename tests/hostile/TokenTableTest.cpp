#include "TokenTable.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <iterator>

namespace HostileTests {

namespace {

std::vector<TokenCase> Select(bool accepted)
{
    std::vector<TokenCase> cases;
    std::copy_if(
        GetTokenTable().begin(),
        GetTokenTable().end(),
        std::back_inserter(cases),
        [accepted](const TokenCase& line) { return line.refusals.empty() == accepted; });
    return cases;
}

/** The file's name without folder and suffix, in the letters that a test's name may have. */
std::string NameOf(const testing::TestParamInfo<TokenCase>& info)
{
    std::string name = std::filesystem::path(info.param.file).stem().string();
    std::replace_if(
        name.begin(),
        name.end(),
        [](unsigned char letter) { return std::isalnum(letter) == 0; },
        '_');
    return name;
}

class AcceptedToken : public testing::TestWithParam<TokenCase>
{};

class RefusedToken : public testing::TestWithParam<TokenCase>
{};

} // namespace

TEST_P(AcceptedToken, GivesItsFacts)
{
    const TokenCase& line = GetParam();
    const Verdict verdict = Judge(ReadToken(line), GetConditions(line));
    ASSERT_TRUE(verdict.IsAccepted()) << line.about << "\n" << Describe(verdict);
    EXPECT_EQ(*verdict.facts, line.facts) << line.about;
}

TEST_P(RefusedToken, SaysWhy)
{
    const TokenCase& line = GetParam();
    const Verdict verdict = Judge(ReadToken(line), GetConditions(line));
    EXPECT_TRUE(IsAmong(verdict, line.refusals))
        << line.file << "\nrule:     " << line.rule << "\nspecial:  " << line.about
        << "\nfound:    " << Describe(verdict) << "\nexpected: " << Describe(line.refusals);
}

INSTANTIATE_TEST_SUITE_P(Table, AcceptedToken, testing::ValuesIn(Select(true)), NameOf);
INSTANTIATE_TEST_SUITE_P(Table, RefusedToken, testing::ValuesIn(Select(false)), NameOf);

TEST(TokenTable, NamesEveryFile)
{
    const std::filesystem::recursive_directory_iterator entries(TEST_DATA_DIR "/tokens");
    const auto files = std::count_if(begin(entries), end(entries), [](const auto& entry) {
        return entry.is_regular_file() && entry.path().extension() != ".json";
    });
    EXPECT_EQ(static_cast<std::size_t>(files), GetTokenTable().size());
}

TEST(TokenTable, TellsTheRuleThatEachRefusedTokenBreaks)
{
    for (const TokenCase& line : GetTokenTable()) {
        EXPECT_EQ(line.refusals.empty(), line.rule.empty()) << line.file;
    }
}

} // namespace HostileTests
