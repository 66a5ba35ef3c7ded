#pragma once

#include "ssoClient/SamlToken.h"
#include "ssoClient/TokenSpec.h"

#include <string>

namespace SsoClient {

/**
 * One line for logs: who the token is for, its validity and its flags; never its XML, ID,
 * audience, advice or certificate.
 */
SSOCLIENT_API std::string CreateRedactedDescription(const SamlToken& token);

} // namespace SsoClient
