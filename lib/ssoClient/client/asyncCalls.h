#pragma once

#include "quillon/Exceptions.h"
#include "quillon/Functor.h"
#include "quillon/PanicVerify.h"
#include "quillon/Wiped.h"
#include "quillon/system/ThreadPool.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/client/cancelling.h"
#include "ssoClient/wire/assertionPlaces.h"

#include <boost/bind/bind.hpp>
#include <boost/function.hpp>
#include <boost/smart_ptr/make_shared.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include <atomic>
#include <string>

/** How a blocking operation becomes an asynchronous one. */
namespace SsoClient {

/** A blocking operation with its arguments. */
using TokenCall = boost::function<boost::shared_ptr<const SamlToken>()>;
using ValidationCall = boost::function<bool()>;

/** Keeps what a pointer points to alive inside a bound call, and hands it over by reference. */
template <class T>
class PassByRefHelper
{
public:
    /** Stops the process if there is nothing to hand over. */
    explicit PassByRefHelper(const boost::shared_ptr<T>& p)
        : _p(p)
    {
        if (_p == nullptr) {
            Quillon::PanicVerify(
                "_p",
                AssertionPlaces::SecurityTokenServiceImpl,
                AssertionPlaces::NullArgumentOfAsyncOperation);
        }
    }

    operator T&() const noexcept { return *_p; } // NOLINT(google-explicit-constructor)

private:
    boost::shared_ptr<T> _p;
};

template <class T>
PassByRefHelper<T> PassByRef(const boost::shared_ptr<T>& p)
{
    return PassByRefHelper<T>(p);
}

/** Bound calls are copied on their way to the pool; the copies share the one password. */
inline PassByRefHelper<const std::string> PassSecret(const std::string& secret)
{
    const auto copy = boost::make_shared<Quillon::Wiped>(secret);
    return PassByRef(boost::shared_ptr<const std::string>(copy, &copy->Get()));
}

/**
 * Calls the blocking operation and hands its outcome to the completion: its result, or
 * `defaultResult` and the exception. Exceptions that are no `Quillon::Exception`, and those of the
 * completion, leave the call.
 */
template <class SyncFunc, class ResultFunc, class DefaultResult>
void SyncCallToResultFunc(
    const SyncFunc& syncFunc, const ResultFunc& resultFunc, const DefaultResult& defaultResult)
{
    decltype(syncFunc()) result{};
    try {
        result = syncFunc();
    } catch (const Quillon::Exception& error) {
        resultFunc(defaultResult, &error);
        return;
    }
    resultFunc(result, nullptr);
}

/** Queues that call on the pool of the process. */
template <class SyncFunc, class ResultFunc, class DefaultResult>
void SyncToAsyncCall(
    const SyncFunc& syncFunc, const ResultFunc& resultFunc, const DefaultResult& defaultResult)
{
    const Quillon::Functor work = boost::bind<void>(
        &SyncCallToResultFunc<SyncFunc, ResultFunc, DefaultResult>,
        syncFunc,
        resultFunc,
        defaultResult);
    Quillon::System::GetThreadPool()->Queue(work);
}

/** Who takes a queued call: the thread that makes it, or who calls it off before. */
class QueuedCall
{
public:
    /** @return whether it is the caller's; the first one's. */
    bool Take() noexcept { return !_isTaken.exchange(true); }

private:
    std::atomic<bool> _isTaken{false};
};

/**
 * Queues that call; until it has a thread, the source of `token` may end it, and the completion is
 * called there.
 */
template <class SyncFunc, class ResultFunc, class DefaultResult>
void SyncToCancellableCall(
    const CancellationToken& token,
    const SyncFunc& syncFunc,
    const ResultFunc& resultFunc,
    const DefaultResult& defaultResult)
{
    const auto queued = boost::make_shared<QueuedCall>();
    const auto watch = boost::make_shared<CancellationWatch>(
        token.IsCancelled() ? CancellationToken() : token, [queued, resultFunc, defaultResult] {
            if (queued->Take()) {
                const CancelledException error("The operation was cancelled.");
                resultFunc(defaultResult, &error);
            }
        });
    Quillon::System::GetThreadPool()->Queue([=] {
        if (watch != nullptr && queued->Take()) {
            SyncCallToResultFunc(syncFunc, resultFunc, defaultResult);
        }
    });
}

template <class SyncFunc, class ResultFunc>
void SyncToCancellableCall(
    const CancellationToken& token, const SyncFunc& syncFunc, const ResultFunc& resultFunc)
{
    SyncToCancellableCall(token, syncFunc, resultFunc, boost::shared_ptr<const SamlToken>());
}

/** For operations that give a token. */
template <class SyncFunc, class ResultFunc>
void SyncToAsyncCall(const SyncFunc& syncFunc, const ResultFunc& resultFunc)
{
    SyncToAsyncCall(syncFunc, resultFunc, boost::shared_ptr<const SamlToken>());
}

} // namespace SsoClient
