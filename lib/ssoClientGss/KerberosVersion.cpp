#include "ssoClientGss/KerberosVersion.h"

namespace SsoClient::Gss {

std::string GetKerberosBuildVersion()
{
    return SSOCLIENT_KERBEROS_VERSION;
}

} // namespace SsoClient::Gss
