#include "ssoClient/client/Call.h"

#include "quillon/http/HttpException.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/client/cancelling.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <algorithm>
#include <memory>
#include <mutex>

namespace SsoClient {

namespace {

using Quillon::Http::ExchangeFacts;
using PendingRef = Quillon::Ref<Quillon::System::ScheduledItem>;

constexpr long long MicrosecondsPerSecond = 1'000'000;
constexpr long long MicrosecondsPerMillisecond = 1'000;

/** Statuses of a service that has not looked at the request. */
constexpr int RequestTimeout = 408;
constexpr int TooManyRequests = 429;
constexpr int ServiceUnavailable = 503;

bool SaysThatNothingHappened(const ExchangeFacts& facts)
{
    return facts.status == RequestTimeout || facts.status == TooManyRequests
           || (facts.status == ServiceUnavailable && facts.retryAfterSeconds);
}

/** A handshake that fails would fail again: it is a matter of what the two sides are like. */
bool HasNotConnected(const ExchangeFacts& facts)
{
    return !facts.isSent && facts.times.connection == 0;
}

} // namespace

/**
 * What the I/O thread learns for a call. It outlives the call where an exchange that was given up
 * is about to end.
 */
class CallRecord
{
public:
    CallRecord(const boost::shared_ptr<OperationObserver>& observer, ObservedOperation operation)
        : _observer(observer)
        , _operation(std::move(operation))
    {}

    void Tell(const ExchangeFacts& facts)
    {
        if (_observer != nullptr) {
            _observer->OnExchange(_operation, facts);
        }
        const std::lock_guard<std::mutex> lock(_mutex);
        _latest = facts;
    }

    /** The latest exchange, once. */
    boost::optional<ExchangeFacts> Take()
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        boost::optional<ExchangeFacts> latest;
        latest.swap(_latest);
        return latest;
    }

    /** Calls `pending` off when the token's source cancels, until another takes its place. */
    void Watch(const CancellationToken& token, const PendingRef& pending)
    {
        _watch.reset(); // one after the other: the thread of the call has one exchange at a time
        _watch = std::make_unique<CancellationWatch>(token, [pending] { pending->Cancel(); });
    }

    const boost::shared_ptr<OperationObserver>& GetObserver() const { return _observer; }
    const ObservedOperation& GetOperation() const { return _operation; }

    void StopWatching() { _watch.reset(); }

private:
    const boost::shared_ptr<OperationObserver> _observer; // may be null
    const ObservedOperation _operation;
    std::unique_ptr<CancellationWatch> _watch; // on the thread of the call
    std::mutex _mutex;                         // guards the next
    boost::optional<ExchangeFacts> _latest;
};

Call::Call(const CallControl* control, const std::string& id, const char* operationName)
    : _control(control)
{
    if (_control != nullptr) {
        _record = boost::make_shared<CallRecord>(
            _control->options.observer, ObservedOperation{id, operationName});
        _start = _control->environment->Now();
        _deadline = _control->Started().deadline;
    }
}

Call::~Call()
{
    if (_record != nullptr) {
        _record->StopWatching();
    }
}

OperationObserver* Call::GetObserver() const
{
    return _record != nullptr ? _record->GetObserver().get() : nullptr;
}

Call::Observation::Observation(const Call& call)
    : _call(call)
{
    if (_call.GetObserver() != nullptr) {
        _call.GetObserver()->OnBegin(_call._record->GetOperation());
    }
}

Call::Observation::~Observation()
{
    if (_call.GetObserver() != nullptr) {
        OperationOutcome outcome;
        outcome.succeeded = _call._exceptionClass.empty();
        outcome.exceptionClass = _call._exceptionClass;
        outcome.durationMicroseconds = _call._control->environment->Now() - _call._start;
        _call.GetObserver()->OnEnd(_call._record->GetOperation(), outcome);
    }
}

boost::shared_ptr<TransportSession> Call::CreateSession(
    const Transport& transport, bool isNegotiation) const
{
    if (_control == nullptr) {
        return transport.CreateSession();
    }
    SessionOptions options;
    options.isNegotiation = isNegotiation;
    const boost::shared_ptr<CallRecord> record = _record;
    options.observer = [record](const ExchangeFacts& facts) { record->Tell(facts); };
    options.onPending = [this](const PendingRef& pending) {
        _record->Watch(_control->options.cancellation, pending);
    };
    if (_deadline) {
        options.timeLeft = [this] { return std::max(GetTimeLeft(), 1LL); };
    }
    return transport.CreateControlledSession(options);
}

boost::shared_ptr<const ResponseHandler> Call::Observe(
    const boost::shared_ptr<const ResponseHandler>& handler) const
{
    if (GetObserver() == nullptr) {
        return handler;
    }
    const boost::shared_ptr<CallRecord> record = _record;
    return handler->ShowingFaultsTo([record](const SoapFault& fault) {
        record->GetObserver()->OnFault(record->GetOperation(), fault);
    });
}

long long Call::GetTimeLeft() const
{
    return *_deadline - _control->environment->Now();
}

void Call::RequireNotCancelled() const
{
    if (_control->options.cancellation.IsCancelled()) {
        throw CancelledException("The operation was cancelled.");
    }
}

/** What an exchange fails with for a cancellation or the deadline says less than this. */
void Call::RequireLeave() const
{
    RequireNotCancelled();
    if (_deadline && GetTimeLeft() <= 0) {
        const long long limit = _control->options.deadlineMicroseconds / MicrosecondsPerMillisecond;
        throw Quillon::Http::TimeoutException(
            "The operation was not complete within its " + std::to_string(limit)
            + " milliseconds.");
    }
}

/** Called while an exchange's failure is handled; throws it again if it is to stay with that. */
void Call::RequireRepeat(Repeat rule, unsigned made)
{
    RequireLeave();
    if (!MayRepeat(rule, made)) {
        throw;
    }
}

bool Call::MayRepeat(Repeat rule, unsigned made)
{
    const boost::optional<ExchangeFacts> facts = _record->Take();
    if (rule == Repeat::NEVER || made >= _control->options.retry.attempts || !facts) {
        return false;
    }
    const bool isSafe = HasNotConnected(*facts)
                        || (rule == Repeat::IF_NOT_ACTED_ON && SaysThatNothingHappened(*facts));
    const long long wished = facts->retryAfterSeconds.value_or(0);
    const long long longest = _control->options.retry.longestDelayMicroseconds;
    if (!isSafe || wished > longest / MicrosecondsPerSecond) {
        return false;
    }
    _delay = wished * MicrosecondsPerSecond + ComputeDelay(made + 1);
    return !_deadline || _delay < GetTimeLeft();
}

/** Twice as long each time, and the second half of it by chance. */
long long Call::ComputeDelay(unsigned attempt) const
{
    const RetryPolicy& retry = _control->options.retry;
    long long delay = std::min(retry.firstDelayMicroseconds, retry.longestDelayMicroseconds);
    for (unsigned i = 2; i < attempt && delay < retry.longestDelayMicroseconds; ++i) {
        delay = std::min(2 * delay, retry.longestDelayMicroseconds);
    }
    const auto half = static_cast<double>(delay) / 2;
    return static_cast<long long>(half + half * _control->environment->Draw());
}

/** The next attempt asks whether it was cut short. */
void Call::Wait() const
{
    _control->environment->Wait(_control->options.cancellation, _delay);
}

} // namespace SsoClient
