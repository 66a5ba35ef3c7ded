#include "TokenTable.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <ostream>

namespace HostileTests {

namespace {

/** A stretch of a token's text that its signature does not speak about. */
struct Stretch
{
    std::string begin;
    std::string end;
};

struct Subject
{
    std::string name;
    std::string file;
    std::vector<Stretch> unsignedParts;
};

std::ostream& operator<<(std::ostream& out, const Subject& subject)
{
    return out << subject.file;
}

// Exclusive canonicalization leaves out declarations that no name makes use of, every canonical
// form leaves out comments, line ends are one character whichever way they are written, and the
// last digits before the padding hold bits that no byte has.
const Stretch UnusedDeclaration{"xmlns:xs=\"", "\""};
const Stretch SignatureValueEnd{"==</ds:SignatureValue", ">"};
const Stretch KeyInfoOfSignature{"<ds:KeyInfo>", "</ds:KeyInfo>"};
const Stretch Comment{"<!--", "-->"};
const Stretch LineEnd{"\r", "\n"};

const std::vector<Subject> Subjects{
    {"Bearer4k",
     "accepted/bearer-4k.xml",
     {UnusedDeclaration, SignatureValueEnd, KeyInfoOfSignature}},
    {"Everything", "accepted/everything.xml", {UnusedDeclaration, SignatureValueEnd}},
    {"Comments",
     "accepted/comments-and-blanks.xml",
     {UnusedDeclaration, SignatureValueEnd, Comment, LineEnd}},
    {"Inclusive", "accepted/c14n-inc-inc.xml", {SignatureValueEnd}},
};

/** Whether position lies in such a part, its marks and the byte before it included. */
bool IsInside(const Stretch& part, const std::string& xml, std::size_t position)
{
    std::size_t begin = xml.find(part.begin);
    while (begin != std::string::npos) {
        const std::size_t end = xml.find(part.end, begin + part.begin.size());
        if (position + 1 >= begin && position < end + part.end.size()) {
            return true;
        }
        begin = xml.find(part.begin, end);
    }
    return false;
}

bool IsUnsigned(const std::string& xml, std::size_t position, const Subject& subject)
{
    return std::any_of(
        subject.unsignedParts.begin(), subject.unsignedParts.end(), [&](const Stretch& part) {
            return IsInside(part, xml, position);
        });
}

using Mutation = std::function<void(std::string& xml, std::size_t position)>;

class MutatedToken : public testing::TestWithParam<Subject>
{
protected:
    /** Applies the mutation at every position, each to a fresh copy of the token. */
    void TryEverywhere(const Mutation& mutate) const
    {
        const TokenCase& line = GetTokenCase(GetParam().file);
        const Conditions conditions = GetConditions(line);
        const std::string original = ReadToken(line);
        ASSERT_TRUE(Judge(original, conditions).IsAccepted());
        for (std::size_t position = 0; position < original.size(); ++position) {
            std::string xml = original;
            mutate(xml, position);
            const Verdict verdict = Judge(xml, conditions);
            if (verdict.IsAccepted()) {
                EXPECT_EQ(*verdict.facts, line.facts) << "changed at byte " << position;
                EXPECT_TRUE(IsUnsigned(original, position, GetParam()))
                    << "accepted though changed at byte " << position << ": "
                    << Quote(xml.substr(position < 20 ? 0 : position - 20, 60));
            }
        }
    }
};

std::string NameOfSubject(const testing::TestParamInfo<Subject>& info)
{
    return info.param.name;
}

} // namespace

TEST_P(MutatedToken, IsRefusedWithItsLowestBitsFlipped)
{
    TryEverywhere([](std::string& xml, std::size_t position) { xml[position] ^= 0x01; });
}

TEST_P(MutatedToken, IsRefusedWithItsCaseFlipped)
{
    TryEverywhere([](std::string& xml, std::size_t position) { xml[position] ^= 0x20; });
}

TEST_P(MutatedToken, IsRefusedWithAByteRemoved)
{
    TryEverywhere([](std::string& xml, std::size_t position) { xml.erase(position, 1); });
}

TEST_P(MutatedToken, IsRefusedWhenCutShort)
{
    const TokenCase& line = GetTokenCase(GetParam().file);
    const Conditions conditions = GetConditions(line);
    const std::string original = ReadToken(line);
    for (std::size_t length = 0; length < original.size(); ++length) {
        const Verdict verdict = Judge(original.substr(0, length), conditions);
        EXPECT_EQ(verdict.className, "Quillon::Xml::XMLParseException") << "at length " << length;
    }
}

INSTANTIATE_TEST_SUITE_P(Of, MutatedToken, testing::ValuesIn(Subjects), NameOfSubject);

} // namespace HostileTests
