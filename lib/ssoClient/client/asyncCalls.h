#pragma once

#include "quillon/Exceptions.h"
#include "quillon/Functor.h"
#include "quillon/PanicVerify.h"
#include "quillon/Wiped.h"
#include "quillon/system/ThreadPool.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/wire/assertionPlaces.h"

#include <boost/bind/bind.hpp>
#include <boost/function.hpp>
#include <boost/smart_ptr/make_shared.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

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

/** For operations that give a token. */
template <class SyncFunc, class ResultFunc>
void SyncToAsyncCall(const SyncFunc& syncFunc, const ResultFunc& resultFunc)
{
    SyncToAsyncCall(syncFunc, resultFunc, boost::shared_ptr<const SamlToken>());
}

} // namespace SsoClient
