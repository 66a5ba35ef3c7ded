#include "ssoClientRuntime/Exceptions.h"

#include "ssoClientRuntime/attempts.h"

namespace SsoClient {

namespace {

std::string Describe(const TokenOutage& outage)
{
    if (outage.reason == nullptr) {
        return "There is no token yet";
    }
    std::string text = "There is no token";
    if (outage.since) {
        text = "There is no token; attempts have failed since " + outage.since->ToString();
    }
    if (outage.nextAttempt) {
        text += ", the next one is at " + outage.nextAttempt->ToString();
    }
    return text + ": " + DescribeFailure(*outage.reason);
}

} // namespace

NoTokenException::NoTokenException(const TokenOutage& outage)
    : ExceptionOf(Describe(outage))
    , _outage(outage)
{}

NoTokenException::~NoTokenException() = default;

} // namespace SsoClient
