#include "AcquireBenchmark.h"
#include "GrowthBenchmark.h"
#include "RatioReporter.h"
#include "SignBenchmark.h"
#include "ThreadsBenchmark.h"
#include "TokenSourceBenchmark.h"
#include "VerifyBenchmark.h"

#include <benchmark/benchmark.h>

int main(int argc, char** argv)
{
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
        return 2;
    }
    Benchmarks::RegisterVerifyBenchmarks();
    Benchmarks::RegisterSignBenchmarks();
    Benchmarks::RegisterThreadsBenchmarks();
    Benchmarks::RegisterTokenSourceBenchmarks();
    Benchmarks::RegisterAcquireBenchmarks();
    Benchmarks::RegisterGrowthBenchmarks();
    Benchmarks::RatioReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();
    return 0;
}
