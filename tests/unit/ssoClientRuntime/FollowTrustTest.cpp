#include "ssoClientRuntime/TokenSource.h"
#include "ssoClientRuntime/TrustStore.h"

#include "support/Failure.h"
#include "support/FixedClock.h"
#include "support/PoolSupport.h"
#include "support/TestData.h"
#include "support/TestServer.h"

#include "ssoClient/CallOptions.h"
#include "ssoClient/Exceptions.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <filesystem>
#include <fstream>
#include <functional>
#include <future>
#include <mutex>
#include <string>
#include <thread>
#include <unistd.h>
#include <vector>

using namespace SsoClient;

namespace {

namespace fs = std::filesystem;
using Token = boost::shared_ptr<const SamlToken>;

constexpr char WhenTokensAreValid[] = "2026-06-15T12:00:00Z";

/** [WST13 4.4] */
std::string MakeReply(const std::string& token)
{
    const std::string trust = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
    const std::string body =
        "<S:Envelope xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\"><S:Body>"
        "<RequestSecurityTokenResponseCollection xmlns=\""
        + trust + "\"><RequestSecurityTokenResponse><RequestedSecurityToken>" + token
        + "</RequestedSecurityToken></RequestSecurityTokenResponse>"
          "</RequestSecurityTokenResponseCollection></S:Body></S:Envelope>";
    return "HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: "
           + std::to_string(body.size()) + "\r\n\r\n" + body;
}

/** A token service that issues one token to everybody, and can change its key. */
class RollingService
{
public:
    explicit RollingService(const std::string& token) { Issue(token); }

    /** From now on. */
    void Issue(const std::string& token)
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _reply = MakeReply(token);
    }

    /** Called after each request has come, before it is answered. */
    void SetBefore(std::function<void()> before)
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _before = std::move(before);
    }

    std::string GetUrl() const { return _server.GetUrl(); }

private:
    void Serve(Testing::ServerConnection& connection)
    {
        while (connection.ReadRequest()) {
            std::function<void()> before;
            std::string reply;
            {
                const std::lock_guard<std::mutex> lock(_mutex);
                before = _before;
                reply = _reply;
            }
            before();
            connection.Write(reply);
        }
    }

    std::mutex _mutex;
    std::string _reply;
    std::function<void()> _before = [] {};
    Testing::TestServer _server{[this](Testing::ServerConnection& one) { Serve(one); }};
};

class FollowTrustTest : public testing::Test
{
protected:
    FollowTrustTest()
    {
        Trust("old.pem", "sts");
        options.followsChanges = false;
        store = CreateTrustStore(folder, options);
        config.url = sts.GetUrl();
    }
    ~FollowTrustTest() override { fs::remove_all(folder); }

    /** Puts a certificate in its place as a whole. */
    void Trust(const std::string& file, const std::string& certificate) const
    {
        std::ofstream(folder / "new") << ReadTestData("keys/" + certificate + "-cert.pem");
        fs::rename(folder / "new", folder / file);
    }

    boost::shared_ptr<SecurityTokenService> Make() const
    {
        return FollowTrust(CreateSecurityTokenService(config), store);
    }

    /** Returns when the store's thread has seen what was changed. */
    void AwaitTrusted(std::size_t count) const
    {
        while (store->Get()->size() != count) {
            std::this_thread::yield();
        }
    }

    static Token Acquire(const SecurityTokenService& service)
    {
        return service.AcquireToken("alice", "secret", TokenSpec());
    }

    static fs::path MakeFolder()
    {
        std::string name = (fs::temp_directory_path() / "ssoclient-follow-XXXXXX").string();
        return ::mkdtemp(name.data());
    }

    const std::string old = ReadTestData("tokens/accepted/bearer.xml");
    const std::string next = ReadTestData("tokens/accepted/rsa-3072.xml");
    const fs::path folder = MakeFolder();
    FixedClock clock{WhenTokensAreValid};
    RollingService sts{old};
    TrustStoreOptions options;
    boost::shared_ptr<TrustStore> store;
    SecurityTokenServiceConfig config;
};

} // namespace

TEST_F(FollowTrustTest, TrustsWhatTheStoreHasAtTheMoment)
{
    const auto service = Make();
    EXPECT_NE(nullptr, Acquire(*service));
    sts.Issue(next);
    EXPECT_THROW(Acquire(*service), SsoException);
    Trust("next.pem", "sts-second");
    EXPECT_THROW(Acquire(*service), SsoException); // nobody has read it yet
    store->Reload();
    EXPECT_NE(nullptr, Acquire(*service));
    fs::remove(folder / "old.pem");
    store->Reload();
    EXPECT_NE(nullptr, Acquire(*service));
    sts.Issue(old);
    EXPECT_THROW(Acquire(*service), SsoException);
}

TEST_F(FollowTrustTest, DoesNotAskTheConfiguration)
{
    config.trustedCertificates = GetTestCertificates("sts-second");
    const auto service = Make();
    EXPECT_NE(nullptr, Acquire(*service));
    sts.Issue(next);
    EXPECT_THROW(Acquire(*service), SsoException);
}

TEST_F(FollowTrustTest, LeavesAnOperationTheSetWithWhichItBegan)
{
    const auto service = Make();
    sts.SetBefore([this] {
        Trust("old.pem", "sts-second");
        store->Reload();
    });
    EXPECT_NE(nullptr, Acquire(*service));
    EXPECT_THROW(Acquire(*service), SsoException);
}

TEST_F(FollowTrustTest, LeavesAnAsynchronousOperationTheSetWithWhichItBegan)
{
    const auto service = Make();
    Testing::Gate gate;
    sts.SetBefore(gate.MakeWaiter());
    std::promise<Token> outcome;
    service->AcquireTokenAsync(
        "alice", "secret", TokenSpec(), [&](const Token& token, const Quillon::Exception*) {
            outcome.set_value(token);
        });
    Trust("old.pem", "sts-second");
    store->Reload();
    gate.Open();
    EXPECT_NE(nullptr, outcome.get_future().get());
}

TEST_F(FollowTrustTest, KeepsTheOptionsOfTheService)
{
    CallOptions calls;
    calls.cancellation = [] {
        const CancellationSource source;
        source.Cancel();
        return source.GetToken();
    }();
    const auto service = FollowTrust(WithOptions(CreateSecurityTokenService(config), calls), store);
    EXPECT_THROW(Acquire(*service), CancelledException);
}

TEST_F(FollowTrustTest, RefusesWhatItCannotFollow)
{
    EXPECT_EQ(
        "InvalidArgumentException: Invalid argument : There is no service.",
        GetFailure([this] { FollowTrust(nullptr, store); }));
    EXPECT_EQ(
        "InvalidArgumentException: Invalid argument : There is no store of trusted certificates.",
        GetFailure([this] { FollowTrust(CreateSecurityTokenService(config), nullptr); }));
    EXPECT_EQ(
        "InvalidArgumentException: Invalid argument : The service is not one that this library "
        "made.",
        GetFailure([this] { FollowTrust(Make(), store); }));
    EXPECT_EQ(
        "InvalidArgumentException: Invalid argument : A trusted certificate is null",
        GetFailure(
            [this] { WithTrustedCertificates(CreateSecurityTokenService(config), {nullptr}); }));
}

/**
 * A service changes its key: both certificates are there before, then only the new one. Beside it
 * somebody issues tokens with a key that nobody trusts.
 */
TEST_F(FollowTrustTest, RollsOverUnderLoad)
{
    options.followsChanges = true;
    store = CreateTrustStore(folder, options);
    const auto service = Make();
    RollingService forger(
        ReadTestData("tokens/refused/signing-key/key-foreign-trusted-certificate.xml"));
    config.url = forger.GetUrl();
    const auto forged = Make();

    std::array<std::atomic<unsigned>, 4> rounds{}; // of each thread, and of the source
    const auto source = CreateTokenSource([&] {
        const Token token = Acquire(*service);
        ++rounds.back();
        return token;
    });
    std::atomic<bool> isOver{false};
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i + 1 < rounds.size(); ++i) {
        threads.emplace_back([&, i] {
            while (!isOver) {
                EXPECT_NE(nullptr, Acquire(*service));
                EXPECT_THROW(Acquire(*forged), SsoException);
                source->Refresh();
                EXPECT_NE(nullptr, source->GetToken());
                EXPECT_EQ(nullptr, source->GetStatus().outage.reason);
                ++rounds[i];
            }
        });
    }
    const auto letAllEndThatBegan = [&] {
        for (std::atomic<unsigned>& round : rounds) {
            const unsigned before = round;
            while (round < before + 2) {
                std::this_thread::yield();
            }
        }
    };
    const auto rollOver = [&](const std::string& certificate, const std::string& token) {
        Trust("next.pem", certificate);
        AwaitTrusted(2);
        letAllEndThatBegan();
        sts.Issue(token);
        letAllEndThatBegan();
        fs::rename(folder / "next.pem", folder / "old.pem");
        AwaitTrusted(1);
    };
    rollOver("sts-second", next);
    rollOver("sts", old);
    rollOver("sts-second", next);
    letAllEndThatBegan();
    isOver = true;
    for (std::thread& thread : threads) {
        thread.join();
    }
    while (source->GetStatus().isBusy) {
        std::this_thread::yield();
    }
    EXPECT_EQ(nullptr, source->GetStatus().outage.reason);
    sts.Issue(old); // with the key that is no longer trusted
    EXPECT_THROW(Acquire(*service), SsoException);
}
