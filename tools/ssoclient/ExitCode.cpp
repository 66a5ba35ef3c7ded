#include "ExitCode.h"

#include "quillon/http/HttpException.h"
#include "ssoClient/Exceptions.h"
#include "ssoClientGss/Exceptions.h"

#include <cerrno>
#include <string_view>
#include <system_error>

namespace {

template <class... Classes>
bool IsOneOf(const std::exception& error)
{
    return ((dynamic_cast<const Classes*>(&error) != nullptr) || ...);
}

/**
 * The user's own token is meant. One that the service has just sent is an `SsoException`: another
 * attempt would not mend it.
 */
bool IsOutOfValidity(const std::exception& error)
{
    const std::string_view text = error.what();
    return IsOneOf<SsoClient::ParseException>(error)
           && (text.rfind("The token has expired at: ", 0) == 0
               || text.rfind("Token start date is in the future: ", 0) == 0);
}

} // namespace

std::string DescribeExitCodes()
{
    return "0 done; 1 the token is refused or invalid, or the service refuses; 2 usage, or a file "
           "that cannot be used; 3 bad credentials, or Kerberos fails; 4 communication; 5 the "
           "token "
           "has expired or is not valid yet.";
}

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
    return IsOutOfValidity(error) ? ExitCode::OUT_OF_VALIDITY : ExitCode::REFUSED;
}
