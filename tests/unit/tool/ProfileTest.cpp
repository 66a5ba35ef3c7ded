#include "Profile.h"

#include "ExitCode.h"
#include "support/Failure.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

using testing::ElementsAre;
using testing::Pair;

namespace {

using Words = std::vector<std::string>;

constexpr char File[] = "/home/a/.config/ssoclient/config.toml";

constexpr char Text[] = R"([production]
url = "https://sts.example.com/sts"
trust = ["sts.pem", "/etc/next.pem"]
ca = "ca.pem"
user = "alice@example.com"
key = "pkcs11:token=t"
cert = 'service.pem'

[test]
)";

std::string GetError(const std::string& text, const std::string& name = "p")
{
    return GetFailure([&] { ParseProfile(text, File, name); });
}

std::string At(int line, const std::string& what)
{
    return std::string("UsageError: `") + File + "' line " + std::to_string(line) + ": " + what;
}

/** A folder in the place of the user's configuration. */
class AddProfileTest : public testing::Test
{
protected:
    AddProfileTest()
    {
        std::string folder = testing::TempDir() + "profile.XXXXXX";
        _folder = ::mkdtemp(folder.data());
        std::filesystem::create_directory(_folder / "ssoclient");
        std::ofstream(_folder / "ssoclient" / "config.toml") << Text;
        ::setenv("XDG_CONFIG_HOME", _folder.c_str(), 1);
    }
    ~AddProfileTest() override
    {
        ::unsetenv("XDG_CONFIG_HOME");
        std::filesystem::remove_all(_folder);
    }

    std::string InFolder(const std::string& file) const
    {
        return (_folder / "ssoclient" / file).string();
    }

private:
    std::filesystem::path _folder;
};

} // namespace

// What toml++ does with them is not defined.
TEST(ParseProfile, RefusesForeignCharactersOutsideOfQuotes)
{
    const std::string why = "a character that is not ASCII stands outside of quotes";
    EXPECT_EQ(At(1, why), GetError("\xC3\xA9 = 1\n[p]\n"));
    EXPECT_EQ(At(2, why), GetError("[p]\nurl\xD1\xA6 = 'x'\n"));
    EXPECT_EQ(At(3, why), GetError("[p]\n# \xC3\xA9\nurl = 'x' \xC3\xA9\n"));
    EXPECT_EQ(At(3, why), GetError("[p]\nurl = \"x\n\xC3\xA9\"\n"));
    EXPECT_EQ(At(3, why), GetError("[p]\nurl = \"\"\"a\\\n  \xC3\xA9\"\"\"\n"));
    EXPECT_EQ(At(2, why), GetError("[p]\nurl = \"\"\"a\\\xC3\xA9\"\"\"\n"));
    EXPECT_EQ(At(2, why), GetError("[p]\nurl = 1979-52\"\"\"\xC3\xA9\"\"\"\n"));
    EXPECT_EQ(At(2, why), GetError("[p]\nurl = 1[\"\xC3\xA9\"]\n"));
    EXPECT_EQ(At(2, why), GetError("[p]\nurl = 'x\\' \xC3\xA9'\n"));
}

TEST(ParseProfile, TakesForeignCharactersInQuotesAndComments)
{
    const std::string text = "\xEF\xBB\xBF[p] # \xC3\xA9\"\n"
                             "url = \"\xC3\xA9\\\"\xC3\xA9\"\n"
                             "user = '\xC3\xA9\\'\n"
                             "ca = \"\"\"/\xC3\xA9\"\"\"\ncert = '\'\'/\xC3\xA9'\'\'\n";
    const Profile profile = ParseProfile(text, File, "p");
    EXPECT_EQ(
        (Words{"/\xC3\xA9", "/x"}),
        ParseProfile("[\"\xC3\xA9\"]\nca = [\"/\xC3\xA9\",'/x']\n", File, "\xC3\xA9")
            .values.at("ca"));
    EXPECT_EQ(Words{"\xC3\xA9\"\xC3\xA9"}, profile.values.at("url"));
    EXPECT_EQ(Words{"\xC3\xA9\\"}, profile.values.at("user"));
    EXPECT_EQ(Words{"/\xC3\xA9"}, profile.values.at("ca"));
    EXPECT_EQ(Words{"/\xC3\xA9"}, profile.values.at("cert"));
}

TEST(ParseProfile, ReadsEveryKeyAndFindsFilesBesideItself)
{
    EXPECT_THAT(
        ParseProfile(Text, File, "production").values,
        ElementsAre(
            Pair("ca", ElementsAre("/home/a/.config/ssoclient/ca.pem")),
            Pair("cert", ElementsAre("/home/a/.config/ssoclient/service.pem")),
            Pair("key", ElementsAre("pkcs11:token=t")),
            Pair("trust", ElementsAre("/home/a/.config/ssoclient/sts.pem", "/etc/next.pem")),
            Pair("url", ElementsAre("https://sts.example.com/sts")),
            Pair("user", ElementsAre("alice@example.com"))));
}

TEST(ParseProfile, TakesAKeyFileForAFile)
{
    for (const std::string key : {"k.pem", "./pkcs11:k", "k:1/x"}) {
        const Profile profile = ParseProfile("[p]\nkey = \"" + key + "\"", File, "p");
        const bool isUri = key == "k:1/x";
        EXPECT_EQ(
            profile.values.at("key").front(), isUri ? key : "/home/a/.config/ssoclient/" + key);
    }
}

TEST(ParseProfile, NamesLineAndNeighbourOfAnUnknownKey)
{
    EXPECT_EQ(
        GetError("# comment\n[p]\nurll = \"x\"\n"),
        At(3, "there is no key `urll'; did you mean url?"));
    EXPECT_EQ(
        GetError("[p]\npassword = \"x\"\n"),
        At(2, "there is no key `password', only url, trust, ca, user, key, cert"));
}

TEST(ParseProfile, NamesTheLineOfAWrongValue)
{
    EXPECT_EQ(GetError("[p]\nurl = 1\n"), At(2, "url must be a text in quotes"));
    EXPECT_EQ(GetError("[p]\nurl = [\"x\"]\n"), At(2, "url must be a text in quotes"));
    EXPECT_EQ(
        GetError("[p]\n\ntrust = true\n"),
        At(3, "trust must be a text in quotes, or an array of such"));
    EXPECT_EQ(GetError("[p]\ntrust = [\n\"a\",\n2]\n"), At(4, "trust must be a text in quotes"));
    EXPECT_EQ(GetError("[p]\nca = \"\"\n"), At(2, "ca must not be empty"));
    EXPECT_EQ(GetError("[p]\nca = []\n"), At(2, "ca must not be empty"));
}

TEST(ParseProfile, NamesTheLineOfWhatIsNoToml)
{
    EXPECT_THAT(GetError("[p]\nurl = \n"), testing::StartsWith(At(2, "")));
    EXPECT_THAT(GetError("[p]\nurl = \"x\"\nurl = \"y\"\n"), testing::StartsWith(At(3, "")));
}

TEST(ParseProfile, NamesTheProfilesThatThereAre)
{
    const std::string begin = std::string("UsageError: `") + File + "' has no profile ";
    EXPECT_EQ(GetError(Text, "prodution"), begin + "`prodution'; did you mean production?");
    EXPECT_EQ(GetError(Text, "zzz"), begin + "`zzz', only production, test");
    EXPECT_EQ(GetError("", "zzz"), begin + "`zzz'");
    EXPECT_EQ(GetError("p = \"x\"\n"), At(1, "`p' is no profile, which begins with [NAME]"));
}

TEST(GetProfileFile, AsksTheTwoVariablesAndNoOther)
{
    const std::string home = std::getenv("HOME") != nullptr ? std::getenv("HOME") : "";
    ::setenv("HOME", "/home/a", 1);
    ::setenv("XDG_CONFIG_HOME", "/conf", 1);
    EXPECT_EQ(GetProfileFile(), "/conf/ssoclient/config.toml");
    for (const char* const ignored : {"", "relative"}) {
        ::setenv("XDG_CONFIG_HOME", ignored, 1);
        EXPECT_EQ(GetProfileFile(), "/home/a/.config/ssoclient/config.toml");
    }
    ::unsetenv("XDG_CONFIG_HOME");
    ::unsetenv("HOME");
    EXPECT_EQ(
        GetFailure([] { GetProfileFile(); }),
        "UsageError: --profile: neither XDG_CONFIG_HOME nor HOME says where profiles are");
    ::setenv("HOME", home.c_str(), 1);
}

TEST_F(AddProfileTest, AddsWhatTheCommandHasAndNobodyTyped)
{
    EXPECT_EQ(
        AddProfile(
            {"validate", "--profile", "production", "--url", "https://other/", "--", "x"},
            {"profile", "url", "trust", "ca"}),
        (Words{
            "validate",
            "--profile",
            "production",
            "--url",
            "https://other/",
            "--ca=" + InFolder("ca.pem"),
            "--trust=" + InFolder("sts.pem"),
            "--trust=/etc/next.pem",
            "--",
            "x"}));
}

TEST_F(AddProfileTest, LetsAnOptionWithItsValueBehindAnEqualsSignWin)
{
    const Words words = {"inspect", "--profile=production", "--trust=t.pem"};
    EXPECT_EQ(AddProfile(words, {"profile", "trust"}), words);
}

TEST_F(AddProfileTest, LeavesWhatNamesNoProfile)
{
    for (const Words& words :
         {Words{"inspect", "x"},
          Words{"inspect", "--", "--profile", "production"},
          Words{"inspect", "--profile"},
          Words{}}) {
        EXPECT_EQ(AddProfile(words, {"profile", "trust"}), words);
    }
    const Words unknown = {"help", "--profile", "production"};
    EXPECT_EQ(AddProfile(unknown, {"help"}), unknown);
}
