#include "RatioReporter.h"

#include <algorithm>
#include <cstdio>

namespace Benchmarks {

namespace {

double GetMedian(std::vector<double> times)
{
    std::sort(times.begin(), times.end());
    const std::size_t middle = times.size() / 2;
    return times.size() % 2 == 1 ? times[middle] : (times[middle - 1] + times[middle]) / 2;
}

void PrintRow(
    const std::string& operation,
    const std::string& who,
    const std::vector<double>& times,
    const std::vector<double>* floor)
{
    constexpr double NanosecondsPerMicrosecond = 1e3;
    const double median = GetMedian(times);
    std::printf(
        "%-34s %-8s %12.2f", operation.c_str(), who.c_str(), median / NanosecondsPerMicrosecond);
    if (floor != nullptr && floor != &times) {
        const double unit = GetMedian(*floor);
        const auto [least, most] = std::minmax_element(times.begin(), times.end());
        std::printf("%8.2f  (%.2f to %.2f)", median / unit, *least / unit, *most / unit);
    }
    std::printf("\n");
}

} // namespace

bool RatioReporter::ReportContext(const Context& /*context*/)
{
    return true;
}

void RatioReporter::ReportRuns(const std::vector<Run>& runs)
{
    for (const Run& run : runs) {
        if (run.error_occurred) {
            _failures.push_back(run.benchmark_name() + ": " + run.error_message);
        } else if (run.run_type == Run::RT_Iteration) {
            const std::string& name = run.run_name.function_name;
            const std::size_t slash = name.find('/');
            const std::string threads =
                run.threads == 1 ? "" : ", " + std::to_string(run.threads) + " threads";
            // What waits for a server is measured by the wall clock.
            const bool isReal = !run.run_name.time_type.empty();
            _times[name.substr(slash + 1) + threads][name.substr(0, slash)].push_back(
                isReal ? run.GetAdjustedRealTime() : run.GetAdjustedCPUTime());
        }
    }
}

void RatioReporter::Finalize()
{
    std::printf("\n%-34s %-8s %12s%8s\n", "operation", "who", "microseconds", "ratio");
    for (const auto& [operation, byWho] : _times) {
        const auto floor = byWho.find("Floor");
        for (const auto& [who, times] : byWho) {
            PrintRow(operation, who, times, floor == byWho.end() ? nullptr : &floor->second);
        }
    }
    for (const std::string& failure : _failures) {
        std::printf("FAILED %s\n", failure.c_str());
    }
}

} // namespace Benchmarks
