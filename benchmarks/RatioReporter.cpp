#include "RatioReporter.h"

#include <cstdio>

namespace Benchmarks {

void RatioReporter::ReportRuns(const std::vector<Run>& runs)
{
    for (const Run& run : runs) {
        if (run.run_type == Run::RT_Aggregate && run.aggregate_name == "median") {
            // What waits for a server is measured by the wall clock.
            const bool isReal = !run.run_name.time_type.empty();
            _medians[run.run_name.function_name] =
                isReal ? run.GetAdjustedRealTime() : run.GetAdjustedCPUTime();
        }
    }
    ConsoleReporter::ReportRuns(runs);
}

void RatioReporter::Finalize()
{
    const std::string own = "Own/";
    std::printf("\n%-40s %10s\n", "own cost as a multiple of the floor", "ratio");
    for (const auto& [name, median] : _medians) {
        const auto floor = name.compare(0, own.size(), own) == 0
                               ? _medians.find("Floor/" + name.substr(own.size()))
                               : _medians.end();
        if (floor != _medians.end()) {
            std::printf("%-40s %10.2f\n", name.substr(own.size()).c_str(), median / floor->second);
        }
    }
}

} // namespace Benchmarks
