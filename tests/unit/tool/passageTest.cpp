#include "passage.h"

#include <gtest/gtest.h>

namespace {

constexpr char Passage[] = "<a>\n  <b x=1/>\n</a>";

} // namespace

TEST(FindPassage, MarksThePlaceInItsLine)
{
    EXPECT_EQ(FindPassage("\" expected at line 2, column 8", Passage), "  <b x=[here]1/>");
    EXPECT_EQ(FindPassage("Element 'b' at 2,3 is odd", Passage), "  [here]<b x=1/>");
    EXPECT_EQ(FindPassage("no end at line 3, column 99", Passage), "</a>[here]");
}

TEST(FindPassage, CutsALongLine)
{
    const std::string text = std::string(100, 'a') + std::string(100, 'b');
    EXPECT_EQ(
        FindPassage("x at 1,101", text), std::string(40, 'a') + "[here]" + std::string(40, 'b'));
}

TEST(FindPassage, IsEmptyWithoutAPlace)
{
    for (const char* const message :
         {"Invalid token version",
          "Start date is in the future: 2026-01-01T00:00:00Z",
          "x at line 9, column 1",
          "x at 0,0",
          "x at 99999999,1"}) {
        EXPECT_EQ(FindPassage(message, Passage), "") << message;
    }
    EXPECT_EQ(FindPassage("x at 1,1", ""), "");
}
