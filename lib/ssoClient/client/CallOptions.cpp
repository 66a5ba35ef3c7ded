#include "ssoClient/CallOptions.h"

#include "ssoClient/client/CallControl.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
#include "ssoClient/client/cancelling.h"

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

[[noreturn]] void Refuse(const std::string& what, long long microseconds, const char* rule)
{
    throw Quillon::InvalidArgumentException(
        what + " of " + std::to_string(microseconds) + " microseconds is " + rule + ".");
}

void RequireNotNegative(const std::string& what, long long microseconds)
{
    if (microseconds < 0) {
        Refuse(what, microseconds, "negative");
    }
}

} // namespace

const CallEnvironment& GetCallEnvironment()
{
    static const ProcessEnvironment environment;
    return environment;
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
    RequireNotNegative("The deadline", options.deadlineMicroseconds);
    RequireNotNegative("The first delay of retries", options.retry.firstDelayMicroseconds);
    RequireNotNegative("The longest delay of retries", options.retry.longestDelayMicroseconds);
    if (options.retry.attempts == 0) {
        throw Quillon::InvalidArgumentException("There are no attempts: 1 is one without retries.");
    }
    if (options.connectionReuse && options.connectionReuse->idleMicroseconds <= 0) {
        Refuse(
            "The idle limit of connections",
            options.connectionReuse->idleMicroseconds,
            "not positive");
    }
}

boost::shared_ptr<SecurityTokenService> WithOptions(
    const boost::shared_ptr<const SecurityTokenService>& service, const CallOptions& options)
{
    const auto* const ours = dynamic_cast<const SecurityTokenServiceImpl*>(service.get());
    if (ours == nullptr) {
        throw Quillon::InvalidArgumentException(
            service == nullptr ? "There is no service."
                               : "The service is not one that this library made.");
    }
    RequireValid(options);
    CallControl control;
    control.options = options;
    return ours->UnderControl(control);
}

} // namespace SsoClient
