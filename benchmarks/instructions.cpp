// What instructions.py counts the instructions of: one operation a number of times, named by the
// first argument; the second is the number.

#include "TestData.h"

#include "quillon/system/Clock.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"

#include <cstdlib>
#include <functional>
#include <iostream>
#include <map>
#include <string>

namespace {

using Operation = std::function<void()>;

class TokenClock final : public Quillon::System::Clock
{
public:
    Quillon::System::DateTime Now() const override
    {
        return Quillon::System::DateTime("2026-06-15T12:00:00Z");
    }
};

Operation Verify(const std::string& size)
{
    const auto trusted =
        Quillon::Crypto::ParsePemCertificates(Benchmarks::ReadFile("keys/sts-cert.pem"));
    const std::string xml = Benchmarks::ReadFile("tokens/accepted/bearer-" + size + ".xml");
    return [=] { SsoClient::CreateSamlToken(xml, trusted); };
}

Operation Sign()
{
    const auto key = Quillon::Crypto::CreatePrivateKey(Benchmarks::ReadFile("keys/client-key.pem"));
    const auto certificate =
        Quillon::Crypto::ParsePemCertificates(Benchmarks::ReadFile("keys/client-cert.pem")).front();
    return [=] {
        const SsoClient::RequestBuilderImpl builder(SsoClient::HolderOfKeyConfig{key, certificate});
        SsoClient::TokenSpec spec;
        spec.tokenLifetimeSec = 300;
        SsoClient::Request request;
        builder.BuildCertificateTokenRequest(spec, request);
    };
}

} // namespace

int main(int argc, char** argv)
{
    static const TokenClock clock;
    Quillon::System::ReplaceClock(&clock);
    const std::map<std::string, std::function<Operation()>> operations{
        {"verify-4k", [] { return Verify("4k"); }},
        {"verify-8k", [] { return Verify("8k"); }},
        {"verify-100k", [] { return Verify("100k"); }},
        {"sign", [] { return Sign(); }}};
    const auto found = argc == 3 ? operations.find(argv[1]) : operations.end();
    if (found == operations.end()) {
        std::cerr << "usage: benchmarks-instructions OPERATION COUNT\n";
        return 2;
    }
    const Operation run = found->second();
    for (int count = std::atoi(argv[2]); count > 0; --count) {
        run();
    }
    return 0;
}
