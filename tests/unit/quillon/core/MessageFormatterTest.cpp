#include "quillon/MessageFormatter.h"

#include <gtest/gtest.h>

using Quillon::MessageFormatter;

namespace {

struct Point
{
    int x;
    int y;
};

} // namespace

template <>
struct Quillon::ToStringFormatter<Point>
{
    static std::string Format(const Point* value)
    {
        return value == nullptr ? "nowhere"
                                : std::to_string(value->x) + "|" + std::to_string(value->y);
    }
};

TEST(ASPrint, ReplacesPlaceholdersByNumber)
{
    EXPECT_EQ("b a b", MessageFormatter::ASPrint("%2 %1 %2", "a", "b"));
}

TEST(ASPrint, NineArguments)
{
    EXPECT_EQ(
        "123456789", MessageFormatter::ASPrint("%1%2%3%4%5%6%7%8%9", 1, 2, 3, 4, 5, 6, 7, 8, 9));
}

TEST(ASPrint, NeverExpandsWhatAnArgumentBringsIn)
{
    EXPECT_EQ("%2 x", MessageFormatter::ASPrint("%1 %2", "%2", "x"));
    EXPECT_EQ("%11", MessageFormatter::ASPrint("%11", "%1"));
    EXPECT_EQ("%1", MessageFormatter::ASPrint("%1%2", "%", "1"));
}

TEST(ASPrint, LeavesAPlaceholderWithoutArgument)
{
    EXPECT_EQ("a %2 %9", MessageFormatter::ASPrint("%1 %2 %9", "a"));
    EXPECT_EQ("%1", MessageFormatter::ASPrint("%1"));
}

TEST(ASPrint, LeavesOtherPercentSigns)
{
    EXPECT_EQ("100% %0 %x %", MessageFormatter::ASPrint("100% %0 %x %", "a"));
    EXPECT_EQ("%a", MessageFormatter::ASPrint("%%1", "a"));
}

TEST(ASPrint, FormatsKindsOfValues)
{
    EXPECT_EQ(
        "true false -5 18446744073709551615",
        MessageFormatter::ASPrint("%1 %2 %3 %4", true, false, -5, 18446744073709551615ULL));
    EXPECT_EQ(
        "text view",
        MessageFormatter::ASPrint("%1 %2", std::string("text"), std::string_view("view")));
}

TEST(ASPrint, NullTextIsWrittenAsSuch)
{
    const char* none = nullptr;
    EXPECT_EQ("(null)", MessageFormatter::ASPrint("%1", none));
}

TEST(ASPrint, UsesTheFormatterOfAType)
{
    const Point point{3, 4};
    const Point* none = nullptr;
    EXPECT_EQ("3|4 3|4 nowhere", MessageFormatter::ASPrint("%1 %2 %3", point, &point, none));
}
