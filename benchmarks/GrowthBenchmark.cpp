#include "GrowthBenchmark.h"

#include "Floor.h"
#include "TestData.h"
#include "Tokens.h"
#include "XmlsecPeer.h"

#include "ssoClient/CreateSamlToken.h"

#include <benchmark/benchmark.h>

#include <map>
#include <utility>

namespace Benchmarks {

namespace {

constexpr std::size_t Sizes[] = {4'096, 16'384, 65'536, 262'144, 1'048'576, 4'194'304, 8'300'000};

/** Beyond it libxml2 wants to be told that the text may be huge, which no peer's user does. */
constexpr std::size_t LargestOfPeer = 4'194'304;

const std::string& GetToken(Bulk bulk, std::size_t size)
{
    static std::map<std::pair<Bulk, std::size_t>, std::string> tokens;
    std::string& token = tokens[{bulk, size}];
    if (token.empty()) {
        token = MakeToken(bulk, size);
    }
    return token;
}

/** @param run  says whether it went well. */
template <class Operation>
void Measure(benchmark::State& state, Bulk bulk, std::size_t size, const Operation& run)
{
    const std::string& token = GetToken(bulk, size);
    for (auto _ : state) {
        if (!run(token)) {
            state.SkipWithError("The token is refused");
        }
    }
    state.counters["octets"] = static_cast<double>(token.size());
}

template <class Operation>
void Register(const char* who, Bulk bulk, std::size_t size, const Operation& run)
{
    const std::string name =
        std::string(who) + "/Growth/" + ToString(bulk) + "/" + std::to_string(size);
    benchmark::RegisterBenchmark(
        name.c_str(), [=](benchmark::State& state) { Measure(state, bulk, size, run); });
}

} // namespace

void RegisterGrowthBenchmarks()
{
    static const VerifyFloor floor;
    static const XmlsecPeer peer(ReadFile("keys/sts-cert.pem"));
    static const auto trusted =
        Quillon::Crypto::ParsePemCertificates(ReadFile("keys/sts-cert.pem"));
    for (const Bulk bulk :
         {Bulk::GROUPS, Bulk::ATTRIBUTES, Bulk::NAMESPACES, Bulk::TEXT, Bulk::COMMENTS}) {
        for (const std::size_t size : Sizes) {
            Register("Own", bulk, size, [](const std::string& token) {
                return SsoClient::CreateSamlToken(token, trusted) != nullptr;
            });
            if (bulk == Bulk::GROUPS && size <= LargestOfPeer) {
                Register(
                    "Floor", bulk, size, [](const std::string& token) { return floor.Run(token); });
                Register("xmlsec1", bulk, size, [](const std::string& token) {
                    return peer.Run(token);
                });
            }
        }
    }
}

} // namespace Benchmarks
