#pragma once

#include "quillon/Wiped.h"
#include "ssoClient/ServiceDialect.h"

#include <string>
#include <utility>

namespace SsoClient {

/**
 * A SOAP request that is ready to be sent. The body may carry a password, so it is overwritten
 * before its memory goes back; the memory of intermediate copies is out of its reach.
 */
struct Request
{
    std::string soapAction; ///< the action URI, without quotes
    std::string body;       ///< the whole envelope as XML text
    SoapVersion soap = SoapVersion::SOAP_1_1;

    Request() = default;
    Request(const Request&) = default;
    Request(Request&&) noexcept = default;
    ~Request() { Quillon::Wipe(body); }

    /** By value: the old body goes with `other` and is overwritten there. */
    Request& operator=(Request other) noexcept
    {
        std::swap(soapAction, other.soapAction);
        std::swap(body, other.body);
        std::swap(soap, other.soap);
        return *this;
    }
};

} // namespace SsoClient
