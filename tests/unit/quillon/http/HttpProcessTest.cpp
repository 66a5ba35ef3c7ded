#include "HttpClient.h"
#include "NameLookup.h"
#include "support/TestTls.h"
#include "system/ProcessMutex.h"

#include "quillon/ssl/SSLContext.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <clocale>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <future>
#include <latch>
#include <libintl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <vector>

using namespace Quillon::Http;
using namespace Testing;
using Quillon::Exception;
using Quillon::Ref;

// In a child that was forked from a process with threads, what only a thread's stack refers to
// looks like a leak.
static bool leakCheckIsOff = false;

extern "C" int __lsan_is_turned_off() // NOLINT(bugprone-reserved-identifier): the sanitizer's
{
    return leakCheckIsOff ? 1 : 0;
}

// What concerns a whole process runs in a fresh one: a "death test" that ends with exit code 0.

namespace {

class ProcessTest : public testing::Test
{
protected:
    ProcessTest() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

Identity MakeLocalIdentity()
{
    CertificateOptions options;
    options.alternativeNames = "IP:127.0.0.1";
    return MakeIdentity(options);
}

/** TLS to `server`, whose self-signed certificate is trusted. */
Ref<ConnectionSpec> MakeTlsSpec(const TestServer& server, const Identity& identity)
{
    Quillon::Ssl::SSLContextOptions options;
    options.useSystemAuthorities = false;
    const std::vector<unsigned char> der = identity.GetDer();
    options.authorities.push_back(Quillon::Crypto::CreateCertificate(der.data(), der.size()));
    const Ref<Quillon::Ssl::SSLContext> context = Quillon::Ssl::CreateSSLContext(options);
    Ref<ConnectionSpec> spec;
    CreateSSLConnectionSpec(MakeTcpSpec(server).get(), context.get(), "127.0.0.1", "", spec);
    return spec;
}

/** Ends the process with plain, TLS and name look-up exchanges under way. */
[[noreturn]] void ExitInFlight()
{
    constexpr int Count = 8;
    static std::latch asked(Count);
    const TestServer::Handler handler = [](ServerConnection& connection) {
        connection.ReadRequest();
        asked.count_down();
        connection.WaitForClose();
    };
    static const Identity identity = MakeLocalIdentity();
    static TlsServer tls(identity);
    static const TestServer plainServer(handler);
    static const TestServer tlsServer(handler, tls.GetStreams());
    static NameLookup::Block block;

    const Ref<ConnectionSpec> tlsSpec = MakeTlsSpec(tlsServer, identity);
    Ref<ConnectionSpec> lookupSpec;
    CreateTCPConnectionSpec(NameLookup::BlockedHost, 80, false, lookupSpec);

    static std::vector<HttpClient> clients;
    static std::vector<Ref<PendingRequestItem>> pending;
    const auto completion = [](const Exception*, ClientResponse*, PendingRequestItem*) {
        std::abort();
    };
    for (int index = 0; index < Count; ++index) {
        clients.emplace_back(index % 2 == 0 ? MakeTcpSpec(plainServer) : tlsSpec);
        pending.push_back(clients.back().Start(HttpClient::MakeRequest(), completion));
    }
    clients.emplace_back(lookupSpec);
    pending.push_back(clients.back().Start(HttpClient::MakeRequest(), completion));
    asked.wait();
    block.WaitUntilAsked();
    std::exit(0);
}

TEST_F(ProcessTest, ExitsWithExchangesInFlight)
{
    EXPECT_EXIT(ExitInFlight(), testing::ExitedWithCode(0), "^$");
}

/** Leaves a thread waiting for an exchange while static objects are destroyed. */
[[noreturn]] void ExitWithAWaiter()
{
    static std::promise<void> asked;
    static const TestServer server([](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write(MakeReply("200 OK", "pong"));
        if (connection.ReadRequest()) {
            asked.set_value();
        }
        connection.WaitForClose();
    });
    // Older than the HTTP threads, so that it is destroyed after they have stopped.
    static struct Joiner
    {
        std::thread thread;
        ~Joiner() { thread.join(); }
    } joiner;
    // Never destroyed: the thread uses it until the joiner has joined.
    static HttpClient& client = *new HttpClient(server);
    client.Post();
    joiner.thread = std::thread([] {
        if (client.PostAndFail() != "The process is about to end.") {
            std::abort();
        }
    });
    asked.get_future().wait();
    std::exit(0);
}

TEST_F(ProcessTest, ReleasesThoseWhoWaitWhenItExits)
{
    EXPECT_EXIT(ExitWithAWaiter(), testing::ExitedWithCode(0), "^$");
}

[[noreturn]] void ExitInsideACompletion()
{
    static const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(),
        [](const Exception*, ClientResponse*, PendingRequestItem*) { std::exit(0); });
    std::promise<void>().get_future().wait();
    std::abort();
}

TEST_F(ProcessTest, MayExitInsideACompletion)
{
    EXPECT_EXIT(ExitInsideACompletion(), testing::ExitedWithCode(0), "^$");
}

[[noreturn]] void ExitWithABlockedCompletion()
{
    static std::promise<void> entered;
    static std::promise<void> never;
    static const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    static HttpClient client(server);
    static const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(), [](const Exception*, ClientResponse*, PendingRequestItem*) {
            entered.set_value();
            never.get_future().wait();
        });
    entered.get_future().wait();
    std::exit(0);
}

TEST_F(ProcessTest, ExitsWhileACompletionBlocks)
{
    EXPECT_EXIT(ExitWithABlockedCompletion(), testing::ExitedWithCode(0), "^$");
}

TEST_F(ProcessTest, SendsNothingAfterItsEnd)
{
    EXPECT_EXIT(
        {
            // Destroyed after the HTTP threads have stopped, because it is older.
            static struct Late
            {
                std::unique_ptr<TestServer> server;
                ~Late()
                {
                    const std::string text = HttpClient(*server).PostAndFail();
                    if (text != "The process is about to end and sends nothing any more.") {
                        std::abort();
                    }
                }
            } late;
            late.server = std::make_unique<TestServer>(AnswerAll(MakeReply("200 OK", "pong")));
            HttpClient(*late.server).Post();
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

/** The exit code of a forked child that runs `action`. */
template <class Action>
int RunInChild(const Action& action)
{
    const pid_t child = fork();
    if (child == 0) {
        std::exit(action() ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

/** A server in a process of its own, so that a fork takes no server thread away. */
int ServeInChild(pid_t& server)
{
    int channel[2];
    if (pipe(channel) != 0) {
        std::abort();
    }
    server = fork();
    if (server == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL); // or a test that crashes would wait for its server
        const TestServer testServer(AnswerAll(MakeReply("200 OK", "pong")));
        const int port = testServer.GetPort();
        if (write(channel[1], &port, sizeof port) != sizeof port) {
            std::abort();
        }
        for (;;) {
            pause();
        }
    }
    int port = 0;
    if (read(channel[0], &port, sizeof port) != sizeof port) {
        std::abort();
    }
    return port;
}

std::string PostTo(int port)
{
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec("127.0.0.1", port, false, spec);
    try {
        return HttpClient(spec).Post().body;
    } catch (const HttpException& error) {
        return error.what();
    }
}

[[noreturn]] void ForkBeforeTheFirstExchange()
{
    pid_t server = 0;
    const int port = ServeInChild(server);
    const bool childIsGood = RunInChild([&] { return PostTo(port) == "pong"; }) == 0;
    const bool parentIsGood = PostTo(port) == "pong";
    kill(server, SIGKILL);
    std::exit(childIsGood && parentIsGood ? 0 : 1);
}

TEST_F(ProcessTest, MayForkBeforeItsFirstExchange)
{
    EXPECT_EXIT(ForkBeforeTheFirstExchange(), testing::ExitedWithCode(0), "^$");
}

[[noreturn]] void ForkAfterTheFirstExchange()
{
    pid_t server = 0;
    const int port = ServeInChild(server);
    const bool parentIsGood = PostTo(port) == "pong";
    const bool childIsGood = RunInChild([&] {
                                 leakCheckIsOff = true;
                                 return PostTo(port)
                                        == "The process has forked after its first HTTP exchange; "
                                           "the child cannot send. "
                                           "Fork first.";
                             })
                             == 0;
    const bool parentIsStillGood = PostTo(port) == "pong";
    kill(server, SIGKILL);
    std::exit(childIsGood && parentIsGood && parentIsStillGood ? 0 : 1);
}

/** A child that waits for an exchange of its parent, calls it off and closes its connections. */
[[noreturn]] void ForkWithAnExchangeUnderWay()
{
    std::promise<void> asked;
    std::promise<void> mayAnswer;
    const TestServer server([&](ServerConnection& connection) {
        connection.ReadRequest();
        asked.set_value();
        mayAnswer.get_future().wait();
        connection.Write(MakeReply("200 OK", "pong"));
    });
    auto client = std::make_unique<HttpClient>(server);
    const Ref<PendingRequestItem> pending = client->Start(HttpClient::MakeRequest());
    asked.get_future().wait();
    const bool childIsGood = RunInChild([&] {
                                 leakCheckIsOff = true;
                                 alarm(10); // a child that hangs ends here
                                 bool isTold = false;
                                 try {
                                     client->Wait(*pending);
                                 } catch (const HttpException&) {
                                     isTold = pending->Cancel();
                                 }
                                 client.reset();
                                 return isTold;
                             })
                             == 0;
    mayAnswer.set_value();
    std::_Exit(childIsGood && client->Wait(*pending).body == "pong" ? 0 : 1);
}

TEST_F(ProcessTest, TellsAChildThatTheExchangesAreItsParents)
{
    EXPECT_EXIT(ForkWithAnExchangeUnderWay(), testing::ExitedWithCode(0), "^$");
}

TEST_F(ProcessTest, TellsAChildThatForkedTooLate)
{
    EXPECT_EXIT(ForkAfterTheFirstExchange(), testing::ExitedWithCode(0), "^$");
}

/** Forks while a thread is inside the HTTP client's lock; the child makes a pool. */
[[noreturn]] void ForkInsideTheLock()
{
    Quillon::System::ProcessMutex mutex;
    std::promise<void> taken;
    std::promise<void> mayLeave;
    std::thread holder([&] {
        const Quillon::System::ProcessLock lock(mutex);
        taken.set_value();
        mayLeave.get_future().wait();
    });
    taken.get_future().wait();
    const bool childIsGood = RunInChild([&] {
                                 leakCheckIsOff = true;
                                 alarm(10); // a child that hangs ends here
                                 const bool isTold =
                                     !Quillon::System::ProcessLock(mutex).IsIntact();
                                 return isTold && Quillon::System::ProcessLock(mutex).IsIntact();
                             })
                             == 0;
    mayLeave.set_value();
    holder.join();
    std::exit(childIsGood && Quillon::System::ProcessLock(mutex).IsIntact() ? 0 : 1);
}

TEST_F(ProcessTest, TakesALockOverFromAThreadOfItsParent)
{
    EXPECT_EXIT(ForkInsideTheLock(), testing::ExitedWithCode(0), "^$");
}

std::string PostWithoutDescriptors(int port)
{
    rlimit usual{};
    getrlimit(RLIMIT_NOFILE, &usual);
    const rlimit none{0, usual.rlim_max};
    setrlimit(RLIMIT_NOFILE, &none);
    const std::string text = PostTo(port);
    setrlimit(RLIMIT_NOFILE, &usual);
    return text;
}

/** Sends without a free descriptor, at first and later, and with them after each. */
[[noreturn]] void RunOutOfDescriptors()
{
    pid_t server = 0; // a process of its own, because the limit is one of a process
    const int port = ServeInChild(server);
    const std::string atFirst = PostWithoutDescriptors(port);
    const bool recovers = PostTo(port) == "pong";
    const std::string later = PostWithoutDescriptors(port);
    const bool recoversAgain = PostTo(port) == "pong";
    kill(server, SIGKILL);
    const bool isGood = atFirst == "The HTTP threads cannot be started: Too many open files."
                        && later
                               == "Cannot connect to 127.0.0.1 port " + std::to_string(port)
                                      + ": Too many open files.";
    std::exit(isGood && recovers && recoversAgain ? 0 : 1);
}

// Where a sanitizer looks at an object's type it reads the memory through a pipe.
#if defined(__has_feature)
#if __has_feature(undefined_behavior_sanitizer)
#define SANITIZER_NEEDS_DESCRIPTORS
#endif
#endif

TEST_F(ProcessTest, RecoversFromALackOfDescriptors)
{
#ifdef SANITIZER_NEEDS_DESCRIPTORS
    GTEST_SKIP() << "the sanitizer needs a descriptor itself";
#endif
    EXPECT_EXIT(RunOutOfDescriptors(), testing::ExitedWithCode(0), "^$");
}

/** Writes a catalogue of one message [GNU gettext 10.3]. */
void WriteCatalogue(
    const std::filesystem::path& path, const std::string& original, const std::string& translation)
{
    constexpr std::uint32_t Magic = 0x950412de;
    const auto originalSize = static_cast<std::uint32_t>(original.size());
    const auto translationSize = static_cast<std::uint32_t>(translation.size());
    constexpr std::uint32_t Texts = 11 * sizeof(std::uint32_t);
    const std::uint32_t words[] = {
        Magic,
        0,  // the revision
        1,  // how many messages there are
        28, // where the table of the originals begins
        36, // where that of the translations begins
        0,  // no hash table
        0,
        originalSize,
        Texts,
        translationSize,
        Texts + originalSize + 1};
    std::filesystem::create_directories(path.parent_path());
    std::ofstream file(path, std::ios::binary);
    file.write(reinterpret_cast<const char*>(words), sizeof words);
    file.write(original.c_str(), originalSize + 1);
    file.write(translation.c_str(), translationSize + 1);
}

/** Makes the system speak a language that it knows one sentence of. @return whether it does. */
bool SpeakAnotherLanguage(const std::filesystem::path& folder)
{
    WriteCatalogue(
        folder / "xx/LC_MESSAGES/libc.mo", "Connection refused", "Xerbindung xerweigert");
    std::filesystem::create_directory_symlink("/usr/lib/locale/C.utf8", folder / "xx_XX.utf8");
    setenv("LOCPATH", folder.c_str(), 1);
    unsetenv("LANGUAGE");
    return std::setlocale(LC_ALL, "xx_XX.utf8") != nullptr
           && bindtextdomain("libc", folder.c_str()) != nullptr
           && strerror(ECONNREFUSED) == std::string("Xerbindung xerweigert");
}

/** @return 0 if the system's error is told in English although the host speaks otherwise. */
int PostInAnotherLanguage()
{
    const std::filesystem::path folder = testing::TempDir() + "locale-" + std::to_string(getpid());
    const bool speaks = SpeakAnotherLanguage(folder);
    int port = 0;
    {
        const TestServer gone(AnswerAndClose(""));
        port = gone.GetPort();
    }
    const std::string text = PostTo(port);
    std::filesystem::remove_all(folder);
    const std::string expected =
        "Cannot connect to 127.0.0.1 port " + std::to_string(port) + ": Connection refused.";
    return speaks && text == expected ? 0 : 1;
}

TEST_F(ProcessTest, TellsErrorsOfTheSystemInEnglish)
{
    if (!std::filesystem::exists("/usr/lib/locale/C.utf8")) {
        GTEST_SKIP() << "there is no locale whose files could be had under another name";
    }
    EXPECT_EXIT(std::exit(PostInAnotherLanguage()), testing::ExitedWithCode(0), "^$");
}

/** @return 0 if an exchange succeeds and leaves nothing in the file for TLS keys. */
int PostWithKeyLog()
{
    const std::string path = testing::TempDir() + "keylog-" + std::to_string(getpid());
    setenv("SSLKEYLOGFILE", path.c_str(), 1);
    const Identity identity = MakeLocalIdentity();
    TlsServer tls(identity);
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")), tls.GetStreams());
    const std::string body = HttpClient(MakeTlsSpec(server, identity)).Post().body;
    const bool hasKeys = std::ifstream(path).peek() != std::ifstream::traits_type::eof();
    std::remove(path.c_str());
    return body == "pong" && !hasKeys ? 0 : 1;
}

TEST_F(ProcessTest, WritesNoTlsKeysForTheEnvironment)
{
    EXPECT_EXIT(std::exit(PostWithKeyLog()), testing::ExitedWithCode(0), "^$");
}

/** @return 0 if a server that shows a certificate of that digest is told from a good one. */
int PostWithSecurityLevelOfTheEnvironment(int level, const EVP_MD* digest, bool isAccepted)
{
    const std::string path = testing::TempDir() + "openssl-" + std::to_string(getpid());
    std::ofstream(path) << "openssl_conf = init\n[init]\nssl_conf = ssl\n[ssl]\n"
                           "system_default = default\n[default]\n"
                           "CipherString = DEFAULT:@SECLEVEL="
                        << level << "\n";
    setenv("OPENSSL_CONF", path.c_str(), 1);
    CertificateOptions authorityOptions;
    authorityOptions.isAuthority = true;
    const Identity authority = MakeIdentity(authorityOptions);
    CertificateOptions options;
    options.alternativeNames = "IP:127.0.0.1";
    options.digest = digest;
    options.rsaBits = 2048;
    const Identity identity = MakeIdentity(options, &authority);
    TlsServer tls(identity, 0);
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")), tls.GetStreams());
    const std::string failure = HttpClient(MakeTlsSpec(server, authority)).PostAndFail();
    std::remove(path.c_str());
    return failure.empty() == isAccepted ? 0 : 1;
}

TEST_F(ProcessTest, LetsTheEnvironmentWeakenNoTls)
{
    EXPECT_EXIT(
        std::exit(PostWithSecurityLevelOfTheEnvironment(0, EVP_sha1(), false)),
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ProcessTest, KeepsAStricterSecurityLevelOfTheEnvironment)
{
    // Level 3 wants 128 bits, which RSA has with 3072.
    EXPECT_EXIT(
        std::exit(PostWithSecurityLevelOfTheEnvironment(3, EVP_sha256(), false)),
        testing::ExitedWithCode(0),
        "^$");
    EXPECT_EXIT(
        std::exit(PostWithSecurityLevelOfTheEnvironment(2, EVP_sha256(), true)),
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ProcessTest, TakesNoAuthoritiesFromTheEnvironment)
{
    setenv("SSL_CERT_FILE", "/nonexistent", 1);
    setenv("SSL_CERT_DIR", "/nonexistent", 1);
    EXPECT_NO_THROW(Quillon::Ssl::CreateSSLContext({}));
    unsetenv("SSL_CERT_FILE");
    unsetenv("SSL_CERT_DIR");
}

} // namespace
