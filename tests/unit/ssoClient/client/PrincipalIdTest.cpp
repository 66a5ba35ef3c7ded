#include "ssoClient/PrincipalId.h"

#include <gtest/gtest.h>

#include <csignal>
#include <utility>

using SsoClient::PrincipalId;

TEST(PrincipalId, KeepsNameAndDomain)
{
    const PrincipalId id("Admin", "Example.Local");
    EXPECT_EQ("Admin", id.GetName());
    EXPECT_EQ("Example.Local", id.GetDomain());
}

TEST(PrincipalId, EqualsWithoutRegardToCase)
{
    EXPECT_TRUE(PrincipalId("Admin", "Example.Local") == PrincipalId("admin", "EXAMPLE.LOCAL"));
    EXPECT_TRUE(PrincipalId("Jürgen", "Łódź") == PrincipalId("JÜRGEN", "łÓDŹ"));
    const PrincipalId id("a", "b");
    EXPECT_TRUE(id == id);
    EXPECT_FALSE(id != id);
}

TEST(PrincipalId, DiffersByNameOrDomain)
{
    EXPECT_FALSE(PrincipalId("admin", "a") == PrincipalId("admin", "b"));
    EXPECT_FALSE(PrincipalId("admin", "a") == PrincipalId("admins", "a"));
    EXPECT_TRUE(PrincipalId("admin", "a") != PrincipalId("admins", "a"));
    EXPECT_FALSE(PrincipalId("a", "b") == PrincipalId("b", "a"));
}

TEST(PrincipalId, NeverEqualsALookAlike)
{
    EXPECT_FALSE(PrincipalId("admin", "a") == PrincipalId("adm\u0131n", "a"));
    EXPECT_FALSE(PrincipalId("sales", "a") == PrincipalId("\u017Fales", "a"));
}

TEST(PrincipalId, KeepsItsNameWhenMovedFrom)
{
    PrincipalId id("a", "b");
    const PrincipalId taken(std::move(id));
    EXPECT_EQ(id, taken); // NOLINT(bugprone-use-after-move)
    PrincipalId assigned("c", "d");
    assigned = std::move(id);
    EXPECT_EQ(id, assigned); // NOLINT(bugprone-use-after-move)
    EXPECT_EQ("a", id.GetName());
    EXPECT_EQ("b", id.GetDomain());
}

TEST(ToString, HasNoBlankBeforeTheDomain)
{
    EXPECT_EQ("{Name: a; Domain:b}", PrincipalId("a", "b").ToString());
}

TEST(ASPrint, FormatsAPrincipal)
{
    const PrincipalId* none = nullptr;
    EXPECT_EQ(
        "{Name: a; Domain:b} (null)",
        Quillon::MessageFormatter::ASPrint("%1 %2", PrincipalId("a", "b"), none));
}

TEST(PrincipalIdDeathTest, StopsWithoutName)
{
    EXPECT_EXIT(
        PrincipalId("", "b"),
        testing::KilledBySignal(SIGABRT),
        "^PanicVerify failed: !name\\.empty\\(\\) \\(lib/public/ssoClient/PrincipalId:43\\)\n$");
}

TEST(PrincipalIdDeathTest, StopsWithoutDomain)
{
    EXPECT_EXIT(
        PrincipalId("a", ""),
        testing::KilledBySignal(SIGABRT),
        "^PanicVerify failed: !domain\\.empty\\(\\) \\(lib/public/ssoClient/PrincipalId:44\\)\n$");
}

TEST(PrincipalIdDeathTest, ReportsTheNameFirst)
{
    EXPECT_EXIT(PrincipalId("", ""), testing::KilledBySignal(SIGABRT), "!name.empty\\(\\)");
}
