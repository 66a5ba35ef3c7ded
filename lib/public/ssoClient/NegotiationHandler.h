#pragma once

#include "ssoClient/Export.h"
#include "ssoClient/Leg.h"

#include <boost/smart_ptr/shared_ptr.hpp>

namespace SsoClient {

/**
 * The caller's side of a SPNEGO negotiation [RFC 4178] with the token service. One object serves
 * one negotiation. `Gss::CreateKerberosNegotiationHandler` makes one for Kerberos.
 *
 * What the operation throws leaves the acquisition unchanged. It is the handler that bounds a
 * negotiation: it goes on for as long as the service asks for legs and the handler returns them.
 *
 * Thread safety: called by the thread that runs the acquisition, one call at a time.
 */
class SSOCLIENT_API NegotiationHandler
{
public:
    virtual ~NegotiationHandler();

    /**
     * Makes the next leg for the service.
     *
     * @param serverLeg  what the service sent; empty at the start.
     * @return the leg to send. Null is an error; an empty leg stops the process, unless the token
     *         has arrived: then `serverLeg` was the last one, and what is returned is not sent.
     */
    virtual boost::shared_ptr<Leg> Negotiate(const Leg& serverLeg) = 0;
};

} // namespace SsoClient
