#pragma once

#include "quillon/Exceptions.h"
#include "ssoClient/SamlToken.h"

#include <boost/function.hpp>
#include <boost/optional.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include <future>
#include <memory>
#include <string>
#include <thread>

/** What a completion was told, kept beyond its call. */
template <class Result>
struct Told
{
    Result result;
    std::shared_ptr<Quillon::Exception> error;
    std::thread::id thread;

    std::string Describe() const
    {
        return error ? Quillon::GetClassName(*error) + ": " + error->what() : "success";
    }
};

/** A completion that can be waited for; a second call of it would throw. */
template <class Result>
class Awaited
{
public:
    boost::function<void(const Result&, const Quillon::Exception*)> GetCompletion()
    {
        return [promise = _promise](const Result& result, const Quillon::Exception* error) {
            promise->set_value(
                {result,
                 std::shared_ptr<Quillon::Exception>(error != nullptr ? error->Clone() : nullptr),
                 std::this_thread::get_id()});
        };
    }

    Told<Result> Get() { return _promise->get_future().get(); }

private:
    std::shared_ptr<std::promise<Told<Result>>> _promise =
        std::make_shared<std::promise<Told<Result>>>();
};

using AwaitedToken = Awaited<boost::shared_ptr<const SsoClient::SamlToken>>;
using AwaitedVerdict = Awaited<boost::optional<bool>>;
