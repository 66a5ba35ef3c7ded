#include "ssoClient/CallOptions.h"

#include "ssoClient/client/CallControl.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
#include "ssoClient/client/cancelling.h"

#include <algorithm>
#include <chrono>
#include <random>

namespace SsoClient {

namespace {

class ProcessEnvironment final : public CallEnvironment
{
public:
    long long Now() const override
    {
        const auto now = std::chrono::steady_clock::now().time_since_epoch();
        return std::chrono::duration_cast<std::chrono::microseconds>(now).count();
    }

    bool Wait(const CancellationToken& token, long long microseconds) const override
    {
        return CancellationWatch::Wait(token, microseconds);
    }

    double Draw() const override
    {
        thread_local std::minstd_rand engine{std::random_device{}()};
        return std::uniform_real_distribution<double>(0, 1)(engine);
    }
};

/** Longer than any process lives; clocks can be added to it. */
constexpr long long LongestMicroseconds = 1'000'000'000'000'000;

void BoundTime(long long& microseconds)
{
    microseconds = std::min(microseconds, LongestMicroseconds);
}

void RequireNotNegative(const std::string& what, long long microseconds)
{
    if (microseconds < 0) {
        throw Quillon::InvalidArgumentException(
            what + std::to_string(microseconds) + " microseconds is negative.");
    }
}

} // namespace

const CallEnvironment& GetCallEnvironment()
{
    static const ProcessEnvironment environment;
    return environment;
}

CallOptions Bound(const CallOptions& options)
{
    CallOptions bounded = options;
    BoundTime(bounded.deadlineMicroseconds);
    BoundTime(bounded.retry.firstDelayMicroseconds);
    BoundTime(bounded.retry.longestDelayMicroseconds);
    if (bounded.connectionReuse) {
        BoundTime(bounded.connectionReuse->idleMicroseconds);
    }
    return bounded;
}

CallControl CallControl::Started() const
{
    CallControl started = *this;
    if (options.deadlineMicroseconds > 0 && !deadline) {
        started.deadline = environment->Now() + options.deadlineMicroseconds;
    }
    return started;
}

void RequireValid(const CallOptions& options)
{
    RequireNotNegative("The deadline of ", options.deadlineMicroseconds);
    RequireNotNegative("The first delay of retries of ", options.retry.firstDelayMicroseconds);
    RequireNotNegative("The longest delay of retries of ", options.retry.longestDelayMicroseconds);
    if (options.retry.attempts == 0) {
        throw Quillon::InvalidArgumentException("There are no attempts: 1 is one without retries.");
    }
    if (options.connectionReuse && options.connectionReuse->idleMicroseconds <= 0) {
        throw Quillon::InvalidArgumentException(
            "The idle limit of connections of "
            + std::to_string(options.connectionReuse->idleMicroseconds)
            + " microseconds is not positive.");
    }
}

boost::shared_ptr<SecurityTokenService> WithOptions(
    const boost::shared_ptr<const SecurityTokenService>& service, const CallOptions& options)
{
    const SecurityTokenServiceImpl& own = RequireOwn(service);
    RequireValid(options);
    CallControl control;
    control.options = Bound(options);
    return own.UnderControl(control);
}

} // namespace SsoClient
