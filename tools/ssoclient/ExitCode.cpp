#include "ExitCode.h"

#include "OneLine.h"

#include "quillon/http/HttpException.h"
#include "ssoClient/Exceptions.h"
#include "ssoClientGss/Exceptions.h"

#include <cerrno>
#include <iostream>
#include <system_error>

namespace {

template <class... Classes>
bool IsOneOf(const std::exception& error)
{
    return ((dynamic_cast<const Classes*>(&error) != nullptr) || ...);
}

} // namespace

void ThrowSystemError(const std::string& what)
{
    throw UsageError(what + ": " + std::system_category().message(errno));
}

ExitCode GetExitCode(const std::exception& error)
{
    if (IsOneOf<UsageError, Quillon::InvalidArgumentException, Quillon::InvalidStateException>(
            error)) {
        return ExitCode::USAGE;
    }
    if (IsOneOf<SsoClient::InvalidCredentialsException, SsoClient::Gss::NegotiationException>(
            error)) {
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
