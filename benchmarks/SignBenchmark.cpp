#include "SignBenchmark.h"

#include "Floor.h"
#include "TestData.h"

#include "ssoClient/protocol/RequestBuilderImpl.h"

#include <benchmark/benchmark.h>

namespace Benchmarks {

namespace {

SsoClient::HolderOfKeyConfig MakeIdentity()
{
    return {
        Quillon::Crypto::CreatePrivateKey(ReadFile("keys/client-key.pem")),
        Quillon::Crypto::ParsePemCertificates(ReadFile("keys/client-cert.pem")).front()};
}

void MeasureOwn(benchmark::State& state, const SsoClient::RequestBuilderImpl& builder)
{
    SsoClient::TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    for (auto _ : state) {
        SsoClient::Request request;
        builder.BuildCertificateTokenRequest(spec, request);
        benchmark::DoNotOptimize(request.body.data());
    }
}

void MeasureFloor(benchmark::State& state, const SignFloor& floor)
{
    for (auto _ : state) {
        if (!floor.Run()) {
            state.SkipWithError("The floor fails");
        }
    }
}

} // namespace

void RegisterSignBenchmarks()
{
    static const SignFloor floor(ReadFile("keys/client-key.pem"));
    static const SsoClient::RequestBuilderImpl builder(MakeIdentity());
    benchmark::RegisterBenchmark(
        "Floor/Sign/certificate", [](benchmark::State& state) { MeasureFloor(state, floor); });
    benchmark::RegisterBenchmark(
        "Own/Sign/certificate", [](benchmark::State& state) { MeasureOwn(state, builder); });
}

} // namespace Benchmarks
