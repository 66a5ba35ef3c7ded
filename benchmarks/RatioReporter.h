#pragma once

#include <benchmark/benchmark.h>

#include <map>
#include <string>
#include <vector>

namespace Benchmarks {

/**
 * Prints each operation with what it costs us, its floor and its peers, and each of them as a
 * multiple of the floor: benchmarks are named `WHO/OPERATION`, and `WHO` is `Own`, `Floor` or the
 * name of a peer. The figures are medians of the repetitions; the spread is that of the ratio.
 */
class RatioReporter : public benchmark::BenchmarkReporter
{
public:
    bool ReportContext(const Context& context) override;
    void ReportRuns(const std::vector<Run>& runs) override;
    void Finalize() override;

private:
    /** Nanoseconds of each repetition. */
    using Times = std::vector<double>;

    /** By operation, and then by who does it. */
    std::map<std::string, std::map<std::string, Times>> _times;
    std::vector<std::string> _failures;
};

} // namespace Benchmarks
