#pragma once

#include <benchmark/benchmark.h>

#include <map>
#include <string>

namespace Benchmarks {

/**
 * Prints the usual table, and after it the ratio of each `Own/NAME` to `Floor/NAME`, from the
 * medians of the repetitions of this one run.
 */
class RatioReporter : public benchmark::ConsoleReporter
{
public:
    void ReportRuns(const std::vector<Run>& runs) override;
    void Finalize() override;

private:
    std::map<std::string, double> _medians;
};

} // namespace Benchmarks
