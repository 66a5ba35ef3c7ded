// Usage: keep_token URL CA_PEM STS_PEM USER PASSWORD_FILE; each line on standard input is a request
#include "ssoClient/Descriptions.h"
#include "ssoClientRuntime/TokenSource.h"

#include <fstream>
#include <iostream>

// Asked each time, so that the file may change while the process runs.
static SsoClient::PasswordCredentials ReadPassword(const char* user, const char* path)
{
    std::ifstream file(path);
    std::string password;
    std::getline(file, password);
    SsoClient::PasswordCredentials credentials(user, password);
    Quillon::Wipe(password);
    return credentials;
}

static void Report(const SsoClient::TokenSourceStatus& status)
{
    if (status.outage.reason) {
        std::cerr << "no new token: " << status.outage.reason->what() << "\n";
    } else {
        std::cerr << "a token, good until " << status.goodUntil.ToString() << "\n";
    }
}

static void Serve(SsoClient::TokenSource& source)
try {
    std::cout << CreateRedactedDescription(*source.GetToken()) << "\n"; // only the first call waits
} catch (const SsoClient::NoTokenException& error) {
    std::cout << error.what() << "\n";
}

int main(int argc, char** argv)
try {
    if (argc != 6) {
        return 2;
    }
    const auto sslContext = Quillon::Ssl::LoadSSLContext(argv[2]); // who vouches for servers
    SsoClient::SecurityTokenServiceConfig config;
    config.url = argv[1];
    config.trustedCertificates = Quillon::Crypto::LoadPemCertificates(argv[3]); // who signs
    config.sslContext = sslContext.get();

    SsoClient::TokenSourceOptions options;
    options.observer = Report;
    const auto source = CreatePasswordTokenSource(
        CreateSecurityTokenService(config),
        [user = argv[4], path = argv[5]] { return ReadPassword(user, path); },
        {},
        options);
    for (std::string request; std::getline(std::cin, request);) {
        Serve(*source);
    }
    return 0;
} catch (const Quillon::Exception& error) {
    std::cerr << Quillon::GetClassName(error) << ": " << error.what() << "\n";
    return 1;
}
