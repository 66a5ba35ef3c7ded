#include "ssoClientGss/Exceptions.h"

namespace SsoClient::Gss {

NegotiationException::~NegotiationException() = default;

} // namespace SsoClient::Gss
