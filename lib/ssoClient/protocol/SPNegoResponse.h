#pragma once

#include "ssoClient/Leg.h"

#include <string>

namespace SsoClient {

/** What the service answers to one leg of a negotiation. */
struct SPNegoResponse
{
    std::string contextId; ///< names the negotiation; to be sent back with the next leg
    Leg leg;               ///< empty if the service sent none
    std::string token;     ///< the issued assertion as text; empty while the negotiation goes on
};

} // namespace SsoClient
