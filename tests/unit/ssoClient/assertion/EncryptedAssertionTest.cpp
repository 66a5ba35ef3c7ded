#include "quillon/xml/Parser.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "unit/ssoClient/assertion/AssertionTable.h"

#include <boost/core/demangle.hpp>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <algorithm>
#include <atomic>
#include <cctype>
#include <filesystem>
#include <iterator>
#include <ostream>
#include <thread>
#include <typeinfo>
#include <utility>
#include <vector>

// Other tools have encrypted what is opened here.
namespace SsoClient {

namespace {

using Json = nlohmann::json;

struct Row
{
    std::string file;
    std::string about;
    std::string plain; ///< the assertion of the other table that is in it
    std::vector<std::string> keys;
    std::string className; ///< of a refused one
    std::string contains;
};

std::ostream& operator<<(std::ostream& out, const Row& row)
{
    return out << row.file;
}

std::vector<Row> LoadRows()
{
    std::vector<Row> rows;
    const Json table = Json::parse(ReadTestData("encrypted/expected.json"));
    for (const Json& line : table.at("encrypted")) {
        Row row;
        line.at("file").get_to(row.file);
        line.at("about").get_to(row.about);
        line.at("plain").get_to(row.plain);
        line.at("keys").get_to(row.keys);
        if (line.contains("refusal")) {
            line.at("refusal").at("class").get_to(row.className);
            line.at("refusal").at("contains").get_to(row.contains);
        }
        rows.push_back(std::move(row));
    }
    return rows;
}

std::vector<Row> Select(bool accepted)
{
    std::vector<Row> rows;
    const std::vector<Row> all = LoadRows();
    std::copy_if(all.begin(), all.end(), std::back_inserter(rows), [accepted](const Row& row) {
        return row.className.empty() == accepted;
    });
    return rows;
}

std::string NameOf(const testing::TestParamInfo<Row>& info)
{
    std::string name = std::filesystem::path(info.param.file).stem().string();
    std::replace_if(
        name.begin(),
        name.end(),
        [](unsigned char letter) { return std::isalnum(letter) == 0; },
        '_');
    return name;
}

AssertionRules RulesOf(const Row& row)
{
    AssertionRules rules = AssertionTable::GetRow(row.plain).rules;
    for (const std::string& key : row.keys) {
        rules.decryptionKeys.push_back(GetTestKey(key));
    }
    return rules;
}

std::string Read(const Row& row)
{
    return ReadTestData("encrypted/" + row.file);
}

/** The class and the text of what is thrown. */
std::pair<std::string, std::string> GetFailure(const std::string& xml, const AssertionRules& rules)
{
    try {
        return {"", AssertionTable::DescribeFacts(*AssertionTable::Verify(xml, rules))};
    } catch (const Quillon::Exception& error) {
        return {boost::core::demangle(typeid(error).name()), error.what()};
    }
}

/** A document with `octets` encrypted octets. */
std::string MakeDocument(std::size_t octets)
{
    std::string xml = ReadTestData("encrypted/accepted/aes256-gcm.xml");
    const std::string mark = "<xenc:CipherValue>";
    const std::size_t begin = xml.rfind(mark) + mark.size();
    xml.replace(begin, xml.find('<', begin) - begin, std::string(octets / 3 * 4, 'A'));
    return xml;
}

class AcceptedEncrypted : public testing::TestWithParam<Row>
{};

class RefusedEncrypted : public testing::TestWithParam<Row>
{};

} // namespace

// [SAML-CORE 2.3.4]
TEST_P(AcceptedEncrypted, GivesTheFactsOfWhatIsInIt)
{
    const Row& row = GetParam();
    const AssertionTable::Row& plain = AssertionTable::GetRow(row.plain);
    const auto assertion = AssertionTable::Verify(Read(row), RulesOf(row));
    EXPECT_EQ(AssertionTable::DescribeFacts(*assertion), plain.facts) << row.about;
    const auto again = AssertionTable::Verify(assertion->ToXml(), plain.rules);
    EXPECT_EQ(AssertionTable::DescribeFacts(*again), plain.facts);
}

TEST_P(RefusedEncrypted, SaysWhy)
{
    const Row& row = GetParam();
    const auto [className, text] = GetFailure(Read(row), RulesOf(row));
    EXPECT_EQ(className, row.className) << row.about << "\n" << text;
    EXPECT_NE(text.find(row.contains), std::string::npos)
        << row.about << "\nfound: " << text << "\nexpected: " << row.contains;
}

INSTANTIATE_TEST_SUITE_P(Table, AcceptedEncrypted, testing::ValuesIn(Select(true)), NameOf);
INSTANTIATE_TEST_SUITE_P(Table, RefusedEncrypted, testing::ValuesIn(Select(false)), NameOf);

TEST(EncryptedTable, NamesEveryFile)
{
    std::size_t files = 0;
    for (const char* folder : {"accepted", "refused"}) {
        const std::filesystem::directory_iterator entries(
            std::filesystem::path(TEST_DATA_DIR "/encrypted") / folder);
        files += static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
    }
    EXPECT_EQ(files, LoadRows().size());
    EXPECT_GE(Select(true).size(), 20U);
    EXPECT_GT(Select(false).size(), Select(true).size());
}

// [XMLENC11 6.1]: what somebody without the key could learn from is said in one text alone.
TEST(EncryptedAssertion, DoesNotTellWhichStepOfDecryptingFails)
{
    for (const char* name :
         {"tag-changed", "for-somebody-else", "oaep-other-mask-than-said", "nothing"}) {
        const Row row{std::string("refused/") + name + ".xml", "", "", {"client"}, "", ""};
        AssertionRules rules;
        rules.decryptionKeys = {GetTestKey("client")};
        EXPECT_EQ(
            GetFailure(Read(row), rules).second,
            "The assertion cannot be decrypted with the keys of the rules")
            << name;
    }
}

TEST(EncryptedAssertion, IsRefusedWithoutAKey)
{
    const std::string xml = ReadTestData("encrypted/accepted/aes256-gcm.xml");
    EXPECT_EQ(
        GetFailure(xml, {}).second,
        "The assertion is encrypted, and the rules have no key to decrypt it");
}

TEST(EncryptedAssertion, IsDecryptedWithRsaKeysOnly)
{
    const std::string plain =
        AssertionTable::Read(AssertionTable::GetRow("accepted/no-statement.xml"));
    AssertionRules rules;
    rules.decryptionKeys = {GetTestKey("client"), nullptr};
    EXPECT_EQ(
        GetFailure(plain, rules),
        std::make_pair(
            std::string("Quillon::InvalidArgumentException"),
            std::string("Invalid argument : A decryption key is null")));
    rules.decryptionKeys = {GetTestKey("sts-p256")};
    EXPECT_EQ(
        GetFailure(plain, rules).second,
        "Invalid argument : A decryption key is of type EC prime256v1, expected RSA");
}

TEST(EncryptedAssertion, IsNoLargerThanADocument)
{
    AssertionRules rules;
    rules.decryptionKeys = {GetTestKey("client")};
    constexpr std::size_t MiB = std::size_t{1024} * 1024;
    EXPECT_EQ(
        GetFailure(MakeDocument(5 * MiB), rules).second,
        "The assertion cannot be decrypted with the keys of the rules");
    EXPECT_EQ(GetFailure(MakeDocument(6 * MiB), rules).first, "Quillon::Xml::XMLParseException");
}

TEST(EncryptedAssertion, IsOpenedWithOneKeyFromManyThreads)
{
    const FixedClock clock(AssertionTable::GetNow());
    const std::string xml = ReadTestData("encrypted/accepted/aes256-gcm.xml");
    AssertionRules rules;
    rules.decryptionKeys = {GetTestKey("client")};
    std::vector<std::thread> threads;
    threads.reserve(4);
    std::atomic<int> opened{0};
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            opened += VerifyAssertion(xml, AssertionTable::GetTrusted(), rules) != nullptr ? 1 : 0;
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(opened, 4);
}

} // namespace SsoClient
