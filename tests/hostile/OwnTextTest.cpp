#include "TokenTable.h"

#include "quillon/system/Clock.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/CreateSamlToken.h"
#include "support/FixedClock.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

// A token answers what its own text says: to make a token of `ToXml()` again changes nothing.
namespace HostileTests {

namespace {

/** The text that a token made of the tree of `xml` gives of itself. */
std::string GetOwnText(const std::string& xml, const Conditions& conditions)
{
    const FixedClock clock(Quillon::System::DateTimeFromUtc(conditions.nowMicros, false));
    const auto handler = Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(xml);
    return SsoClient::CreateSamlTokenFromDom(
               handler->GetDocument()->GetRootElement(),
               conditions.trusted,
               conditions.toleranceSec)
        ->ToXml();
}

/** What comes of the tree of `xml`, and of the text that the token then gives. */
struct Verdicts
{
    Verdicts(const std::string& xml, const Conditions& conditions)
        : ofTree(JudgeInDom(xml, conditions))
    {
        if (ofTree.IsAccepted()) {
            ofOwnText = Judge(GetOwnText(xml, conditions), conditions);
        }
    }

    Verdict ofTree;
    Verdict ofOwnText;
};

bool IsAccepted(const TokenCase& line)
{
    return line.refusals.empty();
}

/** The text between the end of a tag and the next tag. */
struct Span
{
    std::size_t begin;
    std::size_t end;
};

/** The texts of `xml` that are not only white space, outside of its signature. */
std::vector<Span> FindValues(const std::string& xml)
{
    std::vector<Span> values;
    const std::size_t signature = xml.find("Signature");
    const std::size_t afterSignature = xml.rfind("Signature>");
    for (std::size_t tag = xml.find('>'); tag != std::string::npos; tag = xml.find('>', tag + 1)) {
        const Span span{tag + 1, xml.find('<', tag)};
        const bool isInSignature = signature < tag && tag < afterSignature;
        if (span.end != std::string::npos && !isInSignature
            && xml.substr(span.begin, span.end - span.begin).find_first_not_of(" \t\r\n")
                   != std::string::npos) {
            values.push_back(span);
        }
    }
    return values;
}

} // namespace

TEST(OwnText, OfATokenFromATreeSaysWhatTheTokenSays)
{
    unsigned compared = 0;
    for (const TokenCase& line : GetTokenTable()) {
        if (!IsAccepted(line)) {
            continue;
        }
        SCOPED_TRACE(line.file);
        const Verdicts verdicts(ReadToken(line), GetConditions(line));
        EXPECT_EQ(verdicts.ofTree.facts.value_or(Describe(verdicts.ofTree)), line.facts);
        EXPECT_EQ(verdicts.ofOwnText.facts.value_or(Describe(verdicts.ofOwnText)), line.facts);
        ++compared;
    }
    EXPECT_GT(compared, 150U);
}

/** Puts a comment into every place of every value; in a value with blanks, some are accepted. */
class CommentInAValue : public testing::TestWithParam<const char*>
{};

// To a reader of the tree a comment parts a blank from the value beside it. The token's text has
// no comments, so there the blank belongs to the value.
TEST_P(CommentInAValue, LeavesTokenAndOwnTextAlikeOrIsRefused)
{
    const TokenCase& line = GetTokenCase(GetParam());
    const std::string xml = ReadToken(line);
    const Conditions conditions = GetConditions(line);
    for (const Span& value : FindValues(xml)) {
        for (std::size_t at = value.begin; at <= value.end; ++at) {
            const std::string commented = std::string(xml).insert(at, "<!-- -->");
            SCOPED_TRACE(commented.substr(value.begin - 20, value.end - value.begin + 40));
            const Verdicts verdicts(commented, conditions);
            const bool atAnEnd = at == value.begin || at == value.end;
            EXPECT_EQ(verdicts.ofTree.IsAccepted(), atAnEnd) << Describe(verdicts.ofTree);
            if (atAnEnd) {
                EXPECT_EQ(verdicts.ofTree.facts, verdicts.ofOwnText.facts);
                EXPECT_EQ(*verdicts.ofTree.facts, line.facts);
            } else {
                EXPECT_EQ(verdicts.ofTree.className, "SsoClient::ParseException");
            }
        }
    }
}

std::string NameOfFile(const testing::TestParamInfo<const char*>& tested)
{
    return tested.index == 0 ? "BlankEnds" : "Everything";
}

INSTANTIATE_TEST_SUITE_P(
    Of,
    CommentInAValue,
    testing::Values("accepted/blank-ends.xml", "accepted/everything.xml"),
    NameOfFile);

} // namespace HostileTests
