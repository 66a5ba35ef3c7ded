#include "http/HttpEngine.h"

#include "system/systemError.h"
#include "threads/ProcessEnd.h"

#include "quillon/system/SignalBlock.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Quillon::Http {

namespace {

/** The poll returns for every event; this only bounds the harm of one that got lost. */
constexpr std::chrono::milliseconds LongestPoll{60'000};

/** Until connections that could not be closed for lack of memory are looked at again. */
constexpr std::chrono::milliseconds PollWithoutMemory{1'000};

/** The system may have no memory for the octet that wakes the poll up; then there soon is some. */
constexpr int WakeUps = 16;

/** No process has this one. */
constexpr int NoProcess = -1;

/** Never destroyed, see the class. */
union ImmortalEngine {
    ImmortalEngine() { new (&engine) HttpEngine(); }
    ~ImmortalEngine() {} // NOLINT(modernize-use-equals-default): the member is left alone
    ImmortalEngine(const ImmortalEngine&) = delete;
    ImmortalEngine& operator=(const ImmortalEngine&) = delete;

    HttpEngine engine;
};

[[noreturn]] void ThrowForked()
{
    throw HttpException("The process has forked after its first HTTP exchange; the child "
                        "cannot send. Fork first.");
}

[[noreturn]] void ThrowEnded()
{
    throw HttpException("The process is about to end and sends nothing any more.");
}

} // namespace

HttpEngine& HttpEngine::Get() noexcept
{
    static ImmortalEngine immortal;
    return immortal.engine;
}

/** Made while the program is loaded: a fork must not meet a thread that makes it. */
[[maybe_unused]] const HttpEngine& madeEarly = HttpEngine::Get();

void HttpEngine::RequireRunning()
{
    RequireOwnProcess();
    const System::ProcessLock lock(_mutex);
    if (!IsOwn(lock)) {
        ThrowForked();
    }
    if (_state == State::ENDED) {
        ThrowEnded();
    }
    if (_state == State::IDLE) {
        Start();
        _state = State::RUNNING;
    }
}

void HttpEngine::Start()
{
    if (_multi == nullptr) {
        if (curl_global_init(CURL_GLOBAL_SSL) != CURLE_OK) {
            throw HttpException("libcurl cannot be initialised.");
        }
        MakeMulti();
    }
    // libcurl has initialised OpenSSL by now, so OpenSSL takes itself down after the threads.
    static const bool stops =
        System::RunAtProcessEnd(System::EndStage::EXCHANGES, [] { Get().Stop(); });
    if (!stops) {
        ThrowEnded();
    }
    _noMemory =
        std::make_shared<const HttpException>("There is not enough memory for the exchange.");
    // A broken connection raises SIGPIPE, which libcurl leaves to us.
    const System::SignalBlock noSignals;
    try {
        _callbackThread.Start();
        _ioThread = std::thread([this] { Run(); });
    } catch (const std::system_error& error) {
        throw HttpException(
            "The HTTP threads cannot be started: "
            + System::DescribeSystemError(error.code().value()) + ".");
    }
    _pid = getpid();
}

void HttpEngine::MakeMulti()
{
    errno = 0;
    std::unique_ptr<CURLM, CurlDeleter<curl_multi_cleanup>> owner(curl_multi_init());
    const int error = errno;
    if (owner == nullptr) {
        throw std::bad_alloc();
    }
    // Without a free descriptor libcurl makes a handle that nothing can wake up.
    if (curl_multi_wakeup(owner.get()) != CURLM_OK) {
        throw HttpException(
            "The HTTP threads cannot be started: " + System::DescribeSystemError(error) + ".");
    }
    _multi = owner.release();
}

void HttpEngine::Submit(std::unique_ptr<Transfer> transfer)
{
    {
        const System::ProcessLock lock(_mutex);
        if (_state != State::RUNNING) {
            ThrowEnded();
        }
        _submitted.push_back(std::move(transfer));
    }
    Wake();
}

void HttpEngine::NoteCancellation() noexcept
{
    _hasCancelled = true;
    Wake();
}

void HttpEngine::RequireOwnProcess() const
{
    if (HasForked()) {
        ThrowForked();
    }
}

std::list<Connections>::iterator HttpEngine::AddConnections(
    Ref<const ConnectionSpecImpl> spec, std::optional<std::chrono::microseconds> idleLimit)
{
    RequireOwnProcess();
    const System::ProcessLock lock(_mutex);
    if (!IsOwn(lock)) {
        ThrowForked();
    }
    // Those with a limit stand together, so that looking for idle ones takes no look at the rest.
    const auto place = idleLimit ? _connections.begin() : _connections.end();
    const auto connections = _connections.emplace(place, std::move(spec));
    connections->idleLimit = idleLimit;
    return connections;
}

void HttpEngine::RetireConnections(std::list<Connections>::iterator connections) noexcept
{
    std::list<Connections> unused; // goes after the lock
    const System::ProcessLock lock(_mutex);
    if (!IsOwn(lock)) {
        return; // they are the parent's
    }
    const bool areOpen = connections->share != nullptr;
    std::list<Connections>& target = areOpen ? _retired : unused;
    target.splice(target.end(), _connections, connections);
    if (areOpen) {
        Wake();
    }
}

/** A child that finds the engine half changed by a thread of its parent cannot use it. */
bool HttpEngine::IsOwn(const System::ProcessLock& lock) noexcept
{
    if (!lock.IsIntact()) {
        _pid = NoProcess;
    }
    return !HasForked();
}

bool HttpEngine::HasForked() const noexcept
{
    return _pid != 0 && _pid != getpid();
}

void HttpEngine::Wake() noexcept
{
    CURLM* const multi = _multi;
    // The wake-up channel of a forked child is still that of its parent.
    if (multi == nullptr || HasForked()) {
        return;
    }
    for (int i = 0; i < WakeUps && curl_multi_wakeup(multi) != CURLM_OK; ++i) {
    }
}

void HttpEngine::Run()
{
    std::vector<std::unique_ptr<Transfer>> submitted;
    while (TakeWork(submitted)) {
        for (std::unique_ptr<Transfer>& transfer : submitted) {
            StartTransfer(std::move(transfer));
        }
        submitted.clear();
        DropCancelled();
        int running = 0;
        curl_multi_perform(_multi, &running);
        CompleteFinished();
        curl_multi_poll(_multi, nullptr, 0, static_cast<int>(LookForIdle().count()), nullptr);
    }
    CloseEverything();
}

bool HttpEngine::TakeWork(std::vector<std::unique_ptr<Transfer>>& submitted)
{
    std::list<Connections> retired; // closed after the lock
    const System::ProcessLock lock(_mutex);
    retired.swap(_retired);
    if (_state == State::ENDED) {
        return false;
    }
    submitted.swap(_submitted);
    return true;
}

void HttpEngine::StartTransfer(std::unique_ptr<Transfer> transfer) noexcept
{
    if (transfer->GetExchange().IsCancelled()) {
        return;
    }
    try {
        transfer->Prepare();
    } catch (const std::bad_alloc&) {
        Complete(std::move(transfer), {_noMemory, {}});
        return;
    } catch (const std::exception& error) {
        Complete(std::move(transfer), MakeFailure(error.what()));
        return;
    }
    Perform(std::move(transfer));
}

void HttpEngine::Perform(std::unique_ptr<Transfer> transfer) noexcept
{
    try {
        Attach(transfer);
    } catch (const std::bad_alloc&) {
        Complete(std::move(transfer), {_noMemory, {}});
    }
}

/** Takes the transfer if it does not throw. */
void HttpEngine::Attach(std::unique_ptr<Transfer>& transfer)
{
    CURL* const easy = transfer->GetHandle();
    _transfers[easy].swap(transfer);
    const CURLMcode code = curl_multi_add_handle(_multi, easy);
    if (code != CURLM_OK) {
        Complete(Remove(easy), MakeFailure(curl_multi_strerror(code)));
    }
}

void HttpEngine::DropCancelled()
{
    if (!_hasCancelled.exchange(false)) {
        return;
    }
    for (auto position = _transfers.begin(); position != _transfers.end();) {
        if (position->second->GetExchange().IsCancelled()) {
            curl_multi_remove_handle(_multi, position->first);
            position = _transfers.erase(position);
        } else {
            ++position;
        }
    }
}

/** @return when to look again, at the latest. */
std::chrono::milliseconds HttpEngine::LookForIdle() noexcept
{
    try {
        return CloseIdle();
    } catch (const std::bad_alloc&) {
        return PollWithoutMemory;
    }
}

/**
 * Closes the connections that have been idle for too long.
 *
 * @return when to look again, at the latest.
 */
std::chrono::milliseconds HttpEngine::CloseIdle()
{
    using std::chrono::milliseconds;
    std::list<ShareOwner> due; // closed after the lock
    milliseconds longest = LongestPoll;
    const auto now = Connections::Clock::now();
    const System::ProcessLock lock(_mutex);
    for (Connections& connections : _connections) {
        if (!connections.idleLimit) {
            break;
        }
        if (connections.share == nullptr || connections.transfers > 0) {
            continue;
        }
        const auto left = *connections.idleLimit - (now - connections.idleSince);
        if (left.count() <= 0) {
            due.push_back(std::move(connections.share));
        } else {
            longest = std::min(longest, std::chrono::ceil<milliseconds>(left));
        }
    }
    return longest;
}

void HttpEngine::CompleteFinished()
{
    int left = 0;
    while (const CURLMsg* message = curl_multi_info_read(_multi, &left)) {
        if (message->msg != CURLMSG_DONE) {
            continue;
        }
        // Removing the handle frees the message.
        const CURLcode result = message->data.result;
        std::unique_ptr<Transfer> transfer = Remove(message->easy_handle);
        if (transfer->IsToBeStartedAgain()) {
            Perform(std::move(transfer));
            continue;
        }
        Outcome outcome = Finish(*transfer, result);
        Complete(std::move(transfer), std::move(outcome));
    }
}

Outcome HttpEngine::Finish(Transfer& transfer, CURLcode result) const noexcept
{
    try {
        return transfer.Finish(result);
    } catch (const std::bad_alloc&) {
        return {_noMemory, {}};
    } catch (const std::exception& error) {
        return MakeFailure(error.what());
    }
}

Outcome HttpEngine::MakeFailure(const char* text) const noexcept
{
    try {
        return {std::make_shared<HttpException>(text), {}};
    } catch (const std::bad_alloc&) {
        return {_noMemory, {}};
    }
}

void HttpEngine::Complete(std::unique_ptr<Transfer> transfer, Outcome outcome) noexcept
{
    Notice notice = transfer->TakeNotice();
    Exchange& exchange = notice.front()->GetExchange();
    // Before anyone hears of the end: the request with its secrets is gone by then.
    transfer.reset();
    if (exchange.Complete(std::move(outcome))) {
        _callbackThread.Push(notice);
    }
}

std::unique_ptr<Transfer> HttpEngine::Remove(CURL* easy)
{
    curl_multi_remove_handle(_multi, easy);
    return std::move(_transfers.extract(easy).mapped());
}

/** Whoever waits is told; completions do not run in a process that ends. */
void HttpEngine::GiveUp(const Transfer& transfer) const noexcept
{
    transfer.GetExchange().Complete(MakeFailure("The process is about to end."));
}

void HttpEngine::CloseEverything()
{
    std::vector<std::unique_ptr<Transfer>> submitted;
    {
        const System::ProcessLock lock(_mutex);
        submitted.swap(_submitted);
    }
    for (const std::unique_ptr<Transfer>& transfer : submitted) {
        GiveUp(*transfer);
    }
    submitted.clear();
    while (!_transfers.empty()) {
        GiveUp(*Remove(_transfers.begin()->first));
    }
    std::list<Connections> retired;
    const System::ProcessLock lock(_mutex);
    retired.swap(_retired);
    for (Connections& connections : _connections) {
        connections.share.reset();
    }
    // The multi handle stays: freeing it would change the disposition of SIGPIPE for a moment.
}

void HttpEngine::Stop()
{
    if (HasForked()) {
        return;
    }
    {
        const System::ProcessLock lock(_mutex);
        if (!IsOwn(lock) || std::exchange(_state, State::ENDED) != State::RUNNING) {
            return;
        }
    }
    Wake();
    _ioThread.join();
    _callbackThread.Stop();
}

} // namespace Quillon::Http
