#pragma once

#include "ssoClient/client/CallControl.h"
#include "ssoClient/protocol/ResponseHandler.h"
#include "ssoClient/protocol/Transport.h"

#include "quillon/Exceptions.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>

namespace SsoClient {

class CallRecord;

/** When an exchange that failed may be made again. */
enum class Repeat
{
    NEVER,
    IF_NOT_SENT,     ///< nothing of it went out
    IF_NOT_ACTED_ON, ///< or the service says that it did not look at it
};

/**
 * One call of an operation, with what its service's options say of it; without options it adds
 * nothing. It limits, calls off, repeats and reports the exchanges that are made through it.
 *
 * Thread safety: one thread.
 */
class Call
{
public:
    /** @param control  may be null: there are no options. Kept by reference. */
    Call(const CallControl* control, const std::string& id, const char* operationName);
    Call(const Call&) = delete;
    Call& operator=(const Call&) = delete;
    ~Call();

    /** Does what the operation does, and reports its beginning and its end. */
    template <class Perform>
    auto Report(const Perform& perform)
    {
        if (_control == nullptr) {
            return perform();
        }
        const Observation observation(*this);
        try {
            RequireLeave();
            return perform();
        } catch (const std::exception& error) {
            _exceptionClass = Quillon::GetClassName(error);
            throw;
        } catch (...) {
            _exceptionClass = "unknown";
            throw;
        }
    }

    /** A session whose exchanges are those of this call. */
    boost::shared_ptr<TransportSession> CreateSession(
        const Transport& transport, bool isNegotiation = false) const;

    /** One that shows faults to the observer of this call. */
    boost::shared_ptr<const ResponseHandler> Observe(
        const boost::shared_ptr<const ResponseHandler>& handler) const;

    /** Makes an exchange; and again, as the options and `rule` have it. @return what it returns. */
    template <class Exchange>
    auto Attempt(Repeat rule, const Exchange& exchange)
    {
        if (_control == nullptr) {
            return exchange();
        }
        for (unsigned made = 1;; ++made) {
            RequireLeave();
            try {
                auto result = exchange();
                RequireNotCancelled();
                return result;
            } catch (const Quillon::Exception&) {
                RequireRepeat(rule, made);
            }
            Wait();
        }
    }

private:
    /** Reports the beginning and, however it is left, the end. */
    class Observation
    {
    public:
        explicit Observation(const Call& call);
        Observation(const Observation&) = delete;
        Observation& operator=(const Observation&) = delete;
        ~Observation();

    private:
        const Call& _call;
    };

    OperationObserver* GetObserver() const;
    long long GetTimeLeft() const;
    void RequireNotCancelled() const;
    void RequireLeave() const;
    void RequireRepeat(Repeat rule, unsigned made);
    bool MayRepeat(Repeat rule, unsigned made);
    void Wait() const;
    long long ComputeDelay(unsigned attempt) const;

    const CallControl* const _control;
    boost::shared_ptr<CallRecord> _record; // null without options
    long long _start = 0;
    boost::optional<long long> _deadline;
    long long _delay = 0;        // before the next attempt
    std::string _exceptionClass; // that the call ends with; empty for none
};

} // namespace SsoClient
