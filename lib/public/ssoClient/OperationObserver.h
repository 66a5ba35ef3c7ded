#pragma once

#include "quillon/http/ExchangeFacts.h"
#include "ssoClient/Export.h"
#include "ssoClient/SoapFault.h"

#include <string>

namespace SsoClient {

/** A call of one of the operations of a `SecurityTokenService`. */
struct ObservedOperation
{
    std::string id;   ///< of this call alone; the log's lines of its start and end have it, too
    std::string name; ///< for example `AcquireTokenByCertificate`
};

/** An attempt of a token source to have another token. */
struct ObservedRefresh
{
    /** Whether the token that it has is renewed; otherwise one is acquired. */
    bool isRenewal = false;
};

/** Something that remembers, so that it need not be asked for or judged again. */
struct ObservedCache
{
    std::string name; ///< `DelegatedTokens` or `TokenVerifier`
};

/** How a call, or a refresh, ended. */
struct OperationOutcome
{
    bool succeeded = false;
    /** Of the exception if it did not, without its namespace; its text may have a secret of the
     * caller's own, from a handler of negotiations for example. */
    std::string exceptionClass;
    long long durationMicroseconds = 0;
};

/**
 * Looks on while operations run; changes nothing. Everything arrives in the order in which it
 * happens: a beginning, exchanges, at most one fault for each of them, an end. A retry is another
 * exchange of the same operation.
 *
 * Called by any number of threads at a time, for different operations: exchanges on the I/O thread
 * of the HTTP client, which does nothing else meanwhile, the rest on the thread of the operation.
 * It has to return at once and must not throw. What it is shown is valid during the call.
 */
class SSOCLIENT_API OperationObserver
{
public:
    virtual void OnBegin(const ObservedOperation& operation) noexcept;

    /** An exchange has ended, well or not; not told of one that is given up for a cancellation. */
    virtual void OnExchange(
        const ObservedOperation& operation, const Quillon::Http::ExchangeFacts& facts) noexcept;

    /** The service has answered with a fault. */
    virtual void OnFault(const ObservedOperation& operation, const SoapFault& fault) noexcept;

    virtual void OnEnd(
        const ObservedOperation& operation, const OperationOutcome& outcome) noexcept;

    // Told by the objects of the library for long-running processes that are given the observer.

    /**
     * On the thread that makes the attempt, as its end. The operations in between are told only if
     * their service has an observer. A renewal that is refused is followed by an acquisition.
     */
    virtual void OnRefreshBegin(const ObservedRefresh& refresh) noexcept;

    /** A token that came too late, or ends too early, to be handed out is a failure. */
    virtual void OnRefreshEnd(
        const ObservedRefresh& refresh, const OperationOutcome& outcome) noexcept;

    /** What was asked for was there, or somebody else was about to get it. */
    virtual void OnCacheHit(const ObservedCache& cache) noexcept;
    virtual void OnCacheMiss(const ObservedCache& cache) noexcept;

protected:
    OperationObserver() = default;
    OperationObserver(const OperationObserver&) = default;
    OperationObserver& operator=(const OperationObserver&) = default;
    ~OperationObserver() = default;
};

} // namespace SsoClient
