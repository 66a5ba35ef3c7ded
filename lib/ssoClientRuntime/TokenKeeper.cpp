#include "ssoClientRuntime/TokenKeeper.h"

#include "quillon/service/Logger.h"

#include <algorithm>
#include <future>
#include <iterator>
#include <utility>

namespace SsoClient {

namespace {

using Quillon::System::DateTime;
using Quillon::System::DateTimeFromUtc;
using std::chrono::duration_cast;

DateTime ToDateTime(Span wall)
{
    return DateTimeFromUtc(wall.count(), false);
}

TokenKeeper::TimePoint ToTimePoint(Span steady)
{
    return TokenKeeper::TimePoint(
        duration_cast<TokenKeeper::TimePoint::duration>(std::min(steady, Span::max() / 1024)));
}

RefreshPolicy MakePolicy(const TokenSourceOptions& options)
{
    RefreshPolicy policy;
    policy.refreshAt = options.refreshAt;
    policy.jitter = options.jitter;
    policy.spreadsFirst = options.spreadsFirst;
    policy.minRemaining = options.minRemainingValidity;
    policy.minWait = options.minWait;
    policy.maxWait = options.maxWait;
    policy.refusedWait = options.refusedWait;
    policy.patience = options.patience;
    return policy;
}

template <class Error>
std::shared_ptr<const Quillon::Exception> MakeReason(const std::string& text)
{
    return std::make_shared<const Error>(text);
}

void Warn(const std::string& text) noexcept
{
    Quillon::Service::GetApp()
        ->GetLogFacility()
        .GetLogger("SsoClient")
        ->Log(Quillon::Service::LOG_LEVEL_WARNING, text);
}

/** On this thread if there is no other any more. */
void RunSomewhere(RuntimeEnvironment& environment, const RuntimeEnvironment::Work& work)
{
    try {
        environment.Run(work);
        return;
    } catch (const Quillon::Exception& failure) {
        Warn(std::string("A completion runs where it should not: ") + failure.what());
    }
    try {
        work();
    } catch (const std::exception& error) {
        Warn(std::string("A completion raised ") + error.what());
    } catch (...) {
        Warn("A completion raised something that is not an exception");
    }
}

std::function<void()> Tell(std::function<void(const Outcome&)> settle, const Outcome& answer)
{
    return [settle = std::move(settle), answer] { settle(answer); };
}

} // namespace

TokenKeeper::TokenKeeper(TokenWays ways, const TokenSourceOptions& options)
    : _ways(std::move(ways))
    , _environment(options.environment ? options.environment : GetProcessEnvironment())
    , _identity(options.identity)
    , _observer(options.observer)
    , _operationObserver(options.operationObserver)
    , _machine(
          MakePolicy(options), [environment = _environment] { return environment->DrawNumber(); })
{}

Moment TokenKeeper::GetNow() const
{
    return ReadClocks(*_environment);
}

TokenKeeper::Token TokenKeeper::GetToken()
{
    Token token = _published.Read(GetNow());
    return token ? token : Await(std::nullopt);
}

TokenKeeper::Token TokenKeeper::GetToken(TimePoint deadline)
{
    Token token = _published.Read(GetNow());
    return token ? token : Await(duration_cast<Span>(deadline.time_since_epoch()));
}

TokenKeeper::Token TokenKeeper::Await(const std::optional<Span>& deadline)
{
    const auto self = shared_from_this(); // the attempt may be what destroys the source
    const auto answer = std::make_shared<std::promise<Outcome>>();
    auto outcome = answer->get_future();
    AddWaiter({deadline, [answer](const Outcome& given) { answer->set_value(given); }});
    // Whoever may wait for as long as it takes makes the attempt itself, so that threads of a pool
    // never wait for work that waits for a thread of the pool.
    while (!deadline && outcome.wait_for(std::chrono::seconds(0)) != std::future_status::ready
           && MakePendingAttempt()) {
    }
    Outcome given = outcome.get();
    if (given.failure) {
        given.failure->Throw();
    }
    return std::move(given.token);
}

void TokenKeeper::GetTokenAsync(const TokenCompletion& completion)
{
    if (completion.empty()) {
        throw Quillon::InvalidArgumentException("the completion is empty");
    }
    AddWaiter({std::nullopt, [environment = _environment, completion](const Outcome& given) {
                   RunSomewhere(*environment, [completion, given] {
                       completion(given.token, given.failure.get());
                   });
               }});
}

void TokenKeeper::AddWaiter(Waiter waiter)
{
    Apply([&](const Moment& /*now*/) {
        _machine.Want();
        _waiters.push_back(std::move(waiter));
    });
}

void TokenKeeper::Invalidate(const std::string& tokenId)
{
    Apply([&](const Moment& now) {
        if (_token == nullptr || _token->GetId() != tokenId) {
            return;
        }
        LetGo();
        if (_machine.Forget(now)) {
            _reason = MakeReason<InvalidTokenException>(
                "The token was refused less than a minute after it came");
        }
    });
}

void TokenKeeper::Refresh()
{
    Apply([&](const Moment& /*now*/) {
        _machine.Want();
        _machine.Retry();
    });
}

TokenSourceStatus TokenKeeper::GetStatus() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return DescribeStatus(GetNow());
}

void TokenKeeper::Close()
{
    Apply([&](const Moment& /*now*/) {
        _isClosed = true;
        _pending.reset();
        LetGo();
    });
}

template <class Change>
void TokenKeeper::Apply(const Change& change)
{
    Apply(change, [] {});
}

/** Makes the change, and does what follows from it, `first` before all else. */
template <class Change, class First>
void TokenKeeper::Apply(const Change& change, const First& first)
{
    const auto self = shared_from_this();
    Chores chores;
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        const Moment now = GetNow();
        change(now);
        Proceed(now, chores);
    }
    first();
    for (const auto& chore : chores) {
        chore();
    }
}

void TokenKeeper::Proceed(const Moment& now, Chores& chores)
{
    const Attempt attempt = _isClosed ? Attempt::NONE : _machine.Begin(now);
    if (attempt != Attempt::NONE) {
        _pending = attempt;
        chores.emplace_back([this] { QueueAttempt(); });
    }
    SettleWaiters(now, chores);
    ArmTimer(now, chores);
}

void TokenKeeper::SettleWaiters(const Moment& now, Chores& chores)
{
    for (auto waiter = _waiters.begin(); waiter != _waiters.end();) {
        const auto next = std::next(waiter);
        if (const std::optional<Outcome> answer = GetAnswer(*waiter, now)) {
            chores.push_back(Tell(std::move(waiter->settle), *answer));
            _waiters.erase(waiter);
        }
        waiter = next;
    }
}

/** What a waiter is to be told now, if anything. */
std::optional<Outcome> TokenKeeper::GetAnswer(const Waiter& waiter, const Moment& now) const
{
    if (Token token = _published.Read(now)) {
        return Outcome{std::move(token), nullptr};
    }
    const std::optional<Span> next = GetNextAttempt();
    const bool isOver = waiter.deadline
                            ? now.steady >= *waiter.deadline || (next && *next >= *waiter.deadline)
                            : next.has_value();
    if (!isOver && !_isClosed) {
        return std::nullopt;
    }
    return Outcome{nullptr, std::make_shared<const NoTokenException>(DescribeOutage(now))};
}

/** Of a source that waits after a failure. */
std::optional<Span> TokenKeeper::GetNextAttempt() const
{
    const auto& outage = _machine.GetOutage();
    return outage && !_machine.IsUnderWay() ? std::optional(outage->nextAttempt) : std::nullopt;
}

/** One timer is enough that rings early: it looks anew. */
void TokenKeeper::ArmTimer(const Moment& now, Chores& chores)
{
    std::optional<Span> next = _isClosed ? std::nullopt : _machine.GetWakeUp(now);
    for (const Waiter& waiter : _waiters) {
        if (waiter.deadline) {
            next = std::min(next.value_or(Span::max()), *waiter.deadline);
        }
    }
    if (!next || (_armedFor && *_armedFor <= *next)) {
        return;
    }
    _armedFor = next;
    chores.emplace_back([this, time = *next] { SetTimer(time); });
}

/** Work that does nothing if there is no source any more. */
template <class Call>
RuntimeEnvironment::Work TokenKeeper::WhileAlive(const Call& call)
{
    return [weak = weak_from_this(), call] {
        if (const auto self = weak.lock()) {
            call(*self);
        }
    };
}

void TokenKeeper::SetTimer(Span time)
{
    const auto ring = [time](TokenKeeper& keeper) { keeper.OnTimer(time); };
    _environment->RunAt(ToTimePoint(time), WhileAlive(ring));
}

void TokenKeeper::LetGo()
{
    _token.reset();
    _published.Publish(nullptr, Lease());
}

void TokenKeeper::OnTimer(Span time)
{
    Apply([&](const Moment& /*now*/) {
        if (_armedFor == time) {
            _armedFor.reset();
        }
    });
}

void TokenKeeper::QueueAttempt()
{
    try {
        _environment->Run(WhileAlive([](TokenKeeper& keeper) { keeper.MakePendingAttempt(); }));
    } catch (const Quillon::Exception& failure) {
        DropPendingAttempt(failure);
    }
}

void TokenKeeper::DropPendingAttempt(const Quillon::Exception& failure)
{
    Apply([&](const Moment& now) {
        if (_pending) {
            _pending.reset();
            Result result{{nullptr, Keep(failure)}, now, {}, {}};
            Take(result, now);
        }
    });
}

/** @return false if there is none that nobody has begun. */
bool TokenKeeper::MakePendingAttempt()
{
    const auto self = shared_from_this();
    Attempt attempt = Attempt::NONE;
    Token held;
    Moment asked;
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        if (!_pending) {
            return false;
        }
        attempt = *_pending;
        _pending.reset();
        held = _token;
        asked = GetNow();
    }
    Result result = Make(attempt, held, asked);
    // Whoever waits may end the process with what it is told.
    Apply([&](const Moment& now) { Take(result, now); }, [&] { Report(result); });
    return true;
}

TokenKeeper::Result TokenKeeper::Make(Attempt attempt, const Token& held, const Moment& asked) const
{
    // The token may have been refused since it was decided to renew it.
    const bool renews = attempt == Attempt::RENEW && held != nullptr;
    const ObservedRefresh refresh{renews};
    if (_operationObserver != nullptr) {
        _operationObserver->OnRefreshBegin(refresh);
    }
    Result result{
        renews ? Try([&] { return _ways.renew(*held); }) : Try(_ways.acquire), asked, {}, refresh};
    if (const Token& token = result.outcome.token) {
        result.facts.validity = ReadValidity(*token);
        result.facts.isRenewable = _ways.renew != nullptr && IsRenewableBy(*token, _identity.get());
    }
    return result;
}

void TokenKeeper::Take(Result& result, const Moment& now)
{
    if (_isClosed) {
        return;
    }
    if (result.outcome.token) {
        Accept(result, now);
        return;
    }
    _reason = result.outcome.failure;
    _machine.Fail(now, Classify(*_reason));
}

/** A token that cannot be handed out is a failure of the attempt. */
void TokenKeeper::Accept(Result& result, const Moment& now)
{
    const Validity& validity = result.facts.validity;
    const Span tookHalf = (now.steady - result.asked.steady) / 2;
    _serviceClockAhead = validity.issued - (now.wall - tookHalf);
    if (!_machine.Accept(result.asked, now, result.facts)) {
        _reason = MakeTooEarly(validity, now);
        result.outcome = {nullptr, _reason};
        return;
    }
    _token = result.outcome.token;
    _published.Publish(_token, *_machine.GetLease());
    _reason.reset();
}

TokenOutage TokenKeeper::DescribeOutage(const Moment& now) const
{
    if (_isClosed) {
        return {
            MakeReason<Quillon::InvalidStateException>("The token source was destroyed"), {}, {}};
    }
    TokenOutage description;
    if (const auto& outage = _machine.GetOutage()) {
        description.reason = _reason;
        description.since = ToDateTime(outage->since.wall);
    }
    if (const auto next = GetNextAttempt()) {
        description.nextAttempt = ToDateTime(now.wall + (*next - now.steady));
    }
    return description;
}

TokenSourceStatus TokenKeeper::DescribeStatus(const Moment& now) const
{
    TokenSourceStatus status;
    status.token = _published.Read(now);
    if (status.token) {
        status.goodUntil = ToDateTime(now.wall + _machine.GetLease()->GetLeft(now));
    }
    status.isBusy = _machine.IsUnderWay();
    status.outage = DescribeOutage(now);
    status.serviceClockAhead = _serviceClockAhead;
    if (const auto next = _isClosed ? std::nullopt : _machine.GetNextAttempt(now)) {
        status.nextAttempt = ToDateTime(now.wall + (*next - now.steady));
    }
    return status;
}

void TokenKeeper::TellEnd(const Result& result) const
{
    if (_operationObserver == nullptr) {
        return;
    }
    OperationOutcome outcome;
    outcome.succeeded = result.outcome.failure == nullptr;
    if (!outcome.succeeded) {
        outcome.exceptionClass = Quillon::GetClassName(*result.outcome.failure);
    }
    outcome.durationMicroseconds = (GetNow().steady - result.asked.steady).count();
    _operationObserver->OnRefreshEnd(result.refresh, outcome);
}

void TokenKeeper::Report(const Result& result) const
{
    try {
        TellEnd(result);
        if (result.outcome.failure) {
            Warn("No token: " + DescribeFailure(*result.outcome.failure));
        }
        if (_observer) {
            _observer(GetStatus());
        }
    } catch (const std::exception& error) {
        Warn(std::string("The observer of a token source raised ") + error.what());
    } catch (...) {
        Warn("The observer of a token source raised something that is not an exception");
    }
}

} // namespace SsoClient
