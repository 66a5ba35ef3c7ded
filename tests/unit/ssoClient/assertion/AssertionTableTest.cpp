#include "unit/ssoClient/assertion/AssertionTable.h"

#include "quillon/Exceptions.h"

#include <boost/core/demangle.hpp>
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <iterator>
#include <typeinfo>

namespace AssertionTable {

namespace {

std::vector<Row> Select(bool accepted)
{
    std::vector<Row> rows;
    std::copy_if(
        GetRows().begin(), GetRows().end(), std::back_inserter(rows), [accepted](const Row& row) {
            return row.className.empty() == accepted;
        });
    return rows;
}

std::ptrdiff_t CountAccepted(const std::string& folder)
{
    const std::vector<Row> rows = Select(true);
    return std::count_if(
        rows.begin(), rows.end(), [&folder](const Row& row) { return row.folder == folder; });
}

/** The file's name without folder and suffix, in the letters that a test's name may have. */
std::string NameOfRow(const testing::TestParamInfo<Row>& info)
{
    std::string name = std::filesystem::path(info.param.file).stem().string();
    std::replace_if(
        name.begin(),
        name.end(),
        [](unsigned char letter) { return std::isalnum(letter) == 0; },
        '_');
    return name;
}

class AcceptedAssertion : public testing::TestWithParam<Row>
{};

class RefusedAssertion : public testing::TestWithParam<Row>
{};

} // namespace

// [SAML-CORE 2]
TEST_P(AcceptedAssertion, GivesItsFacts)
{
    const Row& row = GetParam();
    const auto assertion = Verify(row);
    EXPECT_EQ(DescribeFacts(*assertion), row.facts) << row.about;
    EXPECT_EQ(assertion->ToXml(), Read(row));
}

TEST_P(RefusedAssertion, SaysWhy)
{
    const Row& row = GetParam();
    std::string className;
    std::string text;
    try {
        text = DescribeFacts(*Verify(row));
    } catch (const Quillon::Exception& error) {
        className = boost::core::demangle(typeid(error).name());
        text = error.what();
    }
    EXPECT_EQ(className, row.className) << row.about << "\n" << text;
    EXPECT_NE(text.find(row.contains), std::string::npos)
        << row.about << "\nfound: " << text << "\nexpected: " << row.contains;
}

INSTANTIATE_TEST_SUITE_P(Table, AcceptedAssertion, testing::ValuesIn(Select(true)), NameOfRow);
INSTANTIATE_TEST_SUITE_P(Table, RefusedAssertion, testing::ValuesIn(Select(false)), NameOfRow);

TEST(AssertionTable, NamesEveryFile)
{
    std::size_t files = 0;
    for (const char* folder :
         {"assertions/accepted", "assertions/refused", "peers/accepted", "peers/refused"}) {
        const std::filesystem::directory_iterator entries(
            std::filesystem::path(TEST_DATA_DIR) / folder);
        files += static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
    }
    EXPECT_EQ(files, GetRows().size());
    EXPECT_GE(CountAccepted("assertions"), 60);
    EXPECT_GE(CountAccepted("peers"), 60);
    EXPECT_EQ(Select(true).size(), Select(false).size());
}

} // namespace AssertionTable
