#pragma once

#include "devsts/http/Server.h"

#include <atomic>
#include <filesystem>
#include <gtest/gtest.h>
#include <string>
#include <vector>

namespace DevStsTests {

/** A directory that is removed with its content. */
class TempDir
{
public:
    TempDir();
    ~TempDir();
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;

    const std::filesystem::path& Path() const { return _path; }

private:
    std::filesystem::path _path;
};

/** A filled state directory that all tests share; making its keys takes a while. */
const std::filesystem::path& SharedState();

std::string ReadText(const std::filesystem::path& path);
void WriteText(const std::filesystem::path& path, const std::string& text);

struct CommandResult
{
    int exitCode;
    std::string output; ///< standard output and error
};

/** Runs a shell command. */
CommandResult RunCommand(const std::string& command);

/** `text` with `from`, which stands in it exactly once, replaced. */
std::string Replaced(const std::string& text, const std::string& from, const std::string& to);

/** Every node that `expression` finds in `xml`, as text. Prefixes as in Requests.h. */
std::vector<std::string> Find(const std::string& xml, const std::string& expression);

/** The one node that `expression` finds; otherwise a failure and "". */
std::string FindOne(const std::string& xml, const std::string& expression);

/** The text of the one saml:Assertion in a reply, byte for byte. */
std::string AssertionIn(const std::string& reply);

/** What xmlsec1 says of the signature of an assertion, with sts.pem of the shared state. */
bool VerifiesWithXmlSec(const std::string& assertion);

struct HttpResult
{
    int status = 0;
    std::string body;
    DevSts::Headers headers;
};

/** A server over plain HTTP whose clock stands still at 2026-11-20T12:00:00Z. */
class ServerTest : public testing::Test
{
protected:
    /** `options` count but for the state, the protocol and the clock. */
    explicit ServerTest(
        const std::filesystem::path& state = SharedState(), DevSts::Options options = {});

    static DevSts::TimePoint StartTime();

    /** POSTs to the STS as its clients do; `headers` come on top. */
    HttpResult Post(
        const std::string& action, const std::string& body, const DevSts::Headers& headers = {});
    HttpResult PostIssue(const std::string& body);

    /** A reply of 500 whose fault code is `prefix:local`; gives its faultstring. */
    static std::string FaultText(const HttpResult& result, const std::string& code);

    std::atomic<DevSts::TimePoint> _now{StartTime()};
    DevSts::Server _server;
    int _port;
};

/** A copy of the shared state that a test may change. */
class StateCopy
{
public:
    StateCopy();
    std::filesystem::path Path() const { return _dir.Path() / "state"; }

private:
    TempDir _dir;
};

/** A server whose users may be edited. */
class EditedUsersTest : private StateCopy, public ServerTest
{
protected:
    EditedUsersTest()
        : ServerTest(StateCopy::Path())
    {}

    std::filesystem::path UsersFile() const { return StateCopy::Path() / "users.json"; }
};

} // namespace DevStsTests
