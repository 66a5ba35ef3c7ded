#include "ssoClientRuntime/RefreshMachine.h"

#include <algorithm>
#include <utility>

namespace SsoClient {

namespace {

// A machine that was suspended, and a clock that was set, are noticed after this at the latest.
constexpr Span LongestSleep = std::chrono::minutes(1);

// A token that lasts this long ends a row of failures. One that is refused earlier continues it.
constexpr Span ProbationTime = std::chrono::minutes(1);

// The earliest moment of a first refresh, as a share of the usual one. The wider the range, the
// more evenly those spread that start together; what lives for a moment only need not ask twice.
constexpr double EarliestFirstRefresh = 0.02;

// Of the time that a short token is handed out, what is over when it is refreshed at the latest.
constexpr double LatestRefresh = 0.9;

Span Scale(Span span, double factor)
{
    return Span(static_cast<Span::rep>(static_cast<double>(span.count()) * factor));
}

} // namespace

RefreshMachine::RefreshMachine(const RefreshPolicy& policy, std::function<double()> chance)
    : _policy(policy)
    , _chance(std::move(chance))
{}

Attempt RefreshMachine::Begin(const Moment& now)
{
    if (!_isWanted || IsUnderWay() || !IsDue(now)) {
        return Attempt::NONE;
    }
    // A service may refuse to renew what has expired.
    const bool canRenew = IsGood(now) && _held->isRenewable;
    _underWay = canRenew ? Attempt::RENEW : Attempt::ACQUIRE;
    _isIrregular = std::exchange(_isForced, false) || !IsGood(now);
    return _underWay;
}

bool RefreshMachine::IsDue(const Moment& now) const noexcept
{
    if (_isForced) {
        return true;
    }
    if (_outage) {
        return now.steady >= _outage->nextAttempt;
    }
    return !IsGood(now) || now.wall >= _held->refresh.wall || now.steady >= _held->refresh.steady;
}

std::optional<Span> RefreshMachine::GetNextAttempt(const Moment& now) const
{
    if (!_isWanted || IsUnderWay()) {
        return std::nullopt;
    }
    if (IsDue(now)) {
        return now.steady;
    }
    if (_outage) {
        return _outage->nextAttempt;
    }
    const Span byWall = now.steady + (_held->refresh.wall - now.wall);
    return std::min(_held->refresh.steady, byWall);
}

/** Waits after failures are measured by the steady clock alone: nothing is missed by waiting. */
std::optional<Span> RefreshMachine::GetWakeUp(const Moment& now) const
{
    const std::optional<Span> next = GetNextAttempt(now);
    return next && !_outage ? std::min(*next, now.steady + LongestSleep) : next;
}

bool RefreshMachine::Accept(const Moment& asked, const Moment& now, const TokenFacts& token)
{
    const Lease lease = MakeLease(asked, token.validity, _policy.minRemaining);
    if (!lease.Covers(now)) {
        _underWay = Attempt::NONE;
        NoteFailure(now, FailureKind::REFUSED);
        return false;
    }
    const Span left = lease.GetLeft(now);
    const Span usual = Scale(left + _policy.minRemaining, DrawRefreshShare());
    const Span delay = std::max(std::min(usual, Scale(left, LatestRefresh)), _policy.minWait);
    _held = Held{lease, now, {now.wall + delay, now.steady + delay}, token.isRenewable};
    _lastCame = now.steady;
    _underWay = Attempt::NONE;
    _outage.reset();
    return true;
}

/** Processes that start together, or recover together, would refresh together for hours. */
double RefreshMachine::DrawRefreshShare()
{
    if (_policy.spreadsFirst && (_isIrregular || _outage)) {
        return _policy.refreshAt * DrawBetween(EarliestFirstRefresh, 1);
    }
    return _policy.refreshAt * (1 + _policy.jitter * DrawBetween(-1, 1));
}

void RefreshMachine::Fail(const Moment& now, FailureKind kind)
{
    const Attempt attempt = std::exchange(_underWay, Attempt::NONE);
    if (attempt == Attempt::RENEW && kind == FailureKind::REFUSED && _held) {
        _held->isRenewable = false;
        _isForced = true; // an acquisition follows at once
        return;
    }
    NoteFailure(now, kind);
}

bool RefreshMachine::Forget(const Moment& now)
{
    if (!_held) {
        return false;
    }
    const bool isEarly = now.steady - _held->came.steady < ProbationTime;
    _held.reset();
    if (isEarly) {
        NoteFailure(now, FailureKind::TRANSIENT);
    }
    return isEarly;
}

void RefreshMachine::Retry() noexcept
{
    _isForced = true;
    _refusals = 0;
}

void RefreshMachine::NoteFailure(const Moment& now, FailureKind kind)
{
    if (!_outage) {
        StartCountingAnew(now);
        _outage = Outage{now, Span()};
    }
    _outage->nextAttempt = now.steady + DrawWait(now, kind);
    ++_failures;
    _refusals = kind == FailureKind::REFUSED ? _refusals + 1 : 0;
}

/** A token that came in between does not end the row of failures if it was no good either. */
void RefreshMachine::StartCountingAnew(const Moment& now)
{
    if (!_lastCame || now.steady - *_lastCame >= ProbationTime) {
        _failures = 0;
        _refusals = 0;
        _backOff = Span();
    }
}

Span RefreshMachine::DrawWait(const Moment& now, FailureKind kind)
{
    const bool isRefused = kind == FailureKind::REFUSED;
    const Span wait = isRefused ? GetRefusedWait() : DrawBackOff();
    const Span left = _held ? std::max(_held->lease.GetLeft(now), Span()) : Span();
    if (left == Span()) {
        return wait;
    }
    // The first failure may be a passing one; what goes on is an outage, which many may share.
    const Span calm = _failures == 0 ? wait : std::max(wait, DrawShareOfLeft(left));
    // From the moment that the token is no longer good, somebody may wait for another.
    return isRefused ? calm : std::min(calm, std::max(left, _policy.minWait));
}

/** Decorrelated jitter. */
Span RefreshMachine::DrawBackOff()
{
    const Span highest = 3 * std::max(_policy.minWait, _backOff);
    const auto low = static_cast<double>(_policy.minWait.count());
    const double drawn = DrawBetween(low, static_cast<double>(highest.count()));
    _backOff = std::min(_policy.maxWait, Span(static_cast<Span::rep>(drawn)));
    return _backOff;
}

Span RefreshMachine::GetRefusedWait() const
{
    Span wait = _policy.refusedWait;
    for (int refusal = 0; refusal < _refusals && wait < _policy.maxWait; ++refusal) {
        wait = std::min(2 * wait, _policy.maxWait);
    }
    return wait;
}

Span RefreshMachine::DrawShareOfLeft(Span left)
{
    return std::min(_policy.patience, Scale(left, DrawBetween(0.5, 0.75)));
}

} // namespace SsoClient
