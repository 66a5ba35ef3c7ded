#include "TokenSourceBenchmark.h"

#include "support/FakeSamlToken.h"

#include "quillon/system/Clock.h"
#include "ssoClientRuntime/TokenSource.h"

#include <benchmark/benchmark.h>
#include <boost/smart_ptr/make_shared.hpp>

#include <chrono>

namespace Benchmarks {

namespace {

using Token = boost::shared_ptr<const SsoClient::SamlToken>;

Token MakeToken()
{
    const auto token = boost::make_shared<FakeSamlToken>();
    const long long now = Quillon::System::GetUtcDateTime().GetUtcTime();
    const long long day = 86'400'000'000;
    token->startDate = Quillon::System::DateTimeFromUtc(now, false);
    token->endDate = Quillon::System::DateTimeFromUtc(now + day, false);
    return token;
}

void MeasureOwn(benchmark::State& state)
{
    static const auto source = SsoClient::CreateTokenSource([] { return MakeToken(); });
    for (auto _ : state) {
        benchmark::DoNotOptimize(source->GetToken());
    }
}

void MeasureFloor(benchmark::State& state)
{
    static const Token token = MakeToken();
    for (auto _ : state) {
        benchmark::DoNotOptimize(std::chrono::system_clock::now());
        benchmark::DoNotOptimize(std::chrono::steady_clock::now());
        Token copy = token;
        benchmark::DoNotOptimize(copy);
    }
}

} // namespace

void RegisterTokenSourceBenchmarks()
{
    for (const int threads : {1, 2}) {
        benchmark::RegisterBenchmark("Floor/GetToken", MeasureFloor)->Threads(threads);
        benchmark::RegisterBenchmark("Own/GetToken", MeasureOwn)->Threads(threads);
    }
}

} // namespace Benchmarks
