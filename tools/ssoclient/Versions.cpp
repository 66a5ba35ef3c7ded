#include "Versions.h"

#include "quillon/LibraryVersions.h"
#include "ssoClientGss/KerberosVersion.h"

std::string DescribeVersions()
{
    std::string text = SSOCLIENT_VERSION "\n";
    for (const Quillon::LibraryVersion& library : Quillon::GetLibraryVersions()) {
        text += (text.back() == '\n' ? "" : ", ") + library.name + " " + library.version;
    }
    return text + "; built with MIT Kerberos " + SsoClient::Gss::GetKerberosBuildVersion();
}
