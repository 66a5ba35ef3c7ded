#pragma once

#include "ssoClientRuntime/PublishedToken.h"
#include "ssoClientRuntime/RefreshMachine.h"
#include "ssoClientRuntime/TokenSource.h"
#include "ssoClientRuntime/attempts.h"

#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace SsoClient {

/** How a source gets its tokens. */
struct TokenWays
{
    using Token = boost::shared_ptr<const SamlToken>;

    std::function<Token()> acquire;
    std::function<Token(const SamlToken&)> renew; ///< empty: every token is acquired
};

/**
 * What a source consists of, kept alive by the work that it has queued. It asks a `RefreshMachine`
 * what is to be done, has it done, and tells those who wait.
 *
 * Under the lock nothing runs but code of its own, and the clocks and the chance of the
 * environment. Whatever belongs to users is put on a list and comes after it.
 *
 * Thread safety: any number of threads.
 */
class TokenKeeper : public std::enable_shared_from_this<TokenKeeper>
{
public:
    using Token = boost::shared_ptr<const SamlToken>;
    using TimePoint = std::chrono::steady_clock::time_point;

    TokenKeeper(TokenWays ways, const TokenSourceOptions& options);

    Token GetToken();
    Token GetToken(TimePoint deadline);
    void GetTokenAsync(const TokenCompletion& completion);
    void Invalidate(const std::string& tokenId);
    void Refresh();
    TokenSourceStatus GetStatus() const;

    /** The source is gone: nothing more begins. */
    void Close();

private:
    struct Waiter
    {
        std::optional<Span>
            deadline; // steady; without one it takes the first failure for an answer
        std::function<void(const Outcome&)> settle;
    };

    /** An attempt that was made, with what was read of the token before the lock is taken. */
    struct Result
    {
        Outcome outcome;
        Moment asked;
        TokenFacts facts;
        ObservedRefresh refresh;
    };

    using Chores = std::vector<std::function<void()>>;

    Moment GetNow() const;
    template <class Change>
    void Apply(const Change& change);
    template <class Change, class First>
    void Apply(const Change& change, const First& first);
    Token Await(const std::optional<Span>& deadline);
    void AddWaiter(Waiter waiter);

    // Called under the lock.
    void Proceed(const Moment& now, Chores& chores);
    void SettleWaiters(const Moment& now, Chores& chores);
    std::optional<Outcome> GetAnswer(const Waiter& waiter, const Moment& now) const;
    std::optional<Span> GetNextAttempt() const;
    void ArmTimer(const Moment& now, Chores& chores);
    void LetGo();
    void Take(Result& result, const Moment& now);
    void Accept(Result& result, const Moment& now);
    TokenOutage DescribeOutage(const Moment& now) const;
    TokenSourceStatus DescribeStatus(const Moment& now) const;

    template <class Call>
    RuntimeEnvironment::Work WhileAlive(const Call& call);
    void SetTimer(Span time);
    void OnTimer(Span time);
    void QueueAttempt();
    bool MakePendingAttempt();
    Result Make(Attempt attempt, const Token& held, const Moment& asked) const;
    void DropPendingAttempt(const Quillon::Exception& failure);
    void Report(const Result& result) const;
    void TellEnd(const Result& result) const;

    const TokenWays _ways;
    const boost::shared_ptr<RuntimeEnvironment> _environment;
    const Quillon::Ref<const Quillon::Crypto::Certificate> _identity;
    const std::function<void(const TokenSourceStatus&)> _observer;
    const boost::shared_ptr<OperationObserver> _operationObserver; // may be null

    PublishedToken _published; // written under the lock

    mutable std::mutex _mutex;
    RefreshMachine _machine;
    std::optional<Attempt> _pending; // decided upon, but begun by nobody yet
    Token _token;                    // the one that the machine holds
    std::shared_ptr<const Quillon::Exception> _reason;
    std::optional<Span> _serviceClockAhead;
    std::list<Waiter> _waiters;
    std::optional<Span> _armedFor; // steady
    bool _isClosed = false;
};

} // namespace SsoClient
