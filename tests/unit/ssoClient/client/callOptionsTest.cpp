#include "ssoClient/CallOptions.h"

#include "negotiationFakes.h"
#include "quillon/http/HttpException.h"
#include "quillon/system/ThreadPool.h"
#include "serviceFakes.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/client/CallControl.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Awaited.h"
#include "support/Failure.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"
#include "support/PoolSupport.h"

#include <gmock/gmock.h>

#include <limits>
#include <optional>

using namespace SsoClient;
using Quillon::Http::ExchangeFacts;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

constexpr char Cancelled[] = "CancelledException: The operation was cancelled.";
constexpr char Late[] =
    "TimeoutException: The operation was not complete within its 1000 milliseconds.";

/** Time that passes only where it is waited for, and chance that is none. */
class VirtualEnvironment final : public CallEnvironment
{
public:
    long long Now() const override { return now; }

    bool Wait(const CancellationToken& token, long long microseconds) const override
    {
        waits.push_back(microseconds);
        now += microseconds;
        if (duringWait) {
            duringWait();
        }
        return token.IsCancelled();
    }

    double Draw() const override { return chance; }

    mutable long long now = 5'000'000;
    mutable std::vector<long long> waits;
    std::function<void()> duringWait;
    double chance = 0;
};

/** What an exchange showed that did not even get a connection. */
ExchangeFacts Unconnected()
{
    ExchangeFacts facts;
    facts.times.nameLookup = 5;
    return facts;
}

ExchangeFacts Answered(int status)
{
    ExchangeFacts facts;
    facts.times.connection = 7;
    facts.isSent = true;
    facts.status = status;
    return facts;
}

ExchangeFacts WithRetryAfter(int status, long long seconds)
{
    ExchangeFacts facts = Answered(status);
    facts.retryAfterSeconds = seconds;
    return facts;
}

class Pending final : public Quillon::System::ScheduledItem
{
public:
    bool Cancel() noexcept override
    {
        isCancelled = true;
        return true;
    }

    bool isCancelled = false;
};

class UnderOptions : public testing::Test
{
protected:
    UnderOptions()
    {
        transport->reply = GetSignedAssertion();
        transport->onSend = [this](const SessionOptions& sessionOptions) {
            if (sessionOptions.timeLeft) {
                limits.push_back(sessionOptions.timeLeft());
            }
            if (onExchange) {
                onExchange(sessionOptions);
            }
            if (!failures.empty()) {
                const ExchangeFacts facts = failures.front();
                failures.pop_front();
                sessionOptions.observer(facts);
                throw CommunicationException("failed");
            }
        };
    }

    boost::shared_ptr<SecurityTokenService> MakeService()
    {
        CallControl control;
        control.options = options;
        control.environment = &environment;
        return MakePlainService()->UnderControl(control);
    }

    boost::shared_ptr<SecurityTokenServiceImpl> MakePlainService() const
    {
        return boost::make_shared<SecurityTokenServiceImpl>(
            boost::make_shared<RequestBuilderImpl>(boost::none),
            transport,
            boost::make_shared<ReplyIsToken>(*transport),
            GetTestCertificates("sts"));
    }

    boost::shared_ptr<const SamlToken> Acquire()
    {
        return MakeService()->AcquireToken("jdoe", "s3cret", spec);
    }

    std::string GetAcquireFailure()
    {
        return GetFailure([this] { Acquire(); });
    }

    /** How many exchanges an acquisition makes whose first one fails so. */
    std::size_t CountAttempts(const ExchangeFacts& facts)
    {
        options.retry.attempts = 3;
        failures = {facts};
        transport->sent.clear();
        environment.waits.clear();
        GetAcquireFailure();
        return transport->sent.size();
    }

    TokenSpec spec = MakeSpec();
    CallOptions options;
    VirtualEnvironment environment;
    std::deque<ExchangeFacts> failures;
    std::function<void(const SessionOptions&)> onExchange;
    std::vector<long long> limits;
    boost::shared_ptr<FakeTransport> transport = boost::make_shared<FakeTransport>();
    FixedClock clock{WhenTokensAreValid};

private:
    static TokenSpec MakeSpec()
    {
        TokenSpec spec;
        spec.tokenLifetimeSec = 300;
        return spec;
    }
};

} // namespace

TEST_F(UnderOptions, ThatSayNothingNothingChanges)
{
    EXPECT_NE(Acquire(), nullptr);
    EXPECT_EQ(transport->sent.size(), 1U);
    EXPECT_THAT(limits, IsEmpty());
    EXPECT_FALSE(transport->reuse);
    failures = {Unconnected()};
    EXPECT_EQ(GetAcquireFailure(), "CommunicationException: failed");
    EXPECT_EQ(transport->sent.size(), 2U);
    EXPECT_THAT(environment.waits, IsEmpty());
}

TEST_F(UnderOptions, ADeadlineLimitsEachExchangeToWhatIsLeft)
{
    options.deadlineMicroseconds = 1'000'000;
    options.retry.attempts = 2;
    options.retry.firstDelayMicroseconds = 200'000;
    failures = {Unconnected()};
    EXPECT_NE(Acquire(), nullptr);
    EXPECT_THAT(limits, ElementsAre(1'000'000, 900'000));
}

TEST_F(UnderOptions, ADeadlineThatPassesInAnExchangeIsWhatTheCallerHears)
{
    options.deadlineMicroseconds = 1'000'000;
    failures = {Answered(0)};
    onExchange = [this](const SessionOptions&) { environment.now += 1'000'000; };
    EXPECT_EQ(GetAcquireFailure(), Late);
    failures = {Answered(0)};
    onExchange = [this](const SessionOptions&) { environment.now += 999'999; };
    EXPECT_EQ(GetAcquireFailure(), "CommunicationException: failed");
}

TEST_F(UnderOptions, AReplyInTimeIsReadWhateverTheTimeThen)
{
    options.deadlineMicroseconds = 1'000'000;
    onExchange = [this](const SessionOptions&) { environment.now += 1'000'000; };
    EXPECT_NE(Acquire(), nullptr);
}

TEST_F(UnderOptions, TheDeadlineOfAnAsynchronousCallCountsFromTheCall)
{
    options.deadlineMicroseconds = 1'000'000;
    const boost::shared_ptr<SecurityTokenService> service = MakeService();
    Testing::Gate gate;
    std::promise<void> done;
    AwaitedToken awaited;
    // All threads of the pool wait, so that the call does, too.
    for (int i = 0; i < 64; ++i) {
        Quillon::System::GetThreadPool()->Queue(gate.MakeWaiter());
    }
    service->AcquireTokenAsync("jdoe", "s3cret", spec, awaited.GetCompletion());
    environment.now += 1'000'000;
    gate.Open();
    EXPECT_EQ(awaited.Get().Describe(), Late);
    EXPECT_THAT(transport->sent, IsEmpty());
}

TEST_F(UnderOptions, ACancelledCallSendsNothing)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    EXPECT_NE(Acquire(), nullptr);
    source.Cancel();
    EXPECT_EQ(GetAcquireFailure(), Cancelled);
    EXPECT_EQ(transport->sent.size(), 1U);
}

TEST_F(UnderOptions, ACancellationCallsOffTheExchange)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    const Quillon::Ref<Pending> pending(new Pending);
    onExchange = [&](const SessionOptions& sessionOptions) {
        sessionOptions.onPending(pending);
        EXPECT_FALSE(pending->isCancelled);
        source.Cancel();
        throw Quillon::Http::HttpException("called off");
    };
    EXPECT_EQ(GetAcquireFailure(), Cancelled);
    EXPECT_TRUE(pending->isCancelled);
}

TEST_F(UnderOptions, ACancellationBeforeTheWaitCallsOffTheExchange)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    const Quillon::Ref<Pending> pending(new Pending);
    onExchange = [&](const SessionOptions& sessionOptions) {
        source.Cancel();
        sessionOptions.onPending(pending);
        EXPECT_TRUE(pending->isCancelled);
        throw Quillon::Http::HttpException("called off");
    };
    EXPECT_EQ(GetAcquireFailure(), Cancelled);
}

TEST_F(UnderOptions, ACancellationDoesNotTouchAnExchangeThatIsOver)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    const Quillon::Ref<Pending> pending(new Pending);
    onExchange = [&](const SessionOptions& sessionOptions) { sessionOptions.onPending(pending); };
    Acquire();
    source.Cancel();
    EXPECT_FALSE(pending->isCancelled);
}

TEST_F(UnderOptions, ACallThatIsCancelledWhileItsReplyComesIsCancelled)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    onExchange = [&](const SessionOptions&) { source.Cancel(); };
    EXPECT_EQ(GetAcquireFailure(), Cancelled);
}

TEST_F(UnderOptions, ACancellationEndsTheWaitForTheNextAttempt)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    options.retry.attempts = 3;
    failures = {Unconnected()};
    environment.duringWait = [&] { source.Cancel(); };
    EXPECT_EQ(GetAcquireFailure(), Cancelled);
    EXPECT_EQ(transport->sent.size(), 1U);
}

TEST_F(UnderOptions, ACancellationEndsAnAsynchronousCallThatHasNoThreadYet)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    const boost::shared_ptr<SecurityTokenService> service = MakeService();
    Testing::Gate gate;
    for (int i = 0; i < 64; ++i) {
        Quillon::System::GetThreadPool()->Queue(gate.MakeWaiter());
    }
    AwaitedToken awaited;
    service->AcquireTokenAsync("jdoe", "s3cret", spec, awaited.GetCompletion());
    source.Cancel();
    const auto told = awaited.Get(); // before the gate opens
    EXPECT_EQ(told.Describe(), Cancelled);
    EXPECT_EQ(told.thread, std::this_thread::get_id());
    gate.Open();
    // It would come behind the waiters; a second call of the completion would throw.
    Testing::RunOn(*Quillon::System::GetThreadPool(), [] { return 0; });
    EXPECT_THAT(transport->sent, IsEmpty());
}

TEST_F(UnderOptions, AnAsynchronousCallOfACancelledSourceCompletesOnAThreadOfThePool)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    source.Cancel();
    AwaitedToken awaited;
    MakeService()->AcquireTokenAsync("jdoe", "s3cret", spec, awaited.GetCompletion());
    const auto told = awaited.Get();
    EXPECT_EQ(told.Describe(), Cancelled);
    EXPECT_NE(told.thread, std::this_thread::get_id());
}

TEST_F(UnderOptions, WhatACompletionThrowsDoesNotKeepOthersFromBeingCancelled)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    const boost::shared_ptr<SecurityTokenService> service = MakeService();
    Testing::Gate gate;
    for (int i = 0; i < 64; ++i) {
        Quillon::System::GetThreadPool()->Queue(gate.MakeWaiter());
    }
    service->AcquireTokenAsync("jdoe", "s3cret", spec, [](const auto&, const auto*) {
        throw std::runtime_error("stray");
    });
    AwaitedToken awaited;
    service->AcquireTokenAsync("jdoe", "s3cret", spec, awaited.GetCompletion());
    source.Cancel();
    EXPECT_EQ(awaited.Get().Describe(), Cancelled);
}

TEST_F(UnderOptions, OnlyWhatTheServiceHasNotActedOnIsRepeated)
{
    EXPECT_EQ(CountAttempts(Unconnected()), 2U);
    EXPECT_EQ(CountAttempts(Answered(408)), 2U);
    EXPECT_EQ(CountAttempts(Answered(429)), 2U);
    EXPECT_EQ(CountAttempts(WithRetryAfter(503, 0)), 2U);

    EXPECT_EQ(CountAttempts(Answered(503)), 1U);
    EXPECT_EQ(CountAttempts(WithRetryAfter(502, 0)), 1U);
    EXPECT_EQ(CountAttempts(WithRetryAfter(500, 0)), 1U);
    EXPECT_EQ(CountAttempts(Answered(0)), 1U); // sent, and no reply
    ExchangeFacts handshake = Unconnected();
    handshake.times.connection = 7;
    EXPECT_EQ(CountAttempts(handshake), 1U);
    ExchangeFacts kept = Unconnected(); // a connection that was there has no time of its own
    kept.isSent = true;
    EXPECT_EQ(CountAttempts(kept), 1U);
}

TEST_F(UnderOptions, WhatFailsWithoutAnExchangeIsNotRepeated)
{
    options.retry.attempts = 3;
    onExchange = [](const SessionOptions&) { throw Quillon::Http::HttpException("forked"); };
    EXPECT_EQ(GetAcquireFailure(), "HttpException: forked");
    EXPECT_EQ(transport->sent.size(), 1U);
}

TEST_F(UnderOptions, TheNumberOfAttemptsHasItsLimit)
{
    options.retry.attempts = 3;
    failures = {Unconnected(), Answered(429), Unconnected(), Unconnected()};
    EXPECT_EQ(GetAcquireFailure(), "CommunicationException: failed");
    EXPECT_EQ(transport->sent.size(), 3U);
}

TEST_F(UnderOptions, ARepeatedMessageIsANewOne)
{
    options.retry.attempts = 2;
    failures = {Unconnected()};
    std::optional<FixedClock> later;
    environment.duringWait = [&] { later.emplace("2026-06-15T12:00:01Z"); };
    Acquire();
    ASSERT_EQ(transport->sent.size(), 2U);
    EXPECT_THAT(transport->sent[0].body, HasSubstr("<wsu:Created>2026-06-15T12:00:00.000Z"));
    EXPECT_THAT(transport->sent[1].body, HasSubstr("<wsu:Created>2026-06-15T12:00:01.000Z"));
    EXPECT_EQ(transport->sessionsMade, 2);
}

TEST_F(UnderOptions, DelaysDoubleUpToTheLongest)
{
    options.retry = {6, 100, 500};
    failures.assign(6, Unconnected());
    environment.chance = 0.5;
    GetAcquireFailure();
    EXPECT_THAT(environment.waits, ElementsAre(75, 150, 300, 375, 375));
}

TEST_F(UnderOptions, AFirstDelayIsNoLongerThanTheLongest)
{
    options.retry = {2, 1000, 500};
    failures = {Unconnected()};
    Acquire();
    EXPECT_THAT(environment.waits, ElementsAre(250));
}

TEST_F(UnderOptions, WhatTheServiceAsksForIsWaitedInAddition)
{
    options.retry = {2, 100, 3'000'000};
    failures = {WithRetryAfter(429, 3)};
    Acquire();
    EXPECT_THAT(environment.waits, ElementsAre(3'000'050));
}

TEST_F(UnderOptions, AServiceThatAsksForTooMuchIsNotAskedAgain)
{
    options.retry = {2, 100, 3'000'000};
    for (const long long seconds : {4LL, std::numeric_limits<long long>::max()}) {
        failures = {WithRetryAfter(503, seconds)};
        EXPECT_EQ(GetAcquireFailure(), "CommunicationException: failed");
    }
    EXPECT_THAT(environment.waits, IsEmpty());
}

TEST_F(UnderOptions, ADelayThatWouldPassTheDeadlineIsNotWaited)
{
    options.deadlineMicroseconds = 1'000'000;
    options.retry = {2, 2'000'000, 3'000'000};
    failures = {Unconnected()};
    EXPECT_EQ(GetAcquireFailure(), "CommunicationException: failed");
    EXPECT_THAT(environment.waits, IsEmpty());
    options.deadlineMicroseconds = 1'000'001;
    failures = {Unconnected()};
    EXPECT_NE(Acquire(), nullptr);
}

TEST_F(UnderOptions, TheConnectionsAreTheTransports)
{
    options.connectionReuse = ConnectionReuse{3, 7};
    MakeService();
    ASSERT_TRUE(transport->reuse);
    EXPECT_EQ(transport->reuse->mostIdle, 3U);
    EXPECT_EQ(transport->reuse->idleMicroseconds, 7);
}

namespace {

/** A service that negotiates. */
class NegotiationUnderOptions : public UnderOptions
{
protected:
    boost::shared_ptr<const SamlToken> Negotiate()
    {
        CallControl control;
        control.options = options;
        control.environment = &environment;
        return SecurityTokenServiceImpl(
                   boost::make_shared<RequestBuilderImpl>(boost::none),
                   transport,
                   boost::make_shared<ResponseHandlerImpl>(),
                   GetTestCertificates("sts"))
            .UnderControl(control)
            ->AcquireTokenByGSS(spec, handler);
    }

    ScriptedHandler handler{{"one", "two", "three"}};
};

} // namespace

TEST_F(NegotiationUnderOptions, AFirstLegThatDidNotGoOutIsRepeated)
{
    options.retry.attempts = 2;
    failures = {Unconnected()};
    transport->replies = {NegotiationReply("c1", "", GetSignedAssertion())};
    EXPECT_NE(Negotiate(), nullptr);
    EXPECT_EQ(handler.asked.size(), 1U);
    ASSERT_EQ(transport->sent.size(), 2U);
    EXPECT_THAT(transport->sent[1].body, HasSubstr(">b25l<")); // "one" in Base64
    EXPECT_EQ(transport->sessionsMade, 1);
}

TEST_F(NegotiationUnderOptions, ALegThatWentOutIsNotRepeated)
{
    options.retry.attempts = 2;
    for (const ExchangeFacts& facts : {Answered(429), WithRetryAfter(503, 0), Answered(408)}) {
        failures = {facts};
        EXPECT_EQ(GetFailure([this] { Negotiate(); }), "CommunicationException: failed");
    }
    EXPECT_THAT(environment.waits, IsEmpty());
}

TEST_F(NegotiationUnderOptions, NothingIsRepeatedAfterALegWentOut)
{
    options.retry.attempts = 2;
    transport->replies = {NegotiationReply("c1", "bGVn", "")};
    onExchange = [this](const SessionOptions& sessionOptions) {
        EXPECT_TRUE(sessionOptions.isNegotiation);
        if (transport->sent.size() == 2) {
            sessionOptions.observer(Unconnected());
            throw CommunicationException("second");
        }
    };
    EXPECT_EQ(GetFailure([this] { Negotiate(); }), "CommunicationException: second");
    EXPECT_EQ(transport->sent.size(), 2U);
}

TEST_F(NegotiationUnderOptions, ACancellationInTheHandlerEndsItAfterTheLeg)
{
    const CancellationSource source;
    options.cancellation = source.GetToken();
    transport->replies = {NegotiationReply("c1", "bGVn", "")};
    onExchange = [&](const SessionOptions&) { source.Cancel(); };
    EXPECT_EQ(GetFailure([this] { Negotiate(); }), Cancelled);
    EXPECT_EQ(transport->sent.size(), 1U);
    EXPECT_EQ(handler.asked.size(), 1U);
}

namespace {

class NotingObserver final : public OperationObserver
{
public:
    void OnBegin(const ObservedOperation& operation) noexcept override
    {
        id = operation.id;
        notes.push_back("begin " + operation.name);
    }
    void OnExchange(
        const ObservedOperation& operation, const ExchangeFacts& facts) noexcept override
    {
        EXPECT_EQ(operation.id, id);
        notes.push_back("exchange " + std::to_string(facts.status));
    }
    void OnFault(const ObservedOperation& operation, const SoapFault& fault) noexcept override
    {
        EXPECT_EQ(operation.id, id);
        notes.push_back("fault " + fault.code.text);
    }
    void OnEnd(
        const ObservedOperation& operation, const OperationOutcome& outcome) noexcept override
    {
        EXPECT_EQ(operation.id, id);
        duration = outcome.durationMicroseconds;
        notes.push_back(outcome.succeeded ? "end" : "end " + outcome.exceptionClass);
    }

    std::string id;
    long long duration = -1;
    std::vector<std::string> notes;
};

/** A fault that refuses the credentials. */
std::string RefusalReply()
{
    return "<S:Envelope xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\"><S:Body><S:Fault>"
           "<faultcode xmlns:w=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\">"
           "w:FailedAuthentication</faultcode><faultstring>no</faultstring>"
           "</S:Fault></S:Body></S:Envelope>";
}

class Observed : public UnderOptions
{
protected:
    Observed() { options.observer = observer; }

    boost::shared_ptr<NotingObserver> observer = boost::make_shared<NotingObserver>();
};

} // namespace

TEST_F(Observed, OperationsAreReportedFromBeginningToEnd)
{
    options.retry.attempts = 2;
    options.retry.firstDelayMicroseconds = 100;
    failures = {Answered(429)};
    Acquire();
    EXPECT_THAT(observer->notes, ElementsAre("begin AcquireToken", "exchange 429", "end"));
    EXPECT_EQ(observer->duration, 50);
    EXPECT_FALSE(observer->id.empty());
}

TEST_F(Observed, OperationsThatFailSayWithWhat)
{
    failures = {Answered(404)};
    GetAcquireFailure();
    EXPECT_THAT(
        observer->notes,
        ElementsAre("begin AcquireToken", "exchange 404", "end CommunicationException"));
}

TEST_F(Observed, OperationsThatAreCancelledSaySo)
{
    const CancellationSource source;
    source.Cancel();
    options.cancellation = source.GetToken();
    GetAcquireFailure();
    EXPECT_THAT(observer->notes, ElementsAre("begin AcquireToken", "end CancelledException"));
}

TEST_F(Observed, FaultsAreShown)
{
    CallControl control;
    control.options = options;
    control.environment = &environment;
    transport->reply = RefusalReply();
    SoapFault callers;
    const auto service = SecurityTokenServiceImpl(
                             boost::make_shared<RequestBuilderImpl>(boost::none),
                             transport,
                             boost::make_shared<ResponseHandlerImpl>(ReplyForm{
                                 ServiceDialect(), [&](const SoapFault& f) { callers = f; }}),
                             GetTestCertificates("sts"))
                             .UnderControl(control);
    EXPECT_EQ(
        GetFailure([&] { service->AcquireToken("jdoe", "s3cret", spec); }),
        "InvalidCredentialsException: Authentication failed: no");
    EXPECT_THAT(
        observer->notes,
        ElementsAre(
            "begin AcquireToken",
            "fault w:FailedAuthentication",
            "end InvalidCredentialsException"));
    EXPECT_EQ(callers.code.text, "w:FailedAuthentication"); // who was shown it before still is
    EXPECT_EQ(
        GetFailure([&] {
            ScriptedHandler handler({"one"});
            service->AcquireTokenByGSS(spec, handler);
        }),
        "InvalidCredentialsException: Authentication failed: no");
    EXPECT_EQ(observer->notes.at(4), "fault w:FailedAuthentication");
}

TEST(WithOptions, RefusesWhatItCannotDo)
{
    const auto refuse = [](const CallOptions& options) {
        SecurityTokenServiceConfig config;
        config.url = "http://127.0.0.1:1/sts";
        const auto service = CreateSecurityTokenService(config);
        return GetFailure([&] { WithOptions(service, options); });
    };
    const std::string start = "InvalidArgumentException: Invalid argument : ";
    EXPECT_EQ(refuse({}), "none");
    EXPECT_EQ(GetFailure([] { WithOptions(nullptr, {}); }), start + "There is no service.");
    CallOptions options;
    options.deadlineMicroseconds = -1;
    EXPECT_EQ(refuse(options), start + "The deadline of -1 microseconds is negative.");
    options = {};
    options.retry.attempts = 0;
    EXPECT_EQ(refuse(options), start + "There are no attempts: 1 is one without retries.");
    options = {};
    options.retry.firstDelayMicroseconds = -2;
    EXPECT_EQ(
        refuse(options), start + "The first delay of retries of -2 microseconds is negative.");
    options = {};
    options.retry.longestDelayMicroseconds = -3;
    EXPECT_EQ(
        refuse(options), start + "The longest delay of retries of -3 microseconds is negative.");
    options = {};
    options.connectionReuse = ConnectionReuse{1, 0};
    EXPECT_EQ(
        refuse(options),
        start + "The idle limit of connections of 0 microseconds is not positive.");
}

TEST(WithOptions, TakesTheLongestTimesForEver)
{
    constexpr long long Ever = std::numeric_limits<long long>::max();
    CallOptions options;
    options.deadlineMicroseconds = Ever;
    options.retry = {4, Ever, Ever};
    options.connectionReuse = ConnectionReuse{1, Ever};
    const CallOptions bounded = Bound(options);
    EXPECT_GT(bounded.deadlineMicroseconds, 0);
    EXPECT_EQ(bounded.deadlineMicroseconds, bounded.retry.firstDelayMicroseconds);
    EXPECT_EQ(bounded.deadlineMicroseconds, bounded.retry.longestDelayMicroseconds);
    EXPECT_EQ(bounded.deadlineMicroseconds, bounded.connectionReuse->idleMicroseconds);
    // Nothing listens there: the call fails for that, and not because its time has run out.
    SecurityTokenServiceConfig config;
    config.url = "http://127.0.0.1:1/sts";
    options.retry.attempts = 1;
    const auto service = WithOptions(CreateSecurityTokenService(config), options);
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    EXPECT_EQ(
        GetFailure([&] { service->AcquireToken("jdoe", "s3cret", spec); }),
        "HttpException: Cannot connect to 127.0.0.1 port 1: Connection refused.");
}
