#include "TokenPage.h"

#include "support/FakeSamlToken.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using testing::HasSubstr;
using testing::Not;

namespace {

constexpr char Hostile[] = "</dd><script>alert(\"1\")</script>'&\n\xE2\x80\xAE";
constexpr char Shown[] =
    "&lt;/dd&gt;&lt;script&gt;alert(&quot;1&quot;)&lt;/script&gt;&#39;&amp;\\x0a\\u202e";

/** A token whose issuer and everything else are somebody's attempt to be markup. */
FakeSamlToken MakeHostileToken()
{
    FakeSamlToken token;
    token.xml = "<Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\"><Issuer>&lt;script&gt;"
                "</Issuer></Assertion>";
    token.id = Hostile;
    token.subject = SsoClient::PrincipalId(Hostile, "d");
    token.groups = {SsoClient::PrincipalId(Hostile, "d"), SsoClient::PrincipalId("g", "d")};
    token.delegationChain = {{SsoClient::PrincipalId(Hostile, "d"), {}}};
    return token;
}

int Count(const std::string& text, const std::string& part)
{
    int count = 0;
    for (std::size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
}

} // namespace

TEST(WriteTokenPage, ShowsHostileTextsAsTheyAre)
{
    const std::string page = WriteTokenPage(MakeHostileToken(), nullptr);
    EXPECT_THAT(page, Not(HasSubstr("<script")));
    EXPECT_THAT(page, Not(HasSubstr("\xE2\x80\xAE")));
    // Title, heading, the subject in the chain, its delegate, a group and the ID.
    EXPECT_EQ(Count(page, Shown), 6);
    EXPECT_THAT(page, HasSubstr("<dt>issuer</dt><dd>&lt;script&gt;</dd>"));
}

TEST(WriteTokenPage, DrawsAChainInItsOrder)
{
    FakeSamlToken token = MakeHostileToken();
    token.subject = SsoClient::PrincipalId("alice", "d");
    token.delegationChain = {{SsoClient::PrincipalId("bob", "d"), {}}};
    EXPECT_THAT(
        WriteTokenPage(token, nullptr),
        HasSubstr("<dt>delegation</dt><dd><ol><li>alice@d</li><li>bob@d (1970-01-01"));
}

TEST(WriteTokenPage, LoadsAndRunsNothing)
{
    const std::string page = WriteTokenPage(MakeHostileToken(), nullptr);
    EXPECT_THAT(page, HasSubstr("content=\"default-src 'none'; style-src 'unsafe-inline'\""));
    EXPECT_THAT(page, Not(HasSubstr("http:")));
    EXPECT_THAT(page, Not(HasSubstr("https:")));
    EXPECT_THAT(page, Not(HasSubstr("url(")));
    EXPECT_THAT(page, Not(HasSubstr("<Assertion")));
}
