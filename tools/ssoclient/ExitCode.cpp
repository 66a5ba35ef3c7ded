#include "ExitCode.h"

#include "OneLine.h"

#include "quillon/http/Exceptions.h"
#include "ssoClient/Exceptions.h"

#include <iostream>

namespace {

template <class... Classes>
bool IsOneOf(const std::exception& error)
{
    return ((dynamic_cast<const Classes*>(&error) != nullptr) || ...);
}

} // namespace

ExitCode GetExitCode(const std::exception& error)
{
    if (IsOneOf<
            UsageError,
            Quillon::InvalidArgumentException,
            Quillon::InvalidStateException>(error)) {
        return ExitCode::USAGE;
    }
    if (IsOneOf<SsoClient::InvalidCredentialsException>(error)) {
        return ExitCode::BAD_CREDENTIALS;
    }
    if (IsOneOf<SsoClient::CommunicationException, Quillon::Http::HttpException>(error)) {
        return ExitCode::COMMUNICATION;
    }
    return ExitCode::REFUSED;
}

void ReportFailure(const std::string& className, const std::string& message)
{
    std::cerr << ToOneLine("ssoclient: " + className + ": " + message) + "\n" << std::flush;
}
