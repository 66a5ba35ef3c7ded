#include "http/Exchange.h"

#include "http/HttpEngine.h"

#include "quillon/service/Logger.h"

#include <algorithm>
#include <chrono>
#include <new>
#include <utility>

namespace Quillon::Http {

namespace {

constexpr long long MicrosecondsPerSecond = 1'000'000;

/** Longer waits are cut to this: the clock's range has an end. */
constexpr long long LongestWait = 1'000'000'000 * MicrosecondsPerSecond;

/** For example "240 seconds" or "0.05 seconds". */
std::string FormatSeconds(long long microseconds)
{
    std::string text = std::to_string(microseconds / MicrosecondsPerSecond);
    const long long fraction = microseconds % MicrosecondsPerSecond;
    if (fraction > 0) {
        // The leading one keeps the zeros after the point.
        text += "." + std::to_string(MicrosecondsPerSecond + fraction).substr(1);
        text.erase(text.find_last_not_of('0') + 1);
    }
    return text + " seconds";
}

void LogStrayException(const char* what) noexcept
{
    try {
        Service::GetApp()->GetLogFacility().GetLogger("Quillon")->Log(
            Service::LOG_LEVEL_WARNING,
            std::string("The completion of an HTTP exchange raised an exception: ") + what);
    } catch (const std::bad_alloc&) { // NOLINT(bugprone-empty-catch): a lost line harms nobody
    }
}

} // namespace

Exchange::Exchange(const Completion& completion, std::string server)
    : _server(std::move(server))
    , _completion(completion)
{}

bool Exchange::Complete(Outcome outcome)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    if (_state != State::PENDING) {
        return false;
    }
    _outcome = std::move(outcome);
    _state = State::COMPLETED;
    _ended.notify_all();
    return !_completion.empty();
}

void Exchange::Deliver(PendingRequestItem& item) noexcept
{
    Completion completion;
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _completionStarted = !_completion.empty();
        _completion.swap(completion);
    }
    if (completion.empty()) {
        return;
    }
    try {
        completion(_outcome.error.get(), _outcome.response.get(), &item);
    } catch (const std::exception& error) {
        LogStrayException(error.what());
    } catch (...) {
        LogStrayException("not a std::exception");
    }
}

bool Exchange::Cancel() noexcept
{
    Completion completion; // goes after the lock: its destructor is the caller's code
    const std::lock_guard<std::mutex> lock(_mutex);
    if (_completionStarted) {
        return false;
    }
    _completion.swap(completion);
    if (_state == State::PENDING) {
        _state = State::CANCELLED;
        _ended.notify_all();
        HttpEngine::Get().NoteCancellation();
    }
    return true;
}

bool Exchange::IsCancelled() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return _state == State::CANCELLED;
}

Ref<ClientResponse> Exchange::Wait(long long timeout)
{
    const auto limit = std::chrono::microseconds(std::clamp(timeout, 0LL, LongestWait));
    std::unique_lock<std::mutex> lock(_mutex);
    if (!_ended.wait_for(lock, limit, [this] { return _state != State::PENDING; })) {
        lock.unlock();
        Cancel();
        throw MakeTimeoutException(_server, timeout);
    }
    if (_state == State::CANCELLED) {
        throw HttpException("The exchange with " + _server + " was called off.");
    }
    if (_outcome.error != nullptr) {
        _outcome.error->Throw();
    }
    return _outcome.response;
}

PendingRequestItemImpl::PendingRequestItemImpl(Ref<Exchange> exchange)
    : _exchange(std::move(exchange))
{}

bool PendingRequestItemImpl::Cancel() noexcept
{
    // An exchange of the parent never completes in a forked child, whose lock may never be free.
    return HttpEngine::Get().HasForked() || _exchange->Cancel();
}

TimeoutException MakeTimeoutException(const std::string& server, long long timeout)
{
    return TimeoutException(
        "There was no complete reply from " + server + " within " + FormatSeconds(timeout) + ".");
}

TimeoutException MakeConnectTimeoutException(const std::string& server, long long timeout)
{
    return TimeoutException(
        "There was no connection to " + server + " within " + FormatSeconds(timeout) + ".");
}

} // namespace Quillon::Http
