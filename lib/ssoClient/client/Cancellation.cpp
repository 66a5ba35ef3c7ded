#include "ssoClient/Cancellation.h"

#include "ssoClient/client/cancelling.h"
#include "ssoClient/client/logging.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <chrono>
#include <thread>
#include <utility>

namespace SsoClient {

namespace {

void LogStrayException(const std::string& what)
{
    getLogger()->Log(
        Quillon::Service::LOG_LEVEL_WARNING,
        "The completion of a cancelled operation raised an exception: " + what);
}

/** What one of them throws must not keep the others from being told. */
void Run(const CancellationState::Action& action)
{
    try {
        action();
    } catch (const std::exception& error) {
        LogStrayException(error.what());
    } catch (...) {
        LogStrayException("not a std::exception");
    }
}

} // namespace

bool CancellationState::IsCancelled() const noexcept
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return _isCancelled;
}

void CancellationState::Cancel()
{
    std::list<Action> actions;
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _isCancelled = true;
        actions.swap(_actions);
        _cancelled.notify_all();
    }
    for (const Action& action : actions) {
        Run(action);
    }
}

bool CancellationState::Add(const Action& action, Place& place)
{
    std::list<Action> added{action};
    const std::lock_guard<std::mutex> lock(_mutex);
    if (_isCancelled) {
        return false;
    }
    place = added.begin();
    _actions.splice(_actions.end(), added);
    return true;
}

void CancellationState::Remove(Place place) noexcept
{
    std::list<Action> removed; // goes after the lock
    const std::lock_guard<std::mutex> lock(_mutex);
    if (!_isCancelled) {
        removed.splice(removed.end(), _actions, place);
    }
}

bool CancellationState::Wait(long long microseconds) const
{
    std::unique_lock<std::mutex> lock(_mutex);
    return _cancelled.wait_for(
        lock, std::chrono::microseconds(microseconds), [this] { return _isCancelled; });
}

CancellationWatch::CancellationWatch(
    const CancellationToken& token, const CancellationState::Action& action)
{
    if (token._state == nullptr) {
        return;
    }
    if (token._state->Add(action, _place)) {
        _state = token._state;
    } else {
        action();
    }
}

CancellationWatch::~CancellationWatch()
{
    if (_state != nullptr) {
        _state->Remove(_place);
    }
}

bool CancellationWatch::Wait(const CancellationToken& token, long long microseconds)
{
    if (token._state != nullptr) {
        return token._state->Wait(microseconds);
    }
    std::this_thread::sleep_for(std::chrono::microseconds(microseconds));
    return false;
}

bool CancellationToken::IsCancelled() const noexcept
{
    return _state != nullptr && _state->IsCancelled();
}

CancellationSource::CancellationSource()
    : _state(boost::make_shared<CancellationState>())
{}

CancellationToken CancellationSource::GetToken() const
{
    CancellationToken token;
    token._state = _state;
    return token;
}

void CancellationSource::Cancel() const
{
    // Its last user may let go of it meanwhile.
    const boost::shared_ptr<CancellationState> state = _state;
    state->Cancel();
}

} // namespace SsoClient
