#include "ssoClient/NegotiationHandler.h"

namespace SsoClient {

NegotiationHandler::~NegotiationHandler() = default;

} // namespace SsoClient
