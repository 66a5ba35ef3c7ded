#pragma once

#include "quillon/Exceptions.h"

namespace Quillon::Http {

/**
 * An HTTP exchange failed: the server cannot be reached, is not who it should be, refuses the
 * client's certificate, or its reply is not HTTP, not complete or too large. The text names the
 * server and the reason, never what was sent; it is English whatever the locale is.
 */
class QUILLON_API HttpException : public ExceptionOf<HttpException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~HttpException() override;
};

/** The reply was not complete in time. The text names the server and the limit. */
class QUILLON_API TimeoutException : public ExceptionOf<TimeoutException, HttpException>
{
public:
    using ExceptionOf::ExceptionOf;
    ~TimeoutException() override;
};

} // namespace Quillon::Http
