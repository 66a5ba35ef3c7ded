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

/** How a call ended. */
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

protected:
    OperationObserver() = default;
    OperationObserver(const OperationObserver&) = default;
    OperationObserver& operator=(const OperationObserver&) = default;
    ~OperationObserver() = default;
};

} // namespace SsoClient
