#include "quillon/StringUtil.h"

#include "quillon/Exceptions.h"
#include "unit/quillon/core/caseTables.h"

#include <gtest/gtest.h>

#include <set>
#include <thread>

using namespace Quillon;
using namespace Quillon::StringUtil;

namespace {

std::string TwoByteUtf8(unsigned codePoint)
{
    return {
        static_cast<char>(0xC0U | (codePoint >> 6)),
        static_cast<char>(0x80U | (codePoint & 0x3FU))};
}

std::set<std::string> TwoByteCharacters(std::string_view text)
{
    std::set<std::string> characters;
    for (std::size_t i = 0; i < text.size(); i += 2) {
        characters.emplace(text.substr(i, 2));
    }
    return characters;
}

/** The code points below U+0800 that `map` changes although they are not in `expected`. */
std::string UnexpectedChanges(std::string (*map)(std::string_view), std::string_view expected)
{
    const std::set<std::string> changing = TwoByteCharacters(expected);
    std::string wrong;
    for (unsigned codePoint = 0x80; codePoint < 0x800; ++codePoint) {
        const std::string character = TwoByteUtf8(codePoint);
        if (changing.count(character) == 0 && map(character) != character) {
            wrong.append(std::to_string(codePoint)).append(" ");
        }
    }
    return wrong;
}

std::vector<unsigned char> Bytes(std::string_view text)
{
    return {text.begin(), text.end()};
}

std::vector<unsigned char> Decode(std::string_view text)
{
    std::vector<unsigned char> bytes = Bytes("old");
    Base64Decode(text, bytes);
    return bytes;
}

std::string DecodeError(std::string_view text)
{
    try {
        Decode(text);
        return "accepted";
    } catch (const Base64FormatException& error) {
        return error.what();
    }
}

} // namespace

TEST(ToUpper, MapsAscii)
{
    EXPECT_EQ("ABCXYZ [`{@]", ToUpper("abcxyz [`{@]"));
    EXPECT_EQ("", ToUpper(""));
}

// [UNICODE 4.2]
TEST(ToUpper, MapsTheLettersOfItsRanges)
{
    EXPECT_EQ(CaseTables::UpperTo, ToUpper(CaseTables::UpperFrom));
}

TEST(ToUpper, LeavesEverythingElse)
{
    EXPECT_EQ("", UnexpectedChanges(&ToUpper, CaseTables::UpperFrom));
    EXPECT_EQ("ß", ToUpper("ß"));
    EXPECT_EQ("ạ\xF0\x90\x90\xA8", ToUpper("ạ\xF0\x90\x90\xA8"));
}

TEST(ToUpper, NeverTurnsAnotherLetterIntoAsciiText)
{
    EXPECT_EQ("ADMıN", ToUpper("admın"));
    EXPECT_EQ("ſ", ToUpper("ſ"));
}

TEST(ToUpper, LeavesMalformedBytes)
{
    EXPECT_EQ("A\xC3", ToUpper("a\xC3"));
    EXPECT_EQ("\xC3\x41", ToUpper("\xC3\x61"));
    EXPECT_EQ("\xC1\xA1\x80\xFF", ToUpper("\xC1\xA1\x80\xFF"));
    EXPECT_EQ(std::string("A\0B", 3), ToUpper(std::string("a\0b", 3)));
}

TEST(ToLower, MapsAscii)
{
    EXPECT_EQ("abcxyz [`{@]", ToLower("ABCXYZ [`{@]"));
}

TEST(ToLower, MapsTheLettersOfItsRanges)
{
    EXPECT_EQ(CaseTables::LowerTo, ToLower(CaseTables::LowerFrom));
}

TEST(ToLower, LeavesEverythingElse)
{
    EXPECT_EQ("", UnexpectedChanges(&ToLower, CaseTables::LowerFrom));
    EXPECT_EQ("İ", ToLower("İ"));
    EXPECT_EQ("\u212A", ToLower("\u212A"));
}

// [RFC 4122 4.4]
TEST(GenerateUuid, HasTheFormOfVersion4)
{
    for (int i = 0; i < 1000; ++i) {
        const std::string uuid = GenerateUuid();
        ASSERT_EQ(36U, uuid.size());
        for (std::size_t position = 0; position < uuid.size(); ++position) {
            const bool dash = position == 8 || position == 13 || position == 18 || position == 23;
            const std::string allowed = dash             ? "-"
                                        : position == 14 ? "4"
                                        : position == 19 ? "89ab"
                                                         : "0123456789abcdef";
            ASSERT_NE(std::string::npos, allowed.find(uuid[position])) << uuid;
        }
    }
}

TEST(GenerateUuid, GivesEachThreadOthers)
{
    constexpr int Count = 2000;
    std::set<std::string> first;
    std::set<std::string> second;
    const auto fill = [](std::set<std::string>& out) {
        for (int i = 0; i < Count; ++i) {
            out.insert(GenerateUuid());
        }
    };
    std::thread thread(fill, std::ref(first));
    fill(second);
    thread.join();
    first.insert(second.begin(), second.end());
    EXPECT_EQ(2U * Count, first.size());
}

// [RFC 4648 4, 10]
TEST(Base64Encode, GivesTheTestVectors)
{
    EXPECT_EQ("", Base64Encode(Bytes("")));
    EXPECT_EQ("Zg==", Base64Encode(Bytes("f")));
    EXPECT_EQ("Zm8=", Base64Encode(Bytes("fo")));
    EXPECT_EQ("Zm9v", Base64Encode(Bytes("foo")));
    EXPECT_EQ("Zm9vYg==", Base64Encode(Bytes("foob")));
    EXPECT_EQ("Zm9vYmE=", Base64Encode(Bytes("fooba")));
    EXPECT_EQ("Zm9vYmFy", Base64Encode(Bytes("foobar")));
}

TEST(Base64Encode, UsesTheWholeAlphabet)
{
    const unsigned char bytes[] = {0xFB, 0xEF, 0xFF, 0x00};
    EXPECT_EQ("++//AA==", Base64Encode(bytes, sizeof bytes));
}

// [RFC 4648 4]
TEST(Base64Decode, GivesTheTestVectors)
{
    EXPECT_EQ(Bytes(""), Decode(""));
    EXPECT_EQ(Bytes("f"), Decode("Zg=="));
    EXPECT_EQ(Bytes("fo"), Decode("Zm8="));
    EXPECT_EQ(Bytes("foo"), Decode("Zm9v"));
    EXPECT_EQ(Bytes("foob"), Decode("Zm9vYg=="));
    EXPECT_EQ(Bytes("fooba"), Decode("Zm9vYmE="));
    EXPECT_EQ(Bytes("foobar"), Decode("Zm9vYmFy"));
    EXPECT_EQ((std::vector<unsigned char>{0xFB, 0xEF, 0xFF, 0x00}), Decode("++//AA=="));
}

TEST(Base64Decode, UndoesEncodingOfEveryLengthAndByte)
{
    std::vector<unsigned char> bytes;
    for (unsigned length = 0; length < 600; ++length) {
        ASSERT_EQ(bytes, Decode(Base64Encode(bytes))) << length;
        bytes.push_back(static_cast<unsigned char>(length * 7));
    }
}

TEST(Base64Decode, SkipsXmlWhiteSpaceAnywhere)
{
    EXPECT_EQ(Bytes("foobarf"), Decode(" \n\tZm\r\n9v Y\tmFy\nZ g = = \n"));
    EXPECT_EQ(Bytes(""), Decode(" \r\n\t"));
}

TEST(Base64Decode, RefusesOtherCharacters)
{
    EXPECT_EQ("Base64 text has a character that is no digit at position 1", DecodeError("Z!9v"));
    EXPECT_EQ(
        "Base64 text has a character that is no digit at position 7", DecodeError("Zm9vZm9-"));
    EXPECT_EQ("Base64 text has a character that is no digit at position 3", DecodeError("Zm9_"));
    EXPECT_EQ("Base64 text has a character that is no digit at position 0", DecodeError("\vZm9v"));
    EXPECT_EQ(
        "Base64 text has a character that is no digit at position 0", DecodeError("\xC2\xA0Zm9v"));
    EXPECT_EQ(
        "Base64 text has a character that is no digit at position 4",
        DecodeError(std::string_view("Zm9v\0", 5)));
}

TEST(Base64Decode, RefusesAnUnfinishedGroup)
{
    EXPECT_EQ("Base64 text ends inside a group of four digits at position 1", DecodeError("Z"));
    EXPECT_EQ("Base64 text ends inside a group of four digits at position 2", DecodeError("Zg"));
    EXPECT_EQ("Base64 text ends inside a group of four digits at position 3", DecodeError("Zg="));
    EXPECT_EQ(
        "Base64 text ends inside a group of four digits at position 7", DecodeError("Zm9vZm8"));
}

TEST(Base64Decode, RefusesMisplacedPadding)
{
    EXPECT_EQ("Base64 text has misplaced padding at position 0", DecodeError("===="));
    EXPECT_EQ("Base64 text has misplaced padding at position 1", DecodeError("Z==="));
    EXPECT_EQ("Base64 text has misplaced padding at position 4", DecodeError("Zm9v="));
    EXPECT_EQ("Base64 text has misplaced padding at position 4", DecodeError("Zg==="));
    EXPECT_EQ("Base64 text has a digit after the padding at position 3", DecodeError("Zg=v"));
    EXPECT_EQ("Base64 text has a digit after the padding at position 4", DecodeError("Zg==Zm9v"));
}

// [RFC 4648 3.5]
TEST(Base64Decode, RefusesBitsThatTheLastDigitShouldNotCarry)
{
    EXPECT_EQ(
        "Base64 text has bits that its last digit should not carry at position 3",
        DecodeError("Zh=="));
    EXPECT_EQ(
        "Base64 text has bits that its last digit should not carry at position 3",
        DecodeError("Zm9="));
}
