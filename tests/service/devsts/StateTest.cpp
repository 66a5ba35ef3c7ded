#include "Harness.h"
#include "Requests.h"

#include <sys/stat.h>

namespace DevStsTests {

namespace fs = std::filesystem;

namespace {

std::string OpenFailure(const fs::path& state)
{
    DevSts::Options options;
    options.stateDir = state;
    try {
        DevSts::Server server(options);
    } catch (const std::runtime_error& error) {
        return error.what();
    }
    return "";
}

mode_t ModeOf(const fs::path& path)
{
    struct stat status = {};
    EXPECT_EQ(stat(path.c_str(), &status), 0) << path;
    return status.st_mode & 0777U;
}

TEST(State, SecretsAreTheOwnersAlone)
{
    for (const char* name : {"ca.key", "sts.key", "client.key", "users.json"}) {
        EXPECT_EQ(ModeOf(SharedState() / name), 0600U) << name;
    }
}

TEST(State, SigningKeyIsRsa2048)
{
    const CommandResult result = RunCommand(
        std::string(OPENSSL_PROGRAM) + " x509 -noout -text -in "
        + (SharedState() / "sts.pem").string());
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_NE(result.output.find("Public-Key: (2048 bit)"), std::string::npos) << result.output;
    EXPECT_NE(result.output.find("sha256WithRSAEncryption"), std::string::npos);
}

TEST(State, SecondStartKeepsEveryFile)
{
    const StateCopy state;
    std::map<std::string, std::string> before;
    for (const auto& entry : fs::directory_iterator(state.Path())) {
        before[entry.path().filename()] = ReadText(entry.path());
    }
    EXPECT_EQ(before.size(), 7U);
    EXPECT_EQ(OpenFailure(state.Path()), "");
    for (const auto& [name, text] : before) {
        EXPECT_EQ(ReadText(state.Path() / name), text) << name;
    }
}

TEST(State, KeyWithoutCertificateIsReported)
{
    const StateCopy state;
    fs::remove(state.Path() / "sts.pem");
    EXPECT_EQ(
        OpenFailure(state.Path()),
        (state.Path() / "sts.pem").string() + " is missing although "
            + (state.Path() / "sts.key").string()
            + " is there: delete both to have them made anew");
}

TEST(State, MistypedUserFieldIsReported)
{
    const StateCopy state;
    WriteText(state.Path() / "users.json", R"({"users": [{"name": "a@b", "pasword": "secret"}]})");
    EXPECT_EQ(OpenFailure(state.Path()), "users.json: unknown field 'pasword'");
}

TEST(State, UserWithoutDomainIsReported)
{
    const StateCopy state;
    WriteText(state.Path() / "users.json", R"({"users": [{"name": "alice@"}]})");
    EXPECT_EQ(
        OpenFailure(state.Path()), "users.json: name 'alice@' is not of the form name@domain");
}

TEST(State, GroupWithoutDomainIsReported)
{
    const StateCopy state;
    WriteText(state.Path() / "users.json", R"({"users": [{"name": "a@b", "groups": ["Users"]}]})");
    EXPECT_EQ(
        OpenFailure(state.Path()), "users.json: group 'Users' is not of the form DOMAIN\\group");
}

using EditedUsers = EditedUsersTest;

TEST_F(EditedUsers, NewPasswordHoldsFromTheNextRequest)
{
    WriteText(UsersFile(), Replaced(ReadText(UsersFile()), "alice-secret", "fresh-secret"));
    EXPECT_EQ(
        FaultText(PostIssue(PasswordRequest()), "wst:FailedAuthentication"),
        "Invalid user name or password");
    EXPECT_EQ(PostIssue(Replaced(PasswordRequest(), "alice-secret", "fresh-secret")).status, 200);
}

TEST_F(EditedUsers, UserWithoutPasswordCannotLogOn)
{
    WriteText(UsersFile(), R"({"users": [{"name": "alice@example.test"}]})");
    EXPECT_EQ(
        FaultText(
            PostIssue(Replaced(PasswordRequest(), "alice-secret", "")), "wst:FailedAuthentication"),
        "Invalid user name or password");
}

TEST_F(EditedUsers, BrokenFileIsTheServersFault)
{
    WriteText(UsersFile(), R"({"users": [{}]})");
    EXPECT_EQ(
        FaultText(PostIssue(PasswordRequest()), "soapenv:Server"),
        "users.json: [json.exception.out_of_range.403] key 'name' not found");
}

} // namespace

} // namespace DevStsTests
