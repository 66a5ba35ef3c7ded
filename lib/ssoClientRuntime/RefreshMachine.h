#pragma once

#include "ssoClientRuntime/Moment.h"

#include <functional>
#include <optional>

namespace SsoClient {

/** `TokenSourceOptions`, as far as they are about times. */
struct RefreshPolicy
{
    double refreshAt = 0.7;
    double jitter = 0.1;
    bool spreadsFirst = true;
    Span minRemaining = std::chrono::seconds(60);
    Span minWait = std::chrono::seconds(1);
    Span maxWait = std::chrono::minutes(5);
    Span refusedWait = std::chrono::minutes(1);
    Span patience = std::chrono::minutes(15);
};

enum class Attempt
{
    NONE,
    ACQUIRE,
    RENEW
};

enum class FailureKind
{
    TRANSIENT, ///< may be gone the next time
    REFUSED    ///< cannot get better by repeating
};

/** What counts of a token that has come. */
struct TokenFacts
{
    Validity validity;
    bool isRenewable = false; ///< and bound to our key
};

/** Failures in a row. */
struct Outage
{
    Moment since;
    Span nextAttempt{}; ///< by the steady clock
};

/**
 * Decides when a source asks for another token: what happens goes in, what is to be done comes out.
 * It knows no thread, no clock and no service, so that days of it, or thousands at once, can be
 * tried in a moment.
 *
 * Not thread-safe.
 */
class RefreshMachine
{
public:
    /** @param chance  gives numbers from 0 up to, but not including, 1. */
    RefreshMachine(const RefreshPolicy& policy, std::function<double()> chance);

    /** Somebody wants a token: from now on there is to be one. */
    void Want() noexcept { _isWanted = true; }

    /** What is to be done now. It counts as under way until `Accept` or `Fail`. */
    Attempt Begin(const Moment& now);

    /** When `Begin` has something to be done if nothing happens until then, by the steady clock;
     *  absent while it is under way. */
    std::optional<Span> GetNextAttempt(const Moment& now) const;

    /** When to call `Begin` the next time, by the steady clock; absent if there is nothing to wait
     *  for. It may be earlier than the next attempt. */
    std::optional<Span> GetWakeUp(const Moment& now) const;

    /**
     * A token has come that was asked for at `asked`.
     *
     * @return false if it has too little validity left to be handed out, which is a failure.
     */
    bool Accept(const Moment& asked, const Moment& now, const TokenFacts& token);

    void Fail(const Moment& now, FailureKind kind);

    /**
     * The token is no good although it is valid.
     *
     * @return whether it had come so recently that this is a failure.
     */
    bool Forget(const Moment& now);

    /** Something has changed: whatever is waited for, now is the time. */
    void Retry() noexcept;

    /** The lease of the token that is held, if there is one. */
    const Lease* GetLease() const noexcept { return _held ? &_held->lease : nullptr; }
    bool IsGood(const Moment& now) const noexcept { return _held && _held->lease.Covers(now); }

    bool IsUnderWay() const noexcept { return _underWay != Attempt::NONE; }
    const std::optional<Outage>& GetOutage() const noexcept { return _outage; }

private:
    struct Held
    {
        Lease lease;
        Moment came;
        Moment refresh; ///< due when either clock has reached it
        bool isRenewable;
    };

    bool IsDue(const Moment& now) const noexcept;
    double DrawRefreshShare();
    double DrawBetween(double low, double high) { return low + (high - low) * _chance(); }
    void NoteFailure(const Moment& now, FailureKind kind);
    void StartCountingAnew(const Moment& now);
    Span DrawWait(const Moment& now, FailureKind kind);
    Span DrawBackOff();
    Span GetRefusedWait() const;
    Span DrawShareOfLeft(Span left);

    RefreshPolicy _policy;
    std::function<double()> _chance;

    bool _isWanted = false;
    bool _isForced = false;   // the next attempt is due, whatever the clocks say
    bool _isIrregular = true; // what is under way came earlier than planned
    Attempt _underWay = Attempt::NONE;
    std::optional<Held> _held;
    std::optional<Span> _lastCame; // steady; also of a token that is held no more

    std::optional<Outage> _outage;
    int _failures = 0; // in a row
    int _refusals = 0; // in a row
    Span _backOff{};   // the last that was drawn
};

} // namespace SsoClient
