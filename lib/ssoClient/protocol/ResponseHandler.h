#pragma once

#include "quillon/Reader.h"
#include "ssoClient/SoapFault.h"
#include "ssoClient/protocol/SPNegoResponse.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>

namespace SsoClient {

/**
 * Reads the replies of the token service. A SOAP fault becomes an exception; it is looked for
 * before anything else in the reply.
 *
 * Each operation may throw:
 * - `InvalidCredentialsException` for a fault that says so;
 * - `SsoException` for any other fault, and for a reply that is not built as expected.
 *
 * There is no virtual destructor: an object is only owned by a pointer of its own class.
 *
 * Thread safety: stateless; any number of threads.
 */
class ResponseHandler
{
public:
    /** Stores the issued assertion in `tokenXml`, so that its signature still verifies. */
    virtual void HandleAcquireTokenResponse(Quillon::Reader* body, std::string& tokenXml) const = 0;

    /** @return whether the service finds the token valid. */
    virtual bool HandleValidateSubjectResponse(Quillon::Reader* body) const = 0;

    /** Stores the renewed assertion in `tokenXml`, so that its signature still verifies. */
    virtual void HandleRenewTokenResponse(Quillon::Reader* body, std::string& tokenXml) const = 0;

    /** Replaces `response`, if the reply is good, by what the service answers to a leg. */
    virtual void HandleSPNegoResponse(Quillon::Reader* body, SPNegoResponse& response) const = 0;

    /** One that shows faults to `observer`, too, after whoever else is shown them. */
    virtual boost::shared_ptr<const ResponseHandler> ShowingFaultsTo(
        const FaultObserver& observer) const = 0;

protected:
    ~ResponseHandler() = default;
};

} // namespace SsoClient
