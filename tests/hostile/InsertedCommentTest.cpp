#include "TokenTable.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <ostream>

// No canonical form of a token holds its comments, so anybody may insert some. A comment parts a
// text in two, and to the reader of a value a piece of nothing but blanks is invisible, just as
// the comment is. Hence whoever passes a token on can take blanks off the ends of a signed value,
// and that is all that can be done: where more than one piece is left, or none, the token is
// refused.
namespace HostileTests {

namespace {

/** A value of accepted/blank-ends.xml, which has blanks at both ends. */
struct Value
{
    std::string name;
    std::string written;
    std::string element;
    std::string (*getFact)(const std::string& value); ///< as it stands among the token's facts
};

std::ostream& operator<<(std::ostream& out, const Value& value)
{
    return out << value.name;
}

std::string QuoteHalves(const std::string& name, const std::string& domain)
{
    return Quote(name) + " in " + Quote(domain);
}

std::string GetGroupFact(const std::string& value)
{
    const std::size_t backslash = value.find('\\');
    return "group: " + QuoteHalves(value.substr(backslash + 1), value.substr(0, backslash));
}

std::string GetSubjectFact(const std::string& value)
{
    const std::size_t at = value.find('@');
    return "subject: " + QuoteHalves(value.substr(0, at), value.substr(at + 1));
}

const std::vector<Value> Values{
    {"Advice",
     " \tvalue ",
     "AttributeValue",
     [](const std::string& value) { return "\"urn:name\": " + Quote(value); }},
    {"Group", " example.com\\Users ", "AttributeValue", GetGroupFact},
    {"Subject", " user@example.com ", "NameID", GetSubjectFact},
};

bool IsBlank(const std::string& text)
{
    return text.find_first_not_of(" \t\r\n") == std::string::npos;
}

class InsertedComment : public testing::TestWithParam<Value>
{
protected:
    /** Judges the token with the value parted by two comments into these pieces. */
    void Try(const std::array<std::string, 3>& pieces) const
    {
        SCOPED_TRACE(Quote(pieces[0]) + " " + Quote(pieces[1]) + " " + Quote(pieces[2]));
        const TokenCase& line = GetTokenCase("accepted/blank-ends.xml");
        const Value& value = GetParam();
        const std::string xml = ReplaceOnce(
            ReadToken(line),
            ">" + value.written + "<",
            ">" + pieces[0] + "<!-- -->" + pieces[1] + "<!-- -->" + pieces[2] + "<");
        const Verdict verdict = Judge(xml, GetConditions(line));
        if (std::count_if(pieces.begin(), pieces.end(), IsBlank) != 2) {
            EXPECT_EQ(verdict.className, "SsoClient::ParseException");
            EXPECT_EQ(
                verdict.message,
                "Element '" + value.element
                    + "' must only have textual content (but has extra children or is empty).");
            return;
        }
        const std::string& left = *std::find_if_not(pieces.begin(), pieces.end(), IsBlank);
        ASSERT_TRUE(verdict.IsAccepted()) << Describe(verdict);
        EXPECT_EQ(
            *verdict.facts,
            ReplaceOnce(line.facts, value.getFact(value.written), value.getFact(left)));
    }
};

std::string NameOfValue(const testing::TestParamInfo<Value>& info)
{
    return info.param.name;
}

} // namespace

TEST_P(InsertedComment, TakesBlanksOffTheEndsAndNothingElse)
{
    const std::string& text = GetParam().written;
    for (std::size_t first = 0; first <= text.size(); ++first) {
        for (std::size_t second = first; second <= text.size(); ++second) {
            Try({text.substr(0, first), text.substr(first, second - first), text.substr(second)});
        }
    }
}

INSTANTIATE_TEST_SUITE_P(In, InsertedComment, testing::ValuesIn(Values), NameOfValue);

} // namespace HostileTests
