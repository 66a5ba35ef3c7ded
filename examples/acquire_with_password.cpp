// Usage: acquire_with_password URL CA_PEM STS_PEM USER, with the password on standard input
#include "ssoClient/Descriptions.h"
#include "ssoClient/SecurityTokenService.h"

#include <iostream>

int main(int argc, char** argv)
try {
    if (argc != 5) {
        return 2;
    }
    const auto sslContext = Quillon::Ssl::LoadSSLContext(argv[2]); // who vouches for servers
    SsoClient::SecurityTokenServiceConfig config;
    config.url = argv[1];
    config.trustedCertificates = Quillon::Crypto::LoadPemCertificates(argv[3]); // who signs
    config.sslContext = sslContext.get();
    std::string password;
    std::getline(std::cin, password);
    const auto token = CreateSecurityTokenService(config)->AcquireToken(argv[4], password, {});
    std::cout << (token ? CreateRedactedDescription(*token) : "no token") << "\n";
    return token ? 0 : 1;
} catch (const Quillon::Exception& error) {
    std::cerr << Quillon::GetClassName(error) << ": " << error.what() << "\n";
    return 1;
}
