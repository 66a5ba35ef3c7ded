#include "Harness.h"

#include "ssoClient/CallOptions.h"
#include "ssoClient/Exceptions.h"
#include "support/Awaited.h"
#include "support/Failure.h"
#include "support/TestServer.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <future>
#include <mutex>
#include <thread>
#include <vector>

using namespace SsoClient;

namespace {

constexpr char Cancelled[] = "CancelledException: The operation was cancelled.";

/** What the exchanges were like. */
class Exchanges final : public OperationObserver
{
public:
    void OnExchange(
        const ObservedOperation& /*operation*/,
        const Quillon::Http::ExchangeFacts& exchange) noexcept override
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _facts.push_back(exchange);
    }

    std::vector<Quillon::Http::ExchangeFacts> Get() const
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return _facts;
    }

    long CountNewConnections() const
    {
        const auto facts = Get();
        return std::count_if(facts.begin(), facts.end(), [](const auto& exchange) {
            return !exchange.isConnectionReused;
        });
    }

private:
    mutable std::mutex _mutex;
    std::vector<Quillon::Http::ExchangeFacts> _facts;
};

class CallsAtSts : public HttpsStsTest
{
protected:
    CallsAtSts() { options.observer = exchanges; }

    ServicePtr MakeControlled() const { return WithOptions(MakeService(), options); }

    boost::shared_ptr<Exchanges> exchanges = boost::make_shared<Exchanges>();
    CallOptions options;
};

/** A service that takes requests and never answers. */
class MuteService
{
public:
    MuteService() { _config.url = _server.GetUrl("/sts"); }

    ServicePtr Make(const CallOptions& options) const
    {
        return WithOptions(CreateSecurityTokenService(_config), options);
    }

    void AwaitRequest() { _isAsked.get_future().wait(); }

private:
    std::promise<void> _isAsked;
    Testing::TestServer _server{[this](Testing::ServerConnection& connection) {
        connection.ReadRequest();
        _isAsked.set_value();
        connection.WaitForClose();
    }};
    SecurityTokenServiceConfig _config;
};

} // namespace

TEST_F(CallsAtSts, KeepTheConnectionForTheNextOperation)
{
    options.connectionReuse = ConnectionReuse();
    const ServicePtr service = MakeControlled();
    TokenSpec spec = MakeSpec();
    spec.renewable = true;
    EXPECT_EQ(service->AcquireToken(AlicesName, AlicesPassword, spec)->GetSubject(), Alice());
    const TokenPtr token = service->AcquireTokenByCertificate(spec);
    EXPECT_EQ(token->GetSubject(), ServiceUser());
    EXPECT_TRUE(service->ValidateSubject(*token));
    EXPECT_NE(service->RenewToken(*token, 100), nullptr);
    AwaitedToken byToken;
    service->AcquireTokenByTokenAsync(token, spec, byToken.GetCompletion());
    EXPECT_EQ(byToken.Get().Describe(), "success");
    EXPECT_EQ(exchanges->Get().size(), 5U);
    EXPECT_EQ(exchanges->CountNewConnections(), 1);
}

TEST_F(CallsAtSts, HaveConnectionsOfTheirOwnUnlessToldOtherwise)
{
    const ServicePtr service = MakeControlled();
    service->AcquireToken(AlicesName, AlicesPassword, MakeSpec());
    service->AcquireToken(AlicesName, AlicesPassword, MakeSpec());
    EXPECT_EQ(exchanges->CountNewConnections(), 2);
    EXPECT_TRUE(exchanges->Get().back().isSessionResumed);
}

TEST_F(CallsAtSts, ShareKeptConnectionsBetweenThreads)
{
    constexpr int Threads = 8;
    constexpr int Rounds = 10;
    options.connectionReuse = ConnectionReuse{Threads, 60'000'000};
    const ServicePtr service = MakeControlled();
    std::vector<std::thread> threads;
    for (int i = 0; i < Threads; ++i) {
        threads.emplace_back([&service, byPassword = i % 2 == 0] {
            for (int round = 0; round < Rounds; ++round) {
                const TokenPtr token =
                    byPassword ? service->AcquireToken(AlicesName, AlicesPassword, MakeSpec())
                               : service->AcquireTokenByCertificate(MakeSpec());
                EXPECT_EQ(token->GetSubject(), byPassword ? Alice() : ServiceUser());
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(exchanges->Get().size(), static_cast<std::size_t>(Threads * Rounds));
    EXPECT_LE(exchanges->CountNewConnections(), Threads);
}

TEST_F(CallsAtSts, ThatAreCancelledDoNotHarmTheNext)
{
    const CancellationSource source;
    options.connectionReuse = ConnectionReuse();
    options.cancellation = source.GetToken();
    const ServicePtr first = MakeControlled();
    first->AcquireToken(AlicesName, AlicesPassword, MakeSpec());
    source.Cancel();
    EXPECT_EQ(
        GetFailure([&] { first->AcquireToken(AlicesName, AlicesPassword, MakeSpec()); }),
        Cancelled);
    options.cancellation = CancellationToken();
    const ServicePtr next = WithOptions(first, options);
    EXPECT_EQ(next->AcquireToken(AlicesName, AlicesPassword, MakeSpec())->GetSubject(), Alice());
}

TEST(Calls, EndWhileTheyWaitForAReply)
{
    const CancellationSource source;
    CallOptions options;
    options.cancellation = source.GetToken();
    MuteService mute;
    const ServicePtr service = mute.Make(options);
    std::thread canceller([&] {
        mute.AwaitRequest();
        source.Cancel();
    });
    EXPECT_EQ(GetFailure([&] { service->AcquireToken("jdoe", "s3cret", MakeSpec()); }), Cancelled);
    canceller.join();
}

TEST(Calls, EndWhileTheyWaitForAReplyOnAThreadOfThePool)
{
    const CancellationSource source;
    CallOptions options;
    options.cancellation = source.GetToken();
    MuteService mute;
    AwaitedToken awaited;
    mute.Make(options)->AcquireTokenAsync("jdoe", "s3cret", MakeSpec(), awaited.GetCompletion());
    mute.AwaitRequest();
    source.Cancel();
    const auto told = awaited.Get();
    EXPECT_EQ(told.Describe(), Cancelled);
    EXPECT_NE(told.thread, std::this_thread::get_id());
}

TEST(Calls, EndAtTheirDeadline)
{
    CallOptions options;
    options.deadlineMicroseconds = 50'000;
    MuteService mute;
    EXPECT_EQ(
        GetFailure([&] { mute.Make(options)->AcquireToken("jdoe", "s3cret", MakeSpec()); }),
        "TimeoutException: The operation was not complete within its 50 milliseconds.");
}

TEST(Calls, TryAServiceAgainThatCannotBeReached)
{
    const auto exchanges = boost::make_shared<Exchanges>();
    CallOptions options;
    options.observer = exchanges;
    options.retry.attempts = 3;
    options.retry.firstDelayMicroseconds = 1;
    SecurityTokenServiceConfig config;
    config.url = "http://127.0.0.1:1/sts";
    const ServicePtr service = WithOptions(CreateSecurityTokenService(config), options);
    EXPECT_EQ(
        GetFailure([&] { service->AcquireToken("jdoe", "s3cret", MakeSpec()); }),
        "HttpException: Cannot connect to 127.0.0.1 port 1: Connection refused.");
    EXPECT_EQ(exchanges->Get().size(), 3U);
}
