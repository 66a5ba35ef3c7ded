#include "Day.h"

#include "quillon/service/Logger.h"

#include <gtest/gtest.h>

#include <string>

using Testing::Day;

namespace {

TEST(Day, HoldsItsPromisesWhateverHappens)
{
    Quillon::Service::GetApp()->GetLogFacility().SetSink(
        [](const std::string&, int, const std::string&) {});
    int given = 0;
    int refused = 0;
    for (unsigned seed = 1; seed <= 20; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        Day day(seed);
        day.Live();
        given += day.given;
        refused += day.refused;
        ASSERT_FALSE(testing::Test::HasFailure());
        EXPECT_LT(20U, day.CountCalls());
        EXPECT_GT(1500U, day.CountCalls());
    }
    EXPECT_LT(4'000, given);
    EXPECT_LT(400, refused);
}

} // namespace
