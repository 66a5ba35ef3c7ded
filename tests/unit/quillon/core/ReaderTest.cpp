#include "quillon/Reader.h"

#include <gtest/gtest.h>

#include <array>

using namespace Quillon;

TEST(StringReader, ReadsInPiecesUntilTheEnd)
{
    const Ref<Reader> reader = CreateStringReader("abcde");
    std::array<char, 3> buffer{};
    EXPECT_EQ(5U, reader->GetSizeHint());
    ASSERT_EQ(3U, reader->Read(buffer.data(), buffer.size()));
    EXPECT_EQ("abc", std::string(buffer.data(), 3));
    EXPECT_EQ(2U, reader->GetSizeHint());
    ASSERT_EQ(2U, reader->Read(buffer.data(), buffer.size()));
    EXPECT_EQ("de", std::string(buffer.data(), 2));
    EXPECT_EQ(0U, reader->Read(buffer.data(), buffer.size()));
}

TEST(StringReader, EmptyTextIsAtItsEnd)
{
    char byte = 0;
    EXPECT_EQ(0U, CreateStringReader("")->Read(&byte, 1));
}

TEST(StringReader, KeepsZeroBytes)
{
    std::array<char, 8> buffer{};
    const std::string text("a\0b", 3);
    ASSERT_EQ(3U, CreateStringReader(text)->Read(buffer.data(), buffer.size()));
    EXPECT_EQ(text, std::string(buffer.data(), 3));
}

TEST(StringWriter, GathersWhatIsWritten)
{
    const Ref<StringWriter> writer = CreateStringWriter();
    writer->Write("abc", 3);
    writer->Write("", 0);
    writer->Write("\0d", 2);
    EXPECT_EQ(std::string("abc\0d", 5), writer->GetString());
}

TEST(StringWriter, IsEmptyAfterItsTextIsTaken)
{
    const Ref<StringWriter> writer = CreateStringWriter();
    writer->Write("abc", 3);
    EXPECT_EQ("abc", writer->TakeString());
    EXPECT_EQ("", writer->GetString());
}
