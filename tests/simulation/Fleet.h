#pragma once

#include "ssoClientRuntime/RefreshMachine.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace Simulation {

using SsoClient::RefreshPolicy;
using SsoClient::Span;

/** Many processes with a source each, one service, and an outage. */
struct Scenario
{
    RefreshPolicy policy;
    std::size_t processes = 10'000;
    Span startWithin = std::chrono::minutes(1);
    Span lifetime = std::chrono::hours(1);
    int requestsPerSecond = 50;                   ///< that the service can serve
    Span longestQueue = std::chrono::seconds(10); ///< what would wait longer is refused
    Span outageFrom = Span::max();
    Span outageFor{};
    Span duration = std::chrono::hours(6);
    std::uint64_t seed = 1;
};

/** What came of it. */
struct Course
{
    /** Requests in each minute, whether they were served or not. */
    std::vector<int> requests;

    /** Processes without a good token at the end of each minute. */
    std::vector<int> without;

    /** Processes that had a token and then, for a time, none that was good. */
    std::size_t lapses = 0;

    /** When the last process had its first token. */
    Span allStarted{};

    /** In requests a second, of the minutes from one to the other that have the most. */
    double GetPeak(Span from, Span to) const;

    /** The same for five minutes. */
    double GetPeakOfFive(Span from, Span to) const;

    double GetMean(Span from, Span to) const;
};

/** Lets the scenario happen; the same every time. */
Course Simulate(const Scenario& scenario);

/** The requests a second of processes that are spread evenly, and never fail. */
double GetSteadyLoad(const Scenario& scenario);

} // namespace Simulation
