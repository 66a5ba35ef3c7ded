#pragma once

#include "quillon/system/DateTime.h"
#include "ssoClient/PrincipalId.h"

namespace SsoClient {

/** One link of a token's delegation chain. */
struct Delegate
{
    PrincipalId subject;                      ///< the delegate
    Quillon::System::DateTime delegationDate; ///< when the delegation took place
};

} // namespace SsoClient
