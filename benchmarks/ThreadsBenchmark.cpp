#include "ThreadsBenchmark.h"

#include "TestData.h"

#include "ssoClient/CreateSamlToken.h"

#include <benchmark/benchmark.h>

#include <thread>

namespace Benchmarks {

namespace {

/** So many that starting a thread takes nothing beside them: about ten milliseconds. */
constexpr int TokensOfAThread = 250;

void VerifyMany(int count)
{
    static const std::string xml = ReadFile("tokens/accepted/bearer-4k.xml");
    static const auto trusted =
        Quillon::Crypto::ParsePemCertificates(ReadFile("keys/sts-cert.pem"));
    for (int i = 0; i < count; ++i) {
        benchmark::DoNotOptimize(SsoClient::CreateSamlToken(xml, trusted));
    }
}

void MeasureOneThread(benchmark::State& state)
{
    for (auto _ : state) {
        VerifyMany(2 * TokensOfAThread);
    }
}

void MeasureTwoThreads(benchmark::State& state)
{
    for (auto _ : state) {
        std::thread other([] { VerifyMany(TokensOfAThread); });
        VerifyMany(TokensOfAThread);
        other.join();
    }
}

} // namespace

void RegisterThreadsBenchmarks()
{
    benchmark::RegisterBenchmark("Floor/Verify500/4k, two threads", MeasureOneThread)
        ->UseRealTime();
    benchmark::RegisterBenchmark("Own/Verify500/4k, two threads", MeasureTwoThreads)->UseRealTime();
}

} // namespace Benchmarks
