#pragma once

#include "ssoClientGss/Export.h"

#include <string>

namespace SsoClient::Gss {

/**
 * The version of MIT Kerberos that this library was built with, for example "1.20.1". Kerberos does
 * not tell which version a process has loaded.
 */
SSOCLIENT_GSS_API std::string GetKerberosBuildVersion();

} // namespace SsoClient::Gss
