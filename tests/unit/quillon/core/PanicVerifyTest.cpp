#include "quillon/PanicVerify.h"

#include <gtest/gtest.h>

#include <csignal>

TEST(PanicVerifyDeathTest, AbortsWithExpressionUnitAndLine)
{
    EXPECT_EXIT(
        Quillon::PanicVerify("rootBuilder != __null", "lib/unit", 17),
        testing::KilledBySignal(SIGABRT),
        "^PanicVerify failed: rootBuilder != __null \\(lib/unit:17\\)\n$");
}
