#include "quillon/system/Clock.h"

#include <gtest/gtest.h>

#include <ctime>

using namespace Quillon::System;

namespace {

class FixedClock : public Clock
{
public:
    DateTime Now() const override { return DateTime("2012-01-31T12:00:00Z"); }
};

} // namespace

TEST(GetUtcDateTime, AgreesWithTheSystemClock)
{
    const long long before = std::time(nullptr);
    const long long now = GetUtcDateTime().GetUtcTime();
    const long long after = std::time(nullptr);
    EXPECT_GE(now, (before - 1) * 1000000);
    EXPECT_LE(now, (after + 2) * 1000000);
}

TEST(ReplaceClock, TakesEffectUntilItIsTakenBack)
{
    const FixedClock clock;
    EXPECT_EQ(nullptr, ReplaceClock(&clock));
    EXPECT_EQ(DateTime("2012-01-31T12:00:00Z"), GetUtcDateTime());
    EXPECT_EQ(&clock, ReplaceClock(nullptr));
    EXPECT_NE(DateTime("2012-01-31T12:00:00Z"), GetUtcDateTime());
}
