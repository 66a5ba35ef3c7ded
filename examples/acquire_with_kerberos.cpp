// Usage: acquire_with_kerberos URL CA_PEM STS_PEM [KEYTAB PRINCIPAL], or else after kinit
#include "ssoClient/Descriptions.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClientGss/KerberosNegotiationHandler.h"

#include <iostream>

int main(int argc, char** argv)
try {
    if (argc != 4 && argc != 6) {
        return 2;
    }
    const auto sslContext = Quillon::Ssl::LoadSSLContext(argv[2]); // who vouches for servers
    SsoClient::SecurityTokenServiceConfig config;
    config.url = argv[1];
    config.trustedCertificates = Quillon::Crypto::LoadPemCertificates(argv[3]); // who signs
    config.sslContext = sslContext.get();

    SsoClient::Gss::KerberosOptions kerberos;
    kerberos.url = config.url; // the service is HTTP@ and its host
    if (argc == 6) {
        kerberos.keytab = argv[4];
        kerberos.principal = argv[5];
    }
    const auto handler = CreateKerberosNegotiationHandler(kerberos);
    const auto token = CreateSecurityTokenService(config)->AcquireTokenByGSS({}, *handler);
    std::cout << (token ? CreateRedactedDescription(*token) : "no token") << "\n";
    return token ? 0 : 1;
} catch (const Quillon::Exception& error) {
    std::cerr << Quillon::GetClassName(error) << ": " << error.what() << "\n";
    return 1;
}
