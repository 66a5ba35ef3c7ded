#pragma once

#include <stdexcept>
#include <string>

namespace DevSts {

struct FaultCode
{
    const char* prefix;
    const char* ns;
    const char* local;
};

namespace FaultCodes {

extern const FaultCode Client;               ///< [SOAP11 4.4.1] not a message that can be read
extern const FaultCode Server;               ///< [SOAP11 4.4.1] this STS itself is out of order
extern const FaultCode InvalidRequest;       ///< [WST13 11] malformed or not allowed
extern const FaultCode RequestFailed;        ///< [WST13 11] not now
extern const FaultCode FailedAuthentication; ///< [WST13 11]
extern const FaultCode InvalidSecurityToken; ///< [WST13 11] the presented token
extern const FaultCode ExpiredData;          ///< [WST13 11] the message is not fresh
extern const FaultCode InvalidTimeRange;     ///< [WST13 11] the lifetime asked for
extern const FaultCode InvalidScope;         ///< [WST13 11] the audience asked for
extern const FaultCode UnableToRenew;        ///< [WST13 11]
extern const FaultCode FailedCheck;          ///< [WSS11 12] the signature of the message

} // namespace FaultCodes

/** Ends the request; the text goes to the client as faultstring. */
class Fault : public std::runtime_error
{
public:
    Fault(const FaultCode& code, const std::string& text)
        : std::runtime_error(text)
        , _code(&code)
    {}

    const FaultCode& Code() const { return *_code; }

private:
    const FaultCode* _code;
};

/** The SOAP 1.1 envelope that reports `fault`. */
std::string WriteFault(const Fault& fault);

} // namespace DevSts
