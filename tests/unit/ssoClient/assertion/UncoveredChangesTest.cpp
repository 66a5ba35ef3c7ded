#include "unit/ssoClient/assertion/AssertionTable.h"

#include "quillon/Exceptions.h"

#include <gtest/gtest.h>

#include <cctype>

// A signature does not cover comments, nor in the exclusive form the declarations that no name
// uses: whoever passes an assertion on may put them in. That must not change what is read.
namespace AssertionTable {

namespace {

/** What is read, or nothing if it is refused. */
std::string ReadFacts(const std::string& xml, const Row& row)
{
    try {
        return DescribeFacts(*Verify(xml, row.rules));
    } catch (const Quillon::Exception&) {
        return {};
    }
}

std::string Insert(const std::string& text, std::size_t position, const std::string& inserted)
{
    return std::string(text).insert(position, inserted);
}

struct Outcome
{
    unsigned accepted = 0;
    unsigned refused = 0;
};

void Try(const std::string& changed, const Row& row, std::size_t position, Outcome& outcome)
{
    const std::string facts = ReadFacts(changed, row);
    if (facts.empty()) {
        ++outcome.refused;
        return;
    }
    ++outcome.accepted;
    EXPECT_EQ(facts, row.facts) << row.file << " with a change at " << position;
}

/** Everywhere between tags, and at the borders of texts. */
Outcome InsertComments(const Row& row)
{
    const std::string xml = Read(row);
    Outcome outcome;
    bool isInTag = false;
    for (std::size_t i = 0; i < xml.size(); ++i) {
        isInTag = isInTag ? xml[i - 1] != '>' : false;
        isInTag = isInTag || xml[i] == '<';
        if (!isInTag || xml[i] == '<') {
            Try(Insert(xml, i, "<!-- x -->"), row, i, outcome);
        }
    }
    return outcome;
}

/** In every start tag, before its end. */
Outcome InsertDeclarations(const Row& row, const std::string& declaration)
{
    const std::string xml = Read(row);
    Outcome outcome;
    for (std::size_t start = xml.find('<'); start != std::string::npos;
         start = xml.find('<', start + 1)) {
        if (std::isalnum(static_cast<unsigned char>(xml[start + 1])) != 0) {
            const std::size_t end = xml.find_first_of(" />", start);
            Try(Insert(xml, end, declaration), row, end, outcome);
        }
    }
    return outcome;
}

class UncoveredChange : public testing::TestWithParam<const char*>
{
protected:
    const Row& GetRow() const
    {
        return AssertionTable::GetRow(std::string("accepted/") + GetParam() + ".xml");
    }
};

std::string NameOfDocument(const testing::TestParamInfo<const char*>& info)
{
    std::string name;
    for (const char letter : std::string(info.param)) {
        name += letter == '-' ? '_' : letter;
    }
    return name;
}

} // namespace

TEST_P(UncoveredChange, OfCommentsDoesNotChangeTheFacts)
{
    const Outcome outcome = InsertComments(GetRow());
    EXPECT_GT(outcome.accepted, 10U);
    EXPECT_GT(outcome.refused, 10U);
}

TEST_P(UncoveredChange, OfDeclarationsDoesNotChangeTheFacts)
{
    unsigned accepted = 0;
    for (const char* prefix : {"unused", "xs", "saml", "saml2", "xsi", "del", "s2"}) {
        accepted +=
            InsertDeclarations(
                GetRow(), std::string(" xmlns:") + prefix + "=\"http://www.w3.org/changed\"")
                .accepted;
    }
    accepted += InsertDeclarations(GetRow(), " xmlns=\"urn:changed\"").accepted;
    EXPECT_GT(accepted, 5U);
}

INSTANTIATE_TEST_SUITE_P(
    Documents,
    UncoveredChange,
    testing::Values(
        "adfs-rsa",
        "shibboleth-rsa",
        "pysaml2-rsa",
        "cxf-holder-of-key-rsa",
        "element-values",
        "advice",
        "type-of-a-condition",
        "type-by-a-listed-prefix",
        "uncovered-type-of-a-value",
        "covered-type-of-a-value",
        "context-declaration",
        "comments-at-the-ends"),
    NameOfDocument);

TEST(UncoveredChange, OfATypesNamespaceIsNotEvenSeen)
{
    const Row& row = GetRow("accepted/uncovered-type-of-a-value.xml");
    std::string xml = Read(row);
    const std::string declaration = "xmlns:xs=\"http://www.w3.org/2001/XMLSchema\"";
    xml.replace(xml.find(declaration), declaration.size(), "xmlns:xs=\"urn:changed\"");
    EXPECT_EQ(DescribeFacts(*Verify(xml, row.rules)), row.facts);
}

} // namespace AssertionTable
