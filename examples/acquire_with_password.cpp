// Usage: acquire_with_password URL CA_PEM STS_PEM USER, with the password on standard input
#include "ssoClient/Descriptions.h"
#include "ssoClient/SecurityTokenService.h"

#include <fstream>
#include <iostream>
#include <iterator>

static auto ReadCertificates(const char* file)
{
    std::ifstream pem(file);
    return Quillon::Crypto::ParsePemCertificates(std::string(std::istreambuf_iterator(pem), {}));
}

int main(int argc, char** argv)
try {
    if (argc != 5) {
        return 2;
    }
    Quillon::Ssl::SSLContextOptions tls;
    tls.useSystemAuthorities = false;
    tls.authorities = ReadCertificates(argv[2]);
    const auto sslContext = Quillon::Ssl::CreateSSLContext(tls);
    SsoClient::SecurityTokenServiceConfig config;
    config.url = argv[1];
    config.trustedCertificates = ReadCertificates(argv[3]); // who may sign tokens
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
