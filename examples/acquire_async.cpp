// Usage: acquire_async URL CA_PEM STS_PEM USER..., with a line for each password on standard input
#include "ssoClient/Descriptions.h"
#include "ssoClient/SecurityTokenService.h"

#include <future>
#include <iostream>
#include <memory>
#include <utility>
#include <vector>

using Token = boost::shared_ptr<const SsoClient::SamlToken>;

static std::future<Token> Begin(
    const SsoClient::SecurityTokenService& service, const char* user, const std::string& password)
{
    // Whatever becomes of the completion, nobody waits for ever: if it goes without having been
    // called, the promise is broken.
    const auto promise = std::make_shared<std::promise<Token>>();
    std::future<Token> future = promise->get_future();
    service.AcquireTokenAsync(
        user, password, {}, [promise](const Token& token, const Quillon::Exception* error) {
            // This is a thread of the pool, and the error is gone when the completion returns.
            if (error == nullptr) {
                promise->set_value(token);
                return;
            }
            try {
                error->Throw();
            } catch (...) {
                promise->set_exception(std::current_exception());
            }
        });
    return future;
}

static bool Show(const char* user, std::future<Token> future)
try {
    const Token token = future.get();
    std::cout << user << ": " << (token ? CreateRedactedDescription(*token) : "no token") << "\n";
    return token != nullptr;
} catch (const Quillon::Exception& error) {
    std::cout << user << ": " << Quillon::GetClassName(error) << ": " << error.what() << "\n";
    return false;
}

int main(int argc, char** argv)
try {
    if (argc < 5) {
        return 2;
    }
    const auto sslContext = Quillon::Ssl::LoadSSLContext(argv[2]); // who vouches for servers
    SsoClient::SecurityTokenServiceConfig config;
    config.url = argv[1];
    config.trustedCertificates = Quillon::Crypto::LoadPemCertificates(argv[3]); // who signs
    config.sslContext = sslContext.get();
    const auto service = CreateSecurityTokenService(config);

    std::vector<std::pair<const char*, std::future<Token>>> acquisitions;
    for (int index = 4; index < argc; ++index) {
        std::string password;
        std::getline(std::cin, password);
        acquisitions.emplace_back(argv[index], Begin(*service, argv[index], password));
    }
    bool isDone = true;
    for (auto& [user, future] : acquisitions) {
        isDone = Show(user, std::move(future)) && isDone;
    }
    return isDone ? 0 : 1;
} catch (const std::exception& error) {
    std::cerr << Quillon::GetClassName(error) << ": " << error.what() << "\n";
    return 1;
}
