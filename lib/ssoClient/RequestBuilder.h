#pragma once

#include "ssoClient/Request.h"
#include "ssoClient/TokenSpec.h"

#include <string>

namespace SsoClient {

/**
 * Turns one operation of the token service into the request to be sent. A failure may leave the
 * request's SOAP action set, but never its body.
 *
 * There is no virtual destructor: an object is only owned by a pointer of its own class.
 *
 * Thread safety: immutable; any number of threads.
 */
class RequestBuilder
{
public:
    virtual void BuildUserPassTokenRequest(
        const std::string& userName,
        const std::string& password,
        const TokenSpec& spec,
        Request& request) const = 0;

protected:
    ~RequestBuilder() = default;
};

} // namespace SsoClient
