#include "ssoClientRuntime/TokenSource.h"

#include "ScriptedService.h"
#include "VirtualEnvironment.h"

#include "support/Failure.h"
#include "support/PoolSupport.h"
#include "support/TestData.h"

#include "quillon/service/Logger.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <boost/smart_ptr/weak_ptr.hpp>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <future>
#include <optional>
#include <string>
#include <thread>
#include <vector>

using namespace SsoClient;
using namespace std::chrono_literals;
using Testing::AlmostOne;
using Testing::ScriptedService;
using Testing::Token;
using Testing::VirtualEnvironment;

namespace {

using Calls = std::vector<std::string>;

/** A source in virtual time, whose service does what the test says. */
class TokenSourceTest : public testing::Test
{
protected:
    TokenSourceTest()
    {
        options.environment = environment;
        Quillon::Service::GetApp()->GetLogFacility().SetSink(
            [this](const std::string&, int, const std::string& text) { log.push_back(text); });
    }
    ~TokenSourceTest() override { Quillon::Service::GetApp()->GetLogFacility().SetSink({}); }

    boost::shared_ptr<VirtualEnvironment> environment = boost::make_shared<VirtualEnvironment>();
    boost::shared_ptr<ScriptedService> service = boost::make_shared<ScriptedService>(environment);
    TokenSourceOptions options;
    TokenSpec spec;
    std::vector<std::string> log;

    boost::shared_ptr<TokenSource> Make()
    {
        return CreateTokenSource([this] { return service->Issue("get"); }, options);
    }

    /** Returns when a caller on another thread waits for its deadline. */
    void AwaitTimer() const
    {
        while (environment->CountTimers() == 0) {
            std::this_thread::yield();
        }
    }

    template <class Error>
    void Refuse(const Error& error)
    {
        service->before = [error] { throw error; };
    }
    void BeUnreachable() { Refuse(Quillon::Http::HttpException("no route")); }
    void BeWell()
    {
        service->before = [] {};
    }
};

/** Runs what is queued before it says that it is queued. */
class ImmediateEnvironment final : public RuntimeEnvironment
{
public:
    Quillon::System::DateTime GetWallTime() const override { return _clocks.GetWallTime(); }
    std::chrono::steady_clock::time_point GetSteadyTime() const override
    {
        return _clocks.GetSteadyTime();
    }
    double DrawNumber() override { return _clocks.DrawNumber(); }
    void Run(const Work& work) override { work(); }
    void RunAt(std::chrono::steady_clock::time_point /*time*/, const Work& /*work*/) override {}

private:
    VirtualEnvironment _clocks;
};

struct Answers
{
    std::vector<std::string> texts;

    TokenCompletion GetCompletion()
    {
        return [this](const Token& token, const Quillon::Exception* error) {
            texts.push_back(
                token ? token->GetId() : Quillon::GetClassName(*error) + ": " + error->what());
        };
    }
};

TEST_F(TokenSourceTest, GetsNothingBeforeItIsAsked)
{
    const auto source = Make();
    environment->Pass(24h);
    EXPECT_EQ(Calls(), service->calls);
    EXPECT_EQ(nullptr, source->GetStatus().token);
}

TEST_F(TokenSourceTest, GivesOneTokenToAllWhoAsk)
{
    const auto source = Make();
    const Token token = source->GetToken();
    EXPECT_EQ("_1", token->GetId());
    EXPECT_EQ(token, source->GetToken());
    EXPECT_EQ(token, source->GetToken(environment->In(0s)));
    EXPECT_EQ(Calls{"get"}, service->calls);
}

TEST_F(TokenSourceTest, RefreshesInTheBackground)
{
    environment->Fix(AlmostOne); // as late as may be
    const auto source = Make();
    source->GetToken();
    environment->Pass(42min);
    EXPECT_EQ((Calls{"get", "get"}), service->calls);
    EXPECT_EQ("_2", source->GetToken()->GetId());
    environment->Pass(46min);
    EXPECT_EQ("_2", source->GetToken()->GetId());
    environment->Pass(1min);
    EXPECT_EQ("_3", source->GetToken()->GetId());
    EXPECT_EQ(3U, service->calls.size());
}

TEST_F(TokenSourceTest, AsksTheProviderForThePasswordEachTime)
{
    int asked = 0;
    Calls passwords;
    service->seePassword = [&](const std::string& password) { passwords.push_back(password); };
    const auto source = CreatePasswordTokenSource(
        service,
        [&] { return PasswordCredentials("alice", "secret" + std::to_string(++asked)); },
        spec,
        options);
    source->GetToken();
    environment->Pass(43min);
    EXPECT_EQ((Calls{"password alice", "password alice"}), service->calls);
    EXPECT_EQ((Calls{"secret1", "secret2"}), passwords);
}

TEST_F(TokenSourceTest, RenewsATokenOfItsOwnKey)
{
    service->holder = GetTestCertificates("client").front();
    options.identity = service->holder;
    spec.tokenLifetimeSec = 1234;
    const auto source = CreateCertificateTokenSource(service, spec, options);
    source->GetToken();
    environment->Pass(43min);
    EXPECT_EQ((Calls{"certificate", "renew _1 for 1234"}), service->calls);
}

TEST_F(TokenSourceTest, AcquiresInThePlaceOfATokenOfAnotherKey)
{
    service->holder = GetTestCertificates("client").front();
    options.identity = GetTestCertificates("foreign").front();
    const auto source = CreateCertificateTokenSource(service, spec, options);
    source->GetToken();
    environment->Pass(43min);
    EXPECT_EQ((Calls{"certificate", "certificate"}), service->calls);
}

TEST_F(TokenSourceTest, AcquiresWhenARenewalIsRefused)
{
    environment->Fix(AlmostOne);
    service->holder = GetTestCertificates("client").front();
    options.identity = service->holder;
    const auto source = CreateCertificateTokenSource(service, spec, options);
    source->GetToken();
    service->before = [this] {
        if (service->calls.back().substr(0, 5) == "renew") {
            throw SsoException("not renewable");
        }
    };
    environment->Pass(43min);
    EXPECT_EQ((Calls{"certificate", "renew _1 for 300", "certificate"}), service->calls);
    EXPECT_EQ("_3", source->GetToken()->GetId());
}

struct EmptyHandler : NegotiationHandler
{
    boost::shared_ptr<Leg> Negotiate(const Leg& /*serverLeg*/) override { return nullptr; }
};

TEST_F(TokenSourceTest, NegotiatesWithAFreshHandlerEachTime)
{
    int made = 0;
    const auto source = CreateNegotiationTokenSource(
        service,
        [&] {
            ++made;
            return boost::make_shared<EmptyHandler>();
        },
        spec,
        options);
    source->GetToken();
    environment->Pass(43min);
    EXPECT_EQ(2, made);
    EXPECT_EQ((Calls{"gss", "gss"}), service->calls);
}

TEST_F(TokenSourceTest, ExchangesTheTokenOfAnotherSource)
{
    const auto first = Make();
    const auto source = CreateExchangeTokenSource(service, first, spec, options);
    EXPECT_EQ("_2", source->GetToken()->GetId());
    EXPECT_EQ((Calls{"get", "exchange _1"}), service->calls);
}

TEST_F(TokenSourceTest, TellsTheOtherSourceThatItsTokenIsRejected)
{
    const auto first = Make();
    const auto source = CreateExchangeTokenSource(service, first, spec, options);
    first->GetToken();
    environment->Pass(2min);
    service->before = [this] {
        if (service->calls.back() == "exchange _1") {
            throw InvalidCredentialsException("revoked");
        }
    };
    EXPECT_THROW(source->GetToken(), NoTokenException);
    EXPECT_EQ("_3", first->GetToken()->GetId());
    environment->Pass(1min);
    EXPECT_EQ("_4", source->GetToken()->GetId());
    EXPECT_EQ("exchange _3", service->calls.back());
}

TEST_F(TokenSourceTest, ServesTheGoodTokenThroughAnOutageAndNoLonger)
{
    const auto source = Make();
    source->GetToken();
    BeUnreachable();
    environment->Pass(59min);
    EXPECT_EQ("_1", source->GetToken()->GetId());
    environment->Pass(1us);
    EXPECT_THROW(source->GetToken(), NoTokenException);
    BeWell();
    environment->Pass(5min);
    EXPECT_EQ(std::to_string(service->calls.size()), source->GetToken()->GetId().substr(1));
}

TEST_F(TokenSourceTest, SaysTheReasonAndSinceWhenAndWhenNext)
{
    const auto source = Make();
    Refuse(InvalidCredentialsException("wrong password"));
    const std::string text =
        "NoTokenException: There is no token; attempts have failed since 2011-07-05T09:00:00.000Z,"
        " the next one is at 2011-07-05T09:01:00.000Z: InvalidCredentialsException: wrong password";
    EXPECT_EQ(text, GetFailure([&] { source->GetToken(); }));
    environment->Move(30s);
    EXPECT_EQ(text, GetFailure([&] { source->GetToken(); }));
    EXPECT_EQ(1U, service->calls.size()) << "repeated although it cannot get better";
    try {
        source->GetToken();
    } catch (const NoTokenException& error) {
        EXPECT_THROW(error.GetOutage().reason->Throw(), InvalidCredentialsException);
    }
}

TEST_F(TokenSourceTest, TriesAgainAMinuteAfterARefusal)
{
    const auto source = Make();
    Refuse(InvalidCredentialsException("locked"));
    EXPECT_THROW(source->GetToken(), NoTokenException);
    BeWell();
    environment->Pass(1min - 1us);
    EXPECT_THROW(source->GetToken(), NoTokenException);
    environment->Pass(1us);
    EXPECT_EQ("_2", source->GetToken()->GetId());
}

TEST_F(TokenSourceTest, TriesAgainWhenItIsToldThatSomethingHasChanged)
{
    const auto source = Make();
    Refuse(InvalidCredentialsException("wrong password"));
    EXPECT_THROW(source->GetToken(), NoTokenException);
    BeWell();
    source->Refresh();
    EXPECT_EQ("_2", source->GetToken()->GetId());
    source->Refresh();
    EXPECT_EQ("_2", source->GetToken()->GetId()) << "good until the other is there";
    environment->Settle();
    EXPECT_EQ("_3", source->GetToken()->GetId());
}

TEST_F(TokenSourceTest, RefreshBeginsASourceToo)
{
    const auto source = Make();
    source->Refresh();
    environment->Settle();
    EXPECT_EQ("_1", source->GetStatus().token->GetId());
}

TEST_F(TokenSourceTest, WaitsForADeadlineThroughFailures)
{
    const auto source = Make();
    BeUnreachable();
    std::optional<std::string> text;
    std::thread caller([&] {
        text = GetFailure([&] { EXPECT_NE(nullptr, source->GetToken(environment->In(10min))); });
    });
    AwaitTimer();
    environment->Settle();
    EXPECT_EQ(1U, service->calls.size());
    BeWell();
    environment->Pass(10s);
    caller.join();
    EXPECT_EQ("none", text);
    EXPECT_EQ(2U, service->calls.size());
}

TEST_F(TokenSourceTest, WaitsNoLongerThanToItsDeadline)
{
    const auto source = Make();
    const auto deadline = environment->In(10s);
    std::optional<std::string> text;
    std::thread caller([&] { text = GetFailure([&] { source->GetToken(deadline); }); });
    AwaitTimer();
    environment->Move(10s);
    service->before = [&] { caller.join(); }; // hangs until the caller has been told
    // The timer is due before the attempt is made, as it would be if that hung.
    std::thread attempt([&] { environment->Settle(); });
    environment->Settle();
    attempt.join();
    EXPECT_EQ("NoTokenException: There is no token yet", text);
}

TEST_F(TokenSourceTest, DoesNotWaitForWhatLiesBeyondTheDeadline)
{
    const auto source = Make();
    Refuse(SsoException("no"));
    EXPECT_THROW(source->GetToken(), NoTokenException);
    EXPECT_THROW(source->GetToken(environment->In(1min)), NoTokenException);
    EXPECT_THROW(source->GetToken(environment->In(-1min)), NoTokenException);
    EXPECT_EQ(1U, service->calls.size());
}

TEST_F(TokenSourceTest, TellsCompletionsOnAnotherThread)
{
    const auto source = Make();
    Answers answers;
    source->GetTokenAsync(answers.GetCompletion());
    EXPECT_EQ(Calls(), answers.texts);
    environment->Settle();
    EXPECT_EQ(Calls{"_1"}, answers.texts);
    source->GetTokenAsync(answers.GetCompletion());
    EXPECT_EQ(1U, answers.texts.size()) << "told on the calling thread";
    environment->Settle();
    EXPECT_EQ((Calls{"_1", "_1"}), answers.texts);
    EXPECT_EQ(1U, service->calls.size());
}

TEST_F(TokenSourceTest, TellsCompletionsOfFailures)
{
    const auto source = Make();
    BeUnreachable();
    Answers answers;
    source->GetTokenAsync(answers.GetCompletion());
    source->GetTokenAsync(answers.GetCompletion());
    environment->Settle();
    ASSERT_EQ(2U, answers.texts.size());
    EXPECT_EQ("NoTokenException: There is no token; att", answers.texts[0].substr(0, 40));
    EXPECT_EQ(1U, service->calls.size());
    EXPECT_EQ(
        "InvalidArgumentException: Invalid argument : the completion is empty",
        GetFailure([&] { source->GetTokenAsync({}); }));
}

TEST_F(TokenSourceTest, TellsCompletionsThoughNothingCanBeRunAnyMore)
{
    const auto source = Make();
    environment->End();
    Answers answers;
    source->GetTokenAsync(answers.GetCompletion());
    ASSERT_EQ(1U, answers.texts.size());
    EXPECT_NE(std::string::npos, answers.texts[0].find("the environment has ended"));
    EXPECT_EQ(Calls(), service->calls);
}

TEST_F(TokenSourceTest, MakesTheAttemptOnTheThreadThatWaits)
{
    environment->End();
    std::thread::id thread;
    service->before = [&] { thread = std::this_thread::get_id(); };
    const auto source = Make();
    EXPECT_THROW(source->GetToken(), NoTokenException); // only what is queued can be taken over
    const auto other = boost::make_shared<VirtualEnvironment>();
    options.environment = other;
    EXPECT_NE(nullptr, Make()->GetToken());
    EXPECT_EQ(std::this_thread::get_id(), thread);
}

TEST_F(TokenSourceTest, AcquiresInThePlaceOfARefusedToken)
{
    const auto source = Make();
    source->GetToken();
    environment->Pass(1min);
    source->Invalidate("_0");
    EXPECT_EQ("_1", source->GetToken()->GetId());
    source->Invalidate("_1");
    EXPECT_EQ(nullptr, source->GetStatus().token);
    environment->Settle();
    EXPECT_EQ("_2", source->GetStatus().token->GetId());
    source->Invalidate("_1");
    EXPECT_EQ("_2", source->GetToken()->GetId()) << "somebody was late";
}

TEST_F(TokenSourceTest, IsNoStormWhenEveryTokenIsRefused)
{
    const auto source = Make();
    for (int request = 0; request < 1000; ++request) {
        const std::string text =
            GetFailure([&] { source->Invalidate(source->GetToken()->GetId()); });
        if (text != "none") {
            EXPECT_NE(
                std::string::npos,
                text.find("InvalidTokenException: The token was refused less than a minute after"));
        }
        environment->Pass(1s);
    }
    EXPECT_GT(100U, service->calls.size());
}

TEST_F(TokenSourceTest, RefusesATokenThatIsExpiredByOurClock)
{
    service->clockAhead = -65min;
    const auto source = Make();
    EXPECT_EQ(
        "NoTokenException: There is no token; attempts have failed since 2011-07-05T09:00:00.000Z,"
        " the next one is at 2011-07-05T09:01:00.000Z: InvalidTokenException: The token that came "
        "was"
        " issued at 2011-07-05T07:55:00.000Z and ends at 2011-07-05T08:55:00.000Z, which is too "
        "early"
        " at 2011-07-05T09:00:00.000Z",
        GetFailure([&] { source->GetToken(); }));
    EXPECT_EQ(std::chrono::microseconds(-65min), source->GetStatus().serviceClockAhead);
}

TEST_F(TokenSourceTest, ReportsTheClockOfTheService)
{
    service->clockAhead = 3min;
    service->before = [this] { environment->Move(2s); }; // and half of it on the way back
    const auto source = Make();
    EXPECT_FALSE(source->GetStatus().serviceClockAhead);
    source->GetToken();
    EXPECT_EQ(std::chrono::microseconds(3min + 1s), source->GetStatus().serviceClockAhead);
}

TEST_F(TokenSourceTest, SurvivesASuspendedMachine)
{
    const auto source = Make();
    source->GetToken();
    environment->StepWall(8h); // asleep
    EXPECT_EQ(nullptr, source->GetStatus().token);
    EXPECT_EQ("_2", source->GetToken()->GetId());
    environment->StepWall(8h);
    environment->Pass(1min);
    EXPECT_EQ("_3", source->GetStatus().token->GetId()) << "noticed by itself";
}

TEST_F(TokenSourceTest, GivesNoExpiredTokenAfterTheClockWasSetBack)
{
    const auto source = Make();
    source->GetToken();
    environment->StepWall(-8h);
    BeUnreachable();
    environment->Pass(59min);
    EXPECT_EQ("_1", source->GetToken()->GetId());
    environment->Pass(1us);
    EXPECT_THROW(source->GetToken(), NoTokenException);
}

TEST_F(TokenSourceTest, SaysHowItStands)
{
    const auto source = Make();
    source->GetToken();
    TokenSourceStatus status = source->GetStatus();
    EXPECT_EQ("2011-07-05T09:59:00.000Z", status.goodUntil.ToString());
    EXPECT_FALSE(status.isBusy);
    EXPECT_EQ(nullptr, status.outage.reason);
    BeUnreachable();
    environment->Pass(45min);
    status = source->GetStatus();
    EXPECT_EQ("_1", status.token->GetId());
    EXPECT_STREQ("no route", status.outage.reason->what());
    EXPECT_TRUE(status.outage.since);
    EXPECT_TRUE(status.outage.nextAttempt);
}

TEST_F(TokenSourceTest, SaysWhenItAsksForTheNextToken)
{
    options.spreadsFirst = false;
    options.jitter = 0;
    const auto source = Make();
    EXPECT_FALSE(source->GetStatus().nextAttempt);
    source->GetToken();
    EXPECT_EQ("2011-07-05T09:42:00.000Z", source->GetStatus().nextAttempt->ToString());
    environment->StepWall(10min);
    EXPECT_EQ("2011-07-05T09:42:00.000Z", source->GetStatus().nextAttempt->ToString());
    BeUnreachable();
    environment->Pass(32min);
    const TokenSourceStatus status = source->GetStatus();
    EXPECT_EQ(status.outage.nextAttempt->ToString(), status.nextAttempt->ToString());
}

TEST_F(TokenSourceTest, TellsItsObserverOfEachAttempt)
{
    std::vector<std::string> told;
    options.observer = [&](const TokenSourceStatus& status) {
        told.push_back(status.outage.reason ? status.outage.reason->what() : status.token->GetId());
        if (told.size() == 1) {
            throw std::runtime_error("on purpose");
        }
        throw 1;
    };
    const auto source = Make();
    source->GetToken();
    BeUnreachable();
    environment->Pass(43min);
    ASSERT_LE(2U, told.size());
    EXPECT_EQ("_1", told[0]);
    EXPECT_EQ("no route", told[1]);
    EXPECT_EQ("The observer of a token source raised on purpose", log[0]);
    EXPECT_EQ("No token: HttpException: no route", log[1]);
    EXPECT_EQ("The observer of a token source raised something that is not an exception", log[2]);
}

TEST_F(TokenSourceTest, TellsItsObserverBeforeThoseWhoWait)
{
    std::vector<std::string> told;
    options.environment = boost::make_shared<ImmediateEnvironment>();
    options.observer = [&](const TokenSourceStatus& status) {
        told.push_back("observer " + status.token->GetId());
    };
    const auto source = Make();
    source->GetTokenAsync([&](const Token& token, const Quillon::Exception* /*error*/) {
        told.push_back("completion " + token->GetId());
    });
    EXPECT_EQ((Calls{"observer _1", "completion _1"}), told);
}

TEST_F(TokenSourceTest, HasOneAttemptUnderWayHoweverManyThreadsWait)
{
    const auto source = Make();
    Testing::Gate gate;
    std::atomic<int> arrived{0};
    service->before = gate.MakeWaiter();
    std::vector<std::thread> callers;
    for (int caller = 0; caller < 8; ++caller) {
        callers.emplace_back([&] {
            ++arrived;
            EXPECT_EQ("_1", source->GetToken()->GetId());
        });
    }
    while (arrived < 8) {
        std::this_thread::yield();
    }
    gate.Open();
    for (std::thread& caller : callers) {
        caller.join();
    }
    EXPECT_EQ(1, service->mostUnderWay);
    EXPECT_EQ(1U, service->calls.size());
}

TEST_F(TokenSourceTest, IsReadWhileItIsRefreshed)
{
    const auto source = Make();
    source->GetToken();
    std::atomic<bool> isOver{false};
    std::vector<std::thread> callers;
    for (int caller = 0; caller < 2; ++caller) {
        callers.emplace_back([&] {
            while (!isOver) {
                EXPECT_NE(nullptr, source->GetToken());
            }
        });
    }
    for (int step = 0; step < 60; ++step) {
        environment->Pass(10min);
    }
    isOver = true;
    for (std::thread& caller : callers) {
        caller.join();
    }
    EXPECT_LT(12U, service->calls.size());
    EXPECT_EQ(1, service->mostUnderWay);
}

TEST_F(TokenSourceTest, CanBeDestroyedWhileCompletionsWait)
{
    auto source = Make();
    Answers answers;
    source->GetTokenAsync(answers.GetCompletion());
    source.reset();
    environment->Pass(24h);
    EXPECT_EQ(
        Calls{"NoTokenException: There is no token: InvalidStateException: The token source was"
              " destroyed"},
        answers.texts);
    EXPECT_EQ(Calls(), service->calls) << "what was queued has run";
}

TEST_F(TokenSourceTest, CanBeDestroyedInItsCompletion)
{
    auto source = Make();
    int told = 0;
    source->GetTokenAsync([&](const Token& token, const Quillon::Exception*) {
        EXPECT_NE(nullptr, token);
        source.reset();
        ++told;
    });
    environment->Pass(24h);
    EXPECT_EQ(1, told);
    EXPECT_EQ(1U, service->calls.size());
}

TEST_F(TokenSourceTest, CanBeDestroyedInItsObserver)
{
    boost::shared_ptr<TokenSource> source;
    options.observer = [&](const TokenSourceStatus&) { source.reset(); };
    source = Make();
    EXPECT_EQ("_1", source->GetToken()->GetId());
    EXPECT_EQ(nullptr, source);
    environment->Pass(24h);
    EXPECT_EQ(1U, service->calls.size());
}

TEST_F(TokenSourceTest, CanBeDestroyedInItsFunction)
{
    boost::shared_ptr<TokenSource> source;
    service->before = [&] { source.reset(); };
    source = Make();
    EXPECT_EQ(
        "NoTokenException: There is no token: InvalidStateException: The token source was "
        "destroyed",
        GetFailure([&] { source->GetToken(); }));
    environment->Pass(24h);
    EXPECT_EQ(1U, service->calls.size());
}

TEST_F(TokenSourceTest, LetsGoOfEverythingWhenItIsDestroyed)
{
    const auto bound = std::make_shared<int>(0);
    auto source = CreateTokenSource([this, bound] { return service->Issue("get"); }, options);
    boost::weak_ptr<const SamlToken> token = source->GetToken();
    source.reset();
    EXPECT_TRUE(token.expired());
    EXPECT_EQ(1, bound.use_count()) << "a timer keeps the source";
}

TEST_F(TokenSourceTest, KeepsFewTimers)
{
    const auto source = Make();
    source->GetToken();
    environment->Pass(48h);
    EXPECT_GE(2U, environment->CountTimers());
}

TEST_F(TokenSourceTest, RefusesOptionsThatContradictThemselves)
{
    const auto refuses = [&](const std::function<void(TokenSourceOptions&)>& change) {
        TokenSourceOptions changed;
        change(changed);
        return GetFailure([&] { CreateTokenSource([] { return Token(); }, changed); }).substr(0, 24)
               == "InvalidArgumentException";
    };
    EXPECT_FALSE(refuses([](TokenSourceOptions&) {}));
    EXPECT_TRUE(refuses([](TokenSourceOptions& changed) { changed.refreshAt = 0; }));
    EXPECT_TRUE(refuses([](TokenSourceOptions& changed) { changed.refreshAt = 0.95; }));
    EXPECT_TRUE(refuses([](TokenSourceOptions& changed) { changed.jitter = -0.1; }));
    EXPECT_TRUE(refuses([](TokenSourceOptions& changed) { changed.minRemainingValidity = -1ms; }));
    EXPECT_TRUE(refuses([](TokenSourceOptions& changed) { changed.minWait = 0ms; }));
    EXPECT_TRUE(refuses([](TokenSourceOptions& changed) { changed.minWait = 6min; }));
    EXPECT_TRUE(refuses([](TokenSourceOptions& changed) { changed.refusedWait = 0ms; }));
    EXPECT_TRUE(refuses([](TokenSourceOptions& changed) { changed.patience = -1ms; }));
}

TEST_F(TokenSourceTest, RefusesToBeMadeOfNothing)
{
    const auto provider = [] { return PasswordCredentials("", ""); };
    const auto factory = [] { return boost::make_shared<EmptyHandler>(); };
    using Quillon::InvalidArgumentException;
    EXPECT_THROW(CreateTokenSource({}), InvalidArgumentException);
    EXPECT_THROW(CreatePasswordTokenSource(nullptr, provider, spec), InvalidArgumentException);
    EXPECT_THROW(CreatePasswordTokenSource(service, {}, spec), InvalidArgumentException);
    EXPECT_THROW(CreateCertificateTokenSource(nullptr, spec), InvalidArgumentException);
    EXPECT_THROW(CreateNegotiationTokenSource(nullptr, factory, spec), InvalidArgumentException);
    EXPECT_THROW(CreateNegotiationTokenSource(service, {}, spec), InvalidArgumentException);
    EXPECT_THROW(CreateExchangeTokenSource(nullptr, Make(), spec), InvalidArgumentException);
    EXPECT_THROW(CreateExchangeTokenSource(service, nullptr, spec), InvalidArgumentException);
}

} // namespace
