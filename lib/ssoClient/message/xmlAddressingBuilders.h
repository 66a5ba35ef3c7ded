#pragma once

#include "ssoClient/message/xmlCommonBuilders.h"

#include <string>
#include <vector>

namespace SsoClient {

/**
 * The message addressing properties of a request as SOAP headers [WSA-CORE 3.2]: Action, a
 * MessageID that every build makes anew, ReplyTo for an answer over the same connection, and To.
 * Each declares `wsa`.
 *
 * @param to  the URL of the service.
 */
std::vector<XMLBuilderPtr> WsaHeaderBuilders(const std::string& action, const std::string& to);

} // namespace SsoClient
