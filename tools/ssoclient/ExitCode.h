#pragma once

#include "quillon/Exceptions.h"

#include <exception>
#include <string>

/** What the process ends with; scripts depend on the numbers. */
enum class ExitCode : int
{
    DONE = 0,
    REFUSED = 1, ///< the token or the service's answer is not acceptable, or the service refuses
    USAGE = 2,   ///< the command line, an argument, or a file that cannot be used
    BAD_CREDENTIALS = 3, ///< the service or Kerberos does not take them
    COMMUNICATION = 4,
    OUT_OF_VALIDITY = 5 ///< the token has expired, or is not valid yet
};

/** All of them with what they mean, for the help. */
std::string DescribeExitCodes();

/** The command line or a file that it names cannot be used. */
class UsageError : public Quillon::ExceptionOf<UsageError, Quillon::Exception>
{
public:
    using ExceptionOf::ExceptionOf;
};

/** Throws a `UsageError` that says what could not be done and the reason that `errno` tells. */
[[noreturn]] void ThrowSystemError(const std::string& what);

/** The exit code that tells a script what kind of failure `error` is. */
ExitCode GetExitCode(const std::exception& error);
