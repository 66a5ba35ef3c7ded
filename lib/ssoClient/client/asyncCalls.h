#pragma once

#include "quillon/Exceptions.h"
#include "quillon/Functor.h"
#include "quillon/system/ThreadPool.h"
#include "ssoClient/SamlToken.h"

#include <boost/bind/bind.hpp>
#include <boost/function.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

/** How a blocking operation becomes an asynchronous one. */
namespace SsoClient {

/** A blocking operation with its arguments. */
using TokenCall = boost::function<boost::shared_ptr<const SamlToken>()>;
using ValidationCall = boost::function<bool()>;

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
