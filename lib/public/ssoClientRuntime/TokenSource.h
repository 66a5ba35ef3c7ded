#pragma once

#include "quillon/crypto/Certificate.h"
#include "ssoClient/OperationObserver.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClientRuntime/Exceptions.h"
#include "ssoClientRuntime/RuntimeEnvironment.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <chrono>
#include <functional>
#include <optional>
#include <string>

namespace SsoClient {

/** How a source stands. */
struct TokenSourceStatus
{
    /** What `GetToken` gives now; null if there is no token that may be handed out. */
    boost::shared_ptr<const SamlToken> token;

    /** Until when it is handed out if no other comes: its end, less the remaining validity that is
     *  asked for. Meaningless without a token. */
    Quillon::System::DateTime goodUntil;

    /** Whether an exchange with the service is under way, or about to begin. */
    bool isBusy = false;

    /** The failures since the last success; without a reason if there are none. */
    TokenOutage outage;

    /**
     * By how much the service's clock is ahead of this machine's, judged by when the last token was
     * issued and when it came; behind if negative. It is off by half of what the exchange took, and
     * more if the service issues its tokens in advance. Absent before the first token.
     */
    std::optional<std::chrono::microseconds> serviceClockAhead;

    /** When the source asks for the next token if nothing happens until then, whether or not there
     *  is an outage; absent while it does, and before the first token is wanted. */
    std::optional<Quillon::System::DateTime> nextAttempt;
};

/** How a source keeps its token. As it starts, it is right for tokens of minutes to days. */
struct TokenSourceOptions
{
    /** The share of a token's lifetime after which another is asked for; above 0, below 1. */
    double refreshAt = 0.7;

    /**
     * By how much of that share the moment is drawn earlier or later, so that many processes do not
     * ask at once; from 0, and so that the latest moment stays before the token's end.
     */
    double jitter = 0.1;

    /**
     * Whether the moment is drawn from a wider range, from the beginning on, after a start, a
     * failure, and whatever else made a token come out of turn: these are what many processes have
     * at once.
     */
    bool spreadsFirst = true;

    /** A token with less validity than this is not handed out. From 0. */
    std::chrono::milliseconds minRemainingValidity = std::chrono::seconds(60);

    /**
     * What failures are answered with, a wait that is drawn anew each time from between `minWait`
     * and three times the one before, up to `maxWait`. `minWait` is above 0, and no longer than
     * `maxWait`.
     */
    std::chrono::milliseconds minWait = std::chrono::seconds(1);
    std::chrono::milliseconds maxWait = std::chrono::minutes(5);

    /**
     * The wait after what cannot get better by repeating: everything but a failure of the network
     * or an answer outside the protocol. It doubles with each in a row, up to `maxWait` if that is
     * longer. Above 0. A directory that locks accounts after wrong passwords may want more.
     */
    std::chrono::milliseconds refusedWait = std::chrono::minutes(1);

    /**
     * While there is a good token nobody suffers, so the second failure in a row, and any further,
     * is answered with a wait of half to three quarters of the time that the token is still good
     * for, but no more than this, unless the usual wait is longer anyway. 0: always the usual wait.
     * It keeps what is due in an outage from coming all at once when the service is back.
     */
    std::chrono::milliseconds patience = std::chrono::minutes(15);

    /**
     * The certificate of the service's holder-of-key identity. A renewable token that is bound to
     * it is renewed; every other is acquired anew, as all are if this is null.
     */
    Quillon::Ref<const Quillon::Crypto::Certificate> identity;

    /**
     * Told after each attempt, well or not, on the thread that made it, and before those who wait
     * for that attempt; may be empty. Two calls overlap if one takes longer than the next attempt.
     * What it throws is logged.
     */
    std::function<void(const TokenSourceStatus&)> observer;

    /** Null: the environment of the process. */
    boost::shared_ptr<RuntimeEnvironment> environment;

    /** Told of the beginning and the end of each attempt, how it is made, and how long it took.
     *  Kept; null for none. */
    boost::shared_ptr<OperationObserver> operationObserver;
};

/**
 * Keeps a good token for as long as it lives. The first call has a token acquired; from then on
 * another is there before that one ends, in the background, renewed if the token allows for it. A
 * refused renewal becomes an acquisition. There is one attempt at a time, however many threads
 * wait.
 *
 * A good token is handed out through any outage of the service, but never one that has expired or
 * has less than the asked validity left: by the wall clock, and by the time that has gone by since
 * the token came if the clock was set back.
 *
 * It may be destroyed at any moment, also by code that it calls. Completions that wait are then
 * told so. An exchange that is under way goes on, and its outcome is dropped: what the functions
 * given to the source refer to must live as long as the functions themselves.
 *
 * There is no virtual destructor: a source is only owned by the pointer of its factory.
 *
 * Thread safety: any number of threads. A forked child cannot use it but for the token it has.
 * Cost: with a good token, `GetToken` takes no lock.
 */
class SSOCLIENT_RUNTIME_API TokenSource
{
public:
    /**
     * The good token. Without one it waits for the attempt that is under way, or makes one on the
     * calling thread; while the source waits after a failure, it throws at once.
     *
     * @return never null.
     * @throws NoTokenException  the attempt has failed.
     */
    virtual boost::shared_ptr<const SamlToken> GetToken() = 0;

    /**
     * The same, but it waits through failures until there is a token, though no longer than to
     * `deadline` by the environment's steady time, and not at all if the next attempt lies beyond
     * it.
     */
    virtual boost::shared_ptr<const SamlToken> GetToken(
        std::chrono::steady_clock::time_point deadline) = 0;

    /**
     * The first form without waiting: the completion is called exactly once, on a thread of the
     * environment, with a token or with a `NoTokenException`.
     *
     * @throws Quillon::InvalidArgumentException  the completion is empty.
     */
    virtual void GetTokenAsync(const TokenCompletion& completion) = 0;

    /**
     * Says that whoever was shown this token refused it. If it is still the one that is handed out,
     * it is so no more, and another is acquired. A token that is refused within a minute counts as
     * a failure of the service, so that a misunderstanding does not become a storm of requests.
     */
    virtual void Invalidate(const std::string& tokenId) = 0;

    /**
     * Says that something has changed, such as a password: another token is asked for now, whatever
     * the source was waiting for. A good token is handed out until it is there.
     */
    virtual void Refresh() = 0;

    virtual TokenSourceStatus GetStatus() const = 0;

protected:
    ~TokenSource() = default;
};

/** Gives the password of the moment; asked before each acquisition. */
using PasswordProvider = std::function<PasswordCredentials()>;

/** Makes a fresh handler for each negotiation. */
using NegotiationHandlerFactory = std::function<boost::shared_ptr<NegotiationHandler>()>;

/** Gets a token from anywhere. Null, like an exception, is a failure. */
using TokenFunction = std::function<boost::shared_ptr<const SamlToken>()>;

/**
 * Sources for each operation of a service. What the given functions throw is a failure like one of
 * the service; they are called on threads of the environment and of those who ask for a token, one
 * call at a time.
 *
 * @throws Quillon::InvalidArgumentException  the service, the function or the source is null, or
 * the options contradict what is said of them.
 */
SSOCLIENT_RUNTIME_API boost::shared_ptr<TokenSource> CreatePasswordTokenSource(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const PasswordProvider& provider,
    const TokenSpec& spec,
    const TokenSourceOptions& options = TokenSourceOptions());

SSOCLIENT_RUNTIME_API boost::shared_ptr<TokenSource> CreateCertificateTokenSource(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const TokenSpec& spec,
    const TokenSourceOptions& options = TokenSourceOptions());

/** For Kerberos, `factory` calls `Gss::CreateKerberosNegotiationHandler`. */
SSOCLIENT_RUNTIME_API boost::shared_ptr<TokenSource> CreateNegotiationTokenSource(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const NegotiationHandlerFactory& factory,
    const TokenSpec& spec,
    const TokenSourceOptions& options = TokenSourceOptions());

/**
 * Exchanges the token of another source. If the service rejects that one as credentials, the other
 * source is told (see `Invalidate`).
 */
SSOCLIENT_RUNTIME_API boost::shared_ptr<TokenSource> CreateExchangeTokenSource(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const boost::shared_ptr<TokenSource>& presented,
    const TokenSpec& spec,
    const TokenSourceOptions& options = TokenSourceOptions());

/** For any other way to a token. Nothing is renewed. */
SSOCLIENT_RUNTIME_API boost::shared_ptr<TokenSource> CreateTokenSource(
    const TokenFunction& acquire, const TokenSourceOptions& options = TokenSourceOptions());

} // namespace SsoClient
