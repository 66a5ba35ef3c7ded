#include "quillon/Wiped.h"

#include "quillon/Reader.h"
#include "support/FreedMemory.h"

#include <gtest/gtest.h>

#include <memory>
#include <type_traits>

namespace Quillon {

namespace {

// A copy would be one more to wipe, so each is asked for.
static_assert(!std::is_copy_constructible_v<Wiped>);
static_assert(!std::is_copy_assignable_v<Wiped>);
static_assert(!std::is_convertible_v<const std::string&, Wiped>);
static_assert(!std::is_convertible_v<std::string, Wiped>);
static_assert(std::is_nothrow_move_constructible_v<Wiped>);
static_assert(std::is_nothrow_move_assignable_v<Wiped>);

constexpr std::string_view Short = "Sw0rdfish";
constexpr std::string_view Long =
    "a secret that is far too long to stand within the object that a string is by itself";

std::string_view BytesOf(const Wiped& text)
{
    return {reinterpret_cast<const char*>(&text), sizeof text};
}

TEST(Wipe, OverwritesTheGivenMemoryAndNoMore)
{
    char memory[] = "abcdef";
    Wipe(memory + 1, 3);
    EXPECT_EQ(std::string(memory, 6), std::string("a\0\0\0ef", 6));
}

TEST(Wipe, OverwritesWhatWasCutOffBefore)
{
    std::string text(Long);
    const char* const memory = text.data();
    text.resize(3);
    Wipe(text);
    EXPECT_TRUE(text.empty());
    EXPECT_EQ(text.data(), memory);
    EXPECT_EQ(std::string(memory, Long.size()), std::string(Long.size(), '\0'));
}

TEST(FreedMemory, SeesWhatAnOrdinaryStringLeaves)
{
    const FreedMemory freed(Long);
    std::make_unique<std::string>(Long).reset();
    EXPECT_TRUE(freed.HeldTheText());
}

TEST(Wiped, HoldsACopyOfWhatItIsGiven)
{
    std::string original(Long);
    const Wiped copy(original);
    EXPECT_EQ(copy.Get(), Long);
    EXPECT_EQ(original, Long);
}

TEST(Wiped, TakesAPartOfItself)
{
    for (const std::string_view text : {Short, Long}) {
        Wiped doubled{std::string(text)};
        doubled.Append(doubled.Get());
        EXPECT_EQ(doubled.Get(), std::string(text) + std::string(text));
        doubled.Append(std::string_view(doubled.Get()).substr(1, 3));
        EXPECT_EQ(
            doubled.Get(), std::string(text) + std::string(text) + std::string(text.substr(1, 3)));
    }
}

TEST(Wiped, LeavesNothingOfATextThatItTakes)
{
    for (const std::string_view secret : {Short, Long}) {
        std::string original(secret);
        const FreedMemory freed(secret);
        const Wiped taken(std::move(original));
        EXPECT_EQ(taken.Get(), secret);
        EXPECT_TRUE(original.empty()); // NOLINT(bugprone-use-after-move): what is left is the point
        EXPECT_EQ(std::string_view(original.data(), secret.size()).find(secret), std::string::npos);
    }
}

TEST(Wiped, OverwritesItsTextWhenItGoes)
{
    for (const std::string_view secret : {Short, Long}) {
        const FreedMemory freed(secret);
        std::make_unique<Wiped>(std::string(secret)).reset();
        EXPECT_FALSE(freed.HeldTheText()) << secret;
    }
}

TEST(Wiped, NeverHoldsItsTextInItself)
{
    Wiped text{std::string(Short)};
    EXPECT_EQ(BytesOf(text).find(Short), std::string::npos);
    Wiped moved(std::move(text));
    EXPECT_EQ(moved.Get(), Short);
    EXPECT_EQ(BytesOf(moved).find(Short), std::string::npos);
}

TEST(Wiped, OverwritesWhereItStoodWhenItGrows)
{
    const FreedMemory freed(Short);
    Wiped text{std::string(Short)};
    for (int i = 0; i < 1000; ++i) {
        text.Append("more ");
    }
    EXPECT_EQ(text.Get().substr(0, Short.size()), Short);
    EXPECT_EQ(text.Get().size(), Short.size() + 5000);
    EXPECT_FALSE(freed.HeldTheText());
}

TEST(Wiped, OverwritesWhatWasRemoved)
{
    const FreedMemory freed(Short.substr(1, 6));
    {
        Wiped text{std::string(Short)};
        text.RemoveLast();
        EXPECT_EQ(text.Get(), Short.substr(0, Short.size() - 1));
        text.Clear();
        EXPECT_EQ(text.Get(), "");
    }
    EXPECT_FALSE(freed.HeldTheText());
}

TEST(Wiped, OverwritesTheOldTextOfAnAssignment)
{
    const FreedMemory freed(Long);
    {
        Wiped text{std::string(Long)};
        text = Wiped(std::string(Short));
        EXPECT_EQ(text.Get(), Short);
    }
    EXPECT_FALSE(freed.HeldTheText());
}

TEST(Wiped, HandsItsTextOver)
{
    Wiped text{std::string(Long)};
    const char* const memory = text.Get().data();
    const std::string released = text.Release();
    EXPECT_EQ(released, Long);
    EXPECT_EQ(released.data(), memory);
    EXPECT_TRUE(text.Get().empty());
}

TEST(StringWriter, OverwritesWhatItGatheredWhenItGrowsAndGoes)
{
    const FreedMemory freed(Short);
    {
        const Ref<StringWriter> writer = CreateStringWriter();
        writer->Write(Short.data(), Short.size());
        for (int i = 0; i < 1000; ++i) {
            writer->Write("more ", 5);
        }
    }
    EXPECT_FALSE(freed.HeldTheText());
}

} // namespace

} // namespace Quillon
