#include "NegotiationHarness.h"
#include "Requests.h"

#include <algorithm>
#include <array>
#include <csignal>
#include <cstdlib>
#include <fcntl.h>
#include <regex>
#include <stdexcept>
#include <sys/wait.h>
#include <unistd.h>

namespace DevStsTests {

namespace fs = std::filesystem;

namespace {

/** The program as a process of its own, its output in files. */
class Program
{
public:
    explicit Program(std::vector<std::string> arguments)
    {
        int ends[2];
        if (pipe(ends) != 0) {
            throw std::runtime_error("pipe failed");
        }
        _process = fork();
        if (_process == 0) {
            dup2(ends[1], STDOUT_FILENO);
            const int errors = open(ErrorFile().c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
            dup2(errors, STDERR_FILENO);
            close(ends[0]);
            close(ends[1]);
            Execute(std::move(arguments));
        }
        close(ends[1]);
        _output = ends[0];
    }

    ~Program()
    {
        if (_process > 0) {
            kill(_process, SIGKILL);
            waitpid(_process, nullptr, 0);
        }
        close(_output);
    }

    Program(const Program&) = delete;
    Program& operator=(const Program&) = delete;

    std::string ReadLine() const
    {
        std::string line;
        char next = 0;
        while (read(_output, &next, 1) == 1 && next != '\n') {
            line += next;
        }
        return line;
    }

    std::string ReadRest() const
    {
        std::string rest;
        std::array<char, 256> buffer{};
        ssize_t size = 0;
        while ((size = read(_output, buffer.data(), buffer.size())) > 0) {
            rest.append(buffer.data(), static_cast<std::size_t>(size));
        }
        return rest;
    }

    std::string Errors() const { return ReadText(ErrorFile()); }

    void Signal(int signal) const { kill(_process, signal); }

    int Wait()
    {
        int status = 0;
        waitpid(_process, &status, 0);
        _process = 0;
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

private:
    [[noreturn]] static void Execute(std::vector<std::string> arguments)
    {
        arguments.insert(arguments.begin(), DEVSTS_PROGRAM);
        std::vector<char*> pointers;
        pointers.reserve(arguments.size() + 1);
        for (std::string& argument : arguments) {
            pointers.push_back(argument.data());
        }
        pointers.push_back(nullptr);
        execv(DEVSTS_PROGRAM, pointers.data());
        _exit(127);
    }

    fs::path ErrorFile() const { return _dir.Path() / "stderr"; }

    TempDir _dir;
    pid_t _process = 0;
    int _output = -1;
};

std::string UrlIn(const std::string& line)
{
    std::smatch parts;
    if (!std::regex_match(line, parts, std::regex("listening on (.*)"))) {
        ADD_FAILURE() << line;
        return "";
    }
    return parts[1].str();
}

std::string StateArgument()
{
    return SharedState().string();
}

std::string Curl(const std::string& arguments)
{
    return std::string(CURL_PROGRAM) + " --silent --show-error --noproxy '*' " + arguments;
}

TEST(DevStsProgram, PrintsItsUrlAndEndsOnSigterm)
{
    Program program({"--state", StateArgument()});
    EXPECT_TRUE(std::regex_match(
        program.ReadLine(), std::regex(R"(listening on https://127\.0\.0\.1:\d+/sts)")));
    program.Signal(SIGTERM);
    EXPECT_EQ(program.Wait(), 0);
    EXPECT_EQ(program.ReadRest(), "");
    EXPECT_EQ(
        program.Errors(),
        "For development only: keys and passwords lie in plain files in " + StateArgument() + "\n");
}

TEST(DevStsProgram, EndsOnSigint)
{
    Program program({"--state", StateArgument()});
    program.ReadLine();
    program.Signal(SIGINT);
    EXPECT_EQ(program.Wait(), 0);
}

TEST(DevStsProgram, ServesPlainHttpOnRequest)
{
    const Program program({"--state", StateArgument(), "--http"});
    const std::string url = UrlIn(program.ReadLine());
    EXPECT_EQ(url.substr(0, 17), "http://127.0.0.1:");
    const CommandResult result =
        RunCommand(Curl("--output /dev/null --write-out '%{http_code}' " + url));
    EXPECT_EQ(result.output, "405");
}

TEST(DevStsProgram, CertificateHoldsForLoopbackNames)
{
    const Program program({"--state", StateArgument()});
    const std::string url = UrlIn(program.ReadLine());
    const std::string status = "--output /dev/null --write-out '%{http_code}' --cacert "
                               + (SharedState() / "ca.pem").string() + " ";
    const std::string named = Replaced(url, "127.0.0.1", "localhost");
    EXPECT_EQ(RunCommand(Curl(status + url)).output, "405");
    EXPECT_EQ(RunCommand(Curl(status + "--ipv4 " + named)).output, "405");
    const CommandResult stranger = RunCommand(
        Curl(status + "--connect-to ::127.0.0.1: " + Replaced(url, "127.0.0.1", "sts.other.test")));
    EXPECT_EQ(stranger.exitCode, 60) << stranger.output;
}

TEST(DevStsProgram, CertificateNeedsItsAuthority)
{
    const Program program({"--state", StateArgument()});
    const CommandResult result = RunCommand(Curl(UrlIn(program.ReadLine())));
    EXPECT_EQ(result.exitCode, 60) << result.output;
}

TEST(DevStsProgram, OldTlsIsRefused)
{
    const Program program({"--state", StateArgument()});
    const std::string url = UrlIn(program.ReadLine());
    const std::string status = "--insecure --output /dev/null --write-out '%{http_code}' ";
    EXPECT_EQ(RunCommand(Curl(status + "--tls-max 1.2 " + url)).output, "405");
    const CommandResult old =
        RunCommand(Curl(status + "--ciphers DEFAULT@SECLEVEL=0 --tlsv1.0 --tls-max 1.1 " + url));
    EXPECT_EQ(old.exitCode, 35) << old.output;
}

// The program keeps real time, so its requests cannot come from the standing clock.
std::string RealTime(std::string request)
{
    const DevSts::TimePoint now = DevSts::SystemTime();
    const std::string created = DevSts::FormatTime(now);
    const std::string expires = DevSts::FormatTime(now + std::chrono::minutes(10));
    request = Replaced(request, "2026-11-20T12:00:00.000Z", created);
    request = Replaced(request, "2026-11-20T12:10:00.000Z", expires);
    request = Replaced(request, "2026-11-20T12:00:00.001Z", created);
    return Replaced(request, "2026-11-20T13:00:00.001Z", expires);
}

std::string PostWithCurl(
    const std::string& url, const std::string& request, const std::string& options = "")
{
    const TempDir dir;
    WriteText(dir.Path() / "request.xml", request);
    return RunCommand(Curl(
                          options + " --cacert " + (SharedState() / "ca.pem").string()
                          + " --header 'Content-Type: text/xml' --header 'SOAPAction: \""
                          + std::string(Ns::Wst) + "/RST/Issue\"' --data-binary @"
                          + (dir.Path() / "request.xml").string() + " " + url))
        .output;
}

TEST(DevStsProgram, IssuesToCurl)
{
    const Program program({"--state", StateArgument()});
    const std::string reply = PostWithCurl(UrlIn(program.ReadLine()), RealTime(PasswordRequest()));
    EXPECT_TRUE(VerifiesWithXmlSec(AssertionIn(reply)));
}

TEST(DevStsProgram, JudgesRequestsByRealTime)
{
    const Program program({"--state", StateArgument()});
    const std::string request = Replaced(
        Replaced(PasswordRequest(), "2026-11-20T12:00:00.000Z", "2020-01-01T00:00:00.000Z"),
        "2026-11-20T12:10:00.000Z",
        "2020-01-01T00:10:00.000Z");
    const std::string reply = PostWithCurl(UrlIn(program.ReadLine()), request);
    EXPECT_EQ(FindOne(reply, "//faultcode"), "wst:ExpiredData");
}

TEST(DevStsProgram, BadListenArgumentIsRefused)
{
    Program program({"--state", StateArgument(), "--listen", "127.0.0.1"});
    EXPECT_EQ(program.Wait(), 2);
    EXPECT_EQ(
        program.Errors(),
        "ssoclient-devsts: --listen wants HOST:PORT or [IPv6]:PORT, not 127.0.0.1\n");
}

TEST(DevStsProgram, MissingStateArgumentIsRefusedInOneLine)
{
    Program program({});
    EXPECT_EQ(program.Wait(), 2);
    EXPECT_EQ(program.ReadRest(), "");
    EXPECT_EQ(program.Errors(), "ssoclient-devsts: --state is required\n");
}

TEST(DevStsProgram, MisbehavesAsItIsTold)
{
    const Program program({"--state", StateArgument(), "--http", "--misbehave", "status-404"});
    const CommandResult result = RunCommand(Curl(
        "--data x --output /dev/null --write-out '%{http_code}' " + UrlIn(program.ReadLine())));
    EXPECT_EQ(result.output.substr(0, 3), "404");
    EXPECT_EQ(
        program.Errors(),
        "Misbehaves: replies with 404 (Not Found)\n"
        "For development only: keys and passwords lie in plain files in "
            + StateArgument() + "\n");
}

TEST(DevStsProgram, ListsItsMisbehavioursWithoutAState)
{
    Program program({"--misbehave", "list"});
    const std::string list = program.ReadRest();
    EXPECT_EQ(program.Wait(), 0);
    EXPECT_NE(list.find("silent\treads the request and says nothing\n"), std::string::npos);
    EXPECT_NE(list.find("\ntls-cut:N\t"), std::string::npos);
    EXPECT_GT(std::count(list.begin(), list.end(), '\n'), 180);
}

TEST(DevStsProgram, MisbehavesOnlyAsItCan)
{
    const std::vector<std::pair<std::vector<std::string>, std::string>> refusals = {
        {{"--misbehave", "nonsense"},
         "there is no misbehaviour nonsense (see: ssoclient-devsts --misbehave list)"},
        {{"--misbehave", "tls-cut:x"},
         "tls-cut takes no \"x\" (see: ssoclient-devsts --misbehave list)"},
        {{"--misbehave", "silent:1"},
         "silent takes no \"1\" (see: ssoclient-devsts --misbehave list)"},
        {{"--misbehave", "tls-cut", "--http"}, "tls-cut needs HTTPS: leave out --http"},
        {{"--misbehave", "silent", "--keytab", "x"}, "--misbehave goes without --keytab"},
    };
    for (const auto& [arguments, refusal] : refusals) {
        std::vector<std::string> all = {"--state", StateArgument()};
        all.insert(all.end(), arguments.begin(), arguments.end());
        Program program(all);
        EXPECT_EQ(program.Wait(), 2);
        EXPECT_EQ(program.Errors(), "ssoclient-devsts: " + refusal + "\n");
    }
}

TEST(DevStsProgram, SaysThatItNegotiates)
{
    const std::string keytab = Realm::Shared().File("service.keytab");
    Program program({"--state", StateArgument(), "--keytab", keytab});
    EXPECT_NE(UrlIn(program.ReadLine()), "");
    program.Signal(SIGTERM);
    EXPECT_EQ(program.Wait(), 0);
    EXPECT_EQ(
        program.Errors(),
        "Negotiates Kerberos with the keytab " + keytab
            + "\nFor development only: keys and passwords lie in plain files in " + StateArgument()
            + "\n");
}

TEST(DevStsProgram, NegotiationCookieIsSecureOnHttps)
{
    const Program program(
        {"--state", StateArgument(), "--keytab", Realm::Shared().File("service.keytab")});
    const std::string reply = PostWithCurl(
        UrlIn(program.ReadLine()), RealTime(FirstRequest(OfferOfKerberos())), "--include");
    EXPECT_TRUE(std::regex_search(
        reply,
        std::regex("Set-Cookie: devsts-negotiation=[0-9a-f]{32}; Path=/sts; HttpOnly; Secure\r")))
        << reply;
}

TEST(DevStsProgram, KeytabThatCannotBeUsedEndsIt)
{
    const std::string keytab = (SharedState() / "sts.pem").string();
    Program program({"--state", StateArgument(), "--keytab", keytab});
    EXPECT_EQ(program.Wait(), 1);
    EXPECT_EQ(program.ReadRest(), "");
    EXPECT_EQ(
        program.Errors(),
        "ssoclient-devsts: The keytab " + keytab
            + " cannot be used: No credentials were supplied, or the credentials were unavailable "
              "or inaccessible: Keytab FILE:"
            + keytab + " is nonexistent or empty\n");
}

TEST(DevStsProgram, StateThatCannotBeUsedIsNoUsageError)
{
    Program program({"--state", "/dev/null/state"});
    EXPECT_EQ(program.Wait(), 1);
    EXPECT_NE(program.Errors().find("/dev/null/state"), std::string::npos);
}

} // namespace

} // namespace DevStsTests
