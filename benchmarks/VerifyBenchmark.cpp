#include "VerifyBenchmark.h"

#include "Floor.h"
#include "TestData.h"
#include "XmlsecPeer.h"

#include "quillon/system/Clock.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClientRuntime/TokenVerifier.h"

#include <benchmark/benchmark.h>

namespace Benchmarks {

namespace {

/** A moment inside the validity of the tokens. */
class TokenClock final : public Quillon::System::Clock
{
public:
    Quillon::System::DateTime Now() const override
    {
        return Quillon::System::DateTime("2026-06-15T12:00:00Z");
    }
};

void BM_Own(
    benchmark::State& state,
    const std::string& xml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trusted)
{
    for (auto _ : state) {
        benchmark::DoNotOptimize(SsoClient::CreateSamlToken(xml, trusted));
    }
}

void BM_Remembered(
    benchmark::State& state,
    const std::string& xml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trusted)
{
    const auto verifier = SsoClient::CreateTokenVerifier(trusted);
    for (auto _ : state) {
        benchmark::DoNotOptimize(verifier->Verify(xml));
    }
}

void BM_Floor(benchmark::State& state, const std::string& xml, const VerifyFloor& floor)
{
    for (auto _ : state) {
        if (!floor.Run(xml)) {
            state.SkipWithError("The floor fails");
        }
    }
}

void BM_Xmlsec(benchmark::State& state, const std::string& xml, const XmlsecPeer& peer)
{
    for (auto _ : state) {
        if (!peer.Run(xml)) {
            state.SkipWithError("xmlsec1 refuses the token");
        }
    }
}

} // namespace

void RegisterVerifyBenchmarks()
{
    static const TokenClock Clock;
    static const VerifyFloor Floor;
    static const XmlsecPeer Peer(ReadFile("keys/sts-cert.pem"));
    static const auto Trusted =
        Quillon::Crypto::ParsePemCertificates(ReadFile("keys/sts-cert.pem"));
    Quillon::System::ReplaceClock(&Clock);
    for (const char* size : {"4k", "8k", "100k"}) {
        const std::string xml = ReadFile(std::string("tokens/accepted/bearer-") + size + ".xml");
        const std::string name = std::string("Verify/") + size;
        benchmark::RegisterBenchmark(("Floor/" + name).c_str(), [xml](benchmark::State& state) {
            BM_Floor(state, xml, Floor);
        });
        benchmark::RegisterBenchmark(("Own/" + name).c_str(), [xml](benchmark::State& state) {
            BM_Own(state, xml, Trusted);
        });
        benchmark::RegisterBenchmark(("xmlsec1/" + name).c_str(), [xml](benchmark::State& state) {
            BM_Xmlsec(state, xml, Peer);
        });
        // Of these two the ratio says how much is saved.
        const std::string again = std::string("VerifyAgain/") + size;
        benchmark::RegisterBenchmark(("Floor/" + again).c_str(), [xml](benchmark::State& state) {
            BM_Own(state, xml, Trusted);
        });
        benchmark::RegisterBenchmark(("Own/" + again).c_str(), [xml](benchmark::State& state) {
            BM_Remembered(state, xml, Trusted);
        });
    }
}

} // namespace Benchmarks
