#include "ssoClient/wire/wireNames.h"

namespace SsoClient::Wire {

const char RsaNamespace[] = SSOCLIENT_RSA_AUTHORITY "/names/2009/12/std-ext/SAML2.0";
const char RsaAdviceNamespace[] =
    SSOCLIENT_RSA_AUTHORITY "/names/2009/12/std-ext/WS-Trust1.4/advice";
const char GroupIdentityAttribute[] =
    SSOCLIENT_RSA_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity";
const char UpnClaim[] = SSOCLIENT_CLAIMS_AUTHORITY "/claims/UPN";
const char GivenNameClaim[] = SSOCLIENT_CLAIMS_AUTHORITY "/ws/2005/05/identity/claims/givenname";
const char SurnameClaim[] = SSOCLIENT_CLAIMS_AUTHORITY "/ws/2005/05/identity/claims/surname";
const char IsSolutionAttribute[] =
    SSOCLIENT_ISSUER_AUTHORITY "/schemas/attr-names/2011/07/isSolution";

} // namespace SsoClient::Wire
