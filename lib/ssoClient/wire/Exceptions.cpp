#include "ssoClient/Exceptions.h"

namespace SsoClient {

SsoException::~SsoException() = default;
InvalidTokenException::~InvalidTokenException() = default;
ParseException::~ParseException() = default;
InvalidSignatureException::~InvalidSignatureException() = default;
CommunicationException::~CommunicationException() = default;
InvalidCredentialsException::~InvalidCredentialsException() = default;
CancelledException::~CancelledException() = default;

} // namespace SsoClient
