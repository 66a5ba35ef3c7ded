// Starts the threads of the library: those of the pool and those of the HTTP client.

#include "ssoClient/SecurityTokenService.h"

#include <future>
#include <iostream>

extern "C" __attribute__((visibility("default"))) void StartThreads()
{
    SsoClient::SecurityTokenServiceConfig config;
    config.url = "http://127.0.0.1:1/sts"; // nobody listens there
    std::promise<std::string> outcome;
    SsoClient::CreateSecurityTokenService(config)->AcquireTokenAsync(
        "alice", "secret", {}, [&outcome](const auto&, const Quillon::Exception* error) {
            outcome.set_value(error != nullptr ? Quillon::GetClassName(*error) : "a token");
        });
    std::cout << outcome.get_future().get() << "\n";
}
