#pragma once

#include "ssoClient/NegotiationHandler.h"
#include "ssoClient/client/Call.h"
#include "ssoClient/client/LegDriver.h"

namespace SsoClient {

/**
 * Goes to and fro between handler and service, over one session, until there is a token. The
 * handler sees the service's last leg, too.
 *
 * @return the assertion as text, not verified yet.
 *
 * @throws Quillon::InvalidArgumentException  the handler returned null.
 * @throws CommunicationException             an answer without context id.
 */
std::string Negotiate(
    Call& call,
    const LegDriver& legs,
    TransportSession& session,
    const TokenSpec& spec,
    NegotiationHandler& handler);

} // namespace SsoClient
