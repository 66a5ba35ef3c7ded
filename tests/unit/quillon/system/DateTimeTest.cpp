#include "quillon/system/DateTime.h"

#include <gtest/gtest.h>

using namespace Quillon;
using namespace Quillon::System;

namespace {

// Counts of seconds from the GNU date tool.
constexpr long long FirstSecond = -62135596800;
constexpr long long LastSecond = 253402300799;
constexpr long long Us = 1000000;

long long Parse(const std::string& text)
{
    return DateTime(text).GetUtcTime();
}

std::string Normal(const std::string& text)
{
    return DateTime(text).ToString();
}

bool Accepts(const std::string& text)
{
    try {
        const DateTime accepted(text);
        return true;
    } catch (const DateTimeFormatException&) {
        return false;
    }
}

} // namespace

TEST(DateTime, DefaultIsTheEpoch)
{
    EXPECT_EQ(0, DateTime().GetUtcTime());
    EXPECT_EQ("1970-01-01T00:00:00.000Z", DateTime().ToString());
}

// [XML Schema Part 2, 3.2.7]
TEST(DateTime, ReadsUtcTimes)
{
    EXPECT_EQ(0, Parse("1970-01-01T00:00:00Z"));
    EXPECT_EQ(1328011200 * Us, Parse("2012-01-31T12:00:00Z"));
    EXPECT_EQ(1795219199 * Us, Parse("2026-11-20T23:59:59Z"));
    EXPECT_EQ(-1 * Us, Parse("1969-12-31T23:59:59Z"));
}

// [SAML-CORE 1.3.3]
TEST(DateTime, TakesATextWithoutOffsetAsUtc)
{
    EXPECT_EQ(Parse("2012-01-31T12:00:00Z"), Parse("2012-01-31T12:00:00"));
}

TEST(DateTime, AppliesOffsets)
{
    EXPECT_EQ("2012-01-31T10:00:00.000Z", Normal("2012-01-31T12:00:00+02:00"));
    EXPECT_EQ("2012-01-31T17:45:00.000Z", Normal("2012-01-31T12:00:00-05:45"));
    EXPECT_EQ("2012-01-30T22:00:00.000Z", Normal("2012-01-31T12:00:00+14:00"));
    EXPECT_EQ("2012-02-01T02:00:00.000Z", Normal("2012-01-31T12:00:00-14:00"));
    EXPECT_EQ("2012-01-31T12:00:00.000Z", Normal("2012-01-31T12:00:00-00:00"));
    EXPECT_EQ("2012-03-01T00:30:00.000Z", Normal("2012-02-29T23:30:00-01:00"));
}

TEST(DateTime, CutsFractionsAfterTheMicrosecond)
{
    EXPECT_EQ(500000, Parse("1970-01-01T00:00:00.5Z"));
    EXPECT_EQ(123456, Parse("1970-01-01T00:00:00.123456Z"));
    EXPECT_EQ(123456, Parse("1970-01-01T00:00:00.1234569Z"));
    EXPECT_EQ(0, Parse("1970-01-01T00:00:00.0000009Z"));
    EXPECT_EQ(999999, Parse("1970-01-01T00:00:00." + std::string(10000, '9') + "Z"));
}

TEST(DateTime, ReadsTheEndOfADayAsTheNextDay)
{
    EXPECT_EQ("2013-01-01T00:00:00.000Z", Normal("2012-12-31T24:00:00Z"));
    EXPECT_EQ("2012-02-29T00:00:00.000Z", Normal("2012-02-28T24:00:00.000Z"));
    EXPECT_FALSE(Accepts("2012-12-31T24:00:01Z"));
    EXPECT_FALSE(Accepts("2012-12-31T24:01:00Z"));
    EXPECT_FALSE(Accepts("2012-12-31T24:00:00.1Z"));
    EXPECT_FALSE(Accepts("2012-12-31T24:00:00.0000000001Z"));
    EXPECT_FALSE(Accepts("2012-12-31T25:00:00Z"));
}

TEST(DateTime, KnowsLeapYears)
{
    EXPECT_TRUE(Accepts("2012-02-29T00:00:00Z"));
    EXPECT_TRUE(Accepts("2000-02-29T00:00:00Z"));
    EXPECT_FALSE(Accepts("2013-02-29T00:00:00Z"));
    EXPECT_FALSE(Accepts("1900-02-29T00:00:00Z"));
    EXPECT_FALSE(Accepts("2012-02-30T00:00:00Z"));
}

TEST(DateTime, KnowsTheLengthsOfMonths)
{
    EXPECT_TRUE(Accepts("2012-04-30T00:00:00Z"));
    EXPECT_FALSE(Accepts("2012-04-31T00:00:00Z"));
    EXPECT_TRUE(Accepts("2012-12-31T00:00:00Z"));
    EXPECT_FALSE(Accepts("2012-12-32T00:00:00Z"));
    EXPECT_FALSE(Accepts("2012-13-01T00:00:00Z"));
    EXPECT_FALSE(Accepts("2012-00-01T00:00:00Z"));
    EXPECT_FALSE(Accepts("2012-01-00T00:00:00Z"));
}

TEST(DateTime, KnowsTheRangesOfATime)
{
    EXPECT_TRUE(Accepts("2012-01-31T23:59:59Z"));
    EXPECT_FALSE(Accepts("2012-01-31T23:60:00Z"));
    EXPECT_FALSE(Accepts("2012-01-31T23:59:60Z"));
}

TEST(DateTime, KnowsTheRangeOfAnOffset)
{
    EXPECT_TRUE(Accepts("2012-01-31T12:00:00+13:59"));
    EXPECT_FALSE(Accepts("2012-01-31T12:00:00+14:01"));
    EXPECT_FALSE(Accepts("2012-01-31T12:00:00-14:01"));
    EXPECT_FALSE(Accepts("2012-01-31T12:00:00+15:00"));
    EXPECT_FALSE(Accepts("2012-01-31T12:00:00+01:60"));
}

TEST(DateTime, ReachesFromYear1To9999)
{
    EXPECT_EQ(FirstSecond * Us, Parse("0001-01-01T00:00:00Z"));
    EXPECT_EQ(LastSecond * Us + 999999, Parse("9999-12-31T23:59:59.999999Z"));
    EXPECT_FALSE(Accepts("0000-12-31T23:59:59Z"));
    EXPECT_FALSE(Accepts("10000-01-01T00:00:00Z"));
    EXPECT_FALSE(Accepts("-0001-01-01T00:00:00Z"));
    EXPECT_FALSE(Accepts("99999999999999999999-01-01T00:00:00Z"));
}

TEST(DateTime, StaysInRangeAfterItsOffset)
{
    EXPECT_EQ("0001-01-01T00:00:00.000Z", Normal("0001-01-01T14:00:00+14:00"));
    EXPECT_FALSE(Accepts("0001-01-01T00:00:00+00:01"));
    EXPECT_EQ("9999-12-31T23:59:00.000Z", Normal("9999-12-31T23:58:00-00:01"));
    EXPECT_FALSE(Accepts("9999-12-31T23:59:59-00:01"));
    EXPECT_FALSE(Accepts("9999-12-31T24:00:00Z"));
    EXPECT_EQ("9999-12-31T23:00:00.000Z", Normal("9999-12-31T24:00:00+01:00"));
}

TEST(DateTime, RefusesOtherForms)
{
    for (const char* text :
         {"",
          " ",
          " 2012-01-31T12:00:00Z",
          "2012-01-31T12:00:00Z ",
          "2012-01-31T12:00:00Z\n",
          "2012-01-31",
          "12:00:00Z",
          "2012-01-31 12:00:00Z",
          "2012-01-31t12:00:00Z",
          "2012-01-31T12:00:00z",
          "2012-01-31T12:00Z",
          "2012-01-31T12:00:00.Z",
          "2012-01-31T12:00:00,5Z",
          "2012-01-31T12:00:00+0200",
          "2012-01-31T12:00:00+02",
          "2012-01-31T12:00:00+2:00",
          "2012-01-31T12:00:00Z+02:00",
          "2012-01-31T12:00:00UTC",
          "12-01-31T12:00:00Z",
          "02012-01-31T12:00:00Z",
          "+2012-01-31T12:00:00Z",
          "2012-1-31T12:00:00Z",
          "2012-01-1T12:00:00Z",
          "2012/01/31T12:00:00Z",
          "2012-01-31T1:00:00Z",
          "2012-01-31T-1:00:00Z",
          "2012-01-31T12:00:0xZ",
          "20120131T120000Z",
          "tomorrow"}) {
        EXPECT_FALSE(Accepts(text)) << text;
    }
    EXPECT_FALSE(Accepts(std::string("2012-01-31T12:00:00Z\0", 21)));
}

TEST(DateTime, ErrorQuotesTheBeginningOfTheText)
{
    try {
        const DateTime accepted(std::string(100, 'x'));
        FAIL() << "accepted";
    } catch (const DateTimeFormatException& error) {
        EXPECT_EQ(
            "Not a date and time of the years 1 to 9999: '" + std::string(64, 'x') + "...'",
            std::string(error.what()));
    }
}

TEST(GetFields, TakesATimeApart)
{
    const DateTimeFields fields = DateTime("2012-02-29T13:14:15.123456Z").GetFields();
    EXPECT_EQ(20, fields.century);
    EXPECT_EQ(12, fields.yearOfCentury);
    EXPECT_EQ(2, fields.month);
    EXPECT_EQ(29, fields.day);
    EXPECT_EQ(13, fields.hour);
    EXPECT_EQ(14, fields.minute);
    EXPECT_EQ(15, fields.second);
    EXPECT_EQ(123, fields.millisecond);
    EXPECT_EQ(456, fields.microsecond);
}

TEST(ToString, UndoesReadingForEveryDay)
{
    constexpr long long DayUs = 86400 * Us;
    // An odd number of microseconds beside whole days walks through the times of the day too.
    constexpr long long Step = 17 * DayUs + 12345678901;
    for (long long time = FirstSecond * Us; time <= LastSecond * Us; time += Step) {
        const std::string text = DateTimeFromUtc(time, false).ToString();
        ASSERT_EQ(time, Parse(text)) << text;
    }
}

TEST(ToString, WritesSixDigitsOnlyWhereNeeded)
{
    EXPECT_EQ("2012-01-31T12:00:00.000Z", Normal("2012-01-31T12:00:00Z"));
    EXPECT_EQ("2012-01-31T12:00:00.120Z", Normal("2012-01-31T12:00:00.12Z"));
    EXPECT_EQ("2012-01-31T12:00:00.000001Z", Normal("2012-01-31T12:00:00.000001Z"));
    EXPECT_EQ("0001-01-01T00:00:00.000Z", DateTimeFromUtc(FirstSecond * Us, false).ToString());
    EXPECT_EQ("1969-12-31T23:59:59.999999Z", DateTimeFromUtc(-1, false).ToString());
}

TEST(ToShortStringBias, IsAlwaysZ)
{
    EXPECT_EQ("Z", DateTime("2012-01-31T12:00:00+02:00").ToShortStringBias());
}

TEST(DateTimeFromUtc, KeepsToTheRange)
{
    EXPECT_EQ(
        LastSecond * Us + 999999, DateTimeFromUtc(LastSecond * Us + 999999, false).GetUtcTime());
    EXPECT_THROW(DateTimeFromUtc(LastSecond * Us + 1000000, false), InvalidArgumentException);
    EXPECT_THROW(DateTimeFromUtc(FirstSecond * Us - 1, false), InvalidArgumentException);
}

TEST(DateTimeFromUtc, HasNoLocalTimes)
{
    EXPECT_THROW(DateTimeFromUtc(0, true), InvalidArgumentException);
}

TEST(DateTime, ComparesInstants)
{
    const DateTime early("2012-01-31T12:00:00+02:00");
    const DateTime late("2012-01-31T11:00:00Z");
    EXPECT_TRUE(early < late);
    EXPECT_FALSE(late < early);
    EXPECT_TRUE(early != late);
    EXPECT_TRUE(late == DateTime("2012-01-31T12:00:00+01:00"));
}

TEST(DateTime, FillsAPlaceholder)
{
    const DateTime time;
    const DateTime* none = nullptr;
    EXPECT_EQ("1970-01-01T00:00:00.000Z (null)", MessageFormatter::ASPrint("%1 %2", time, none));
}
