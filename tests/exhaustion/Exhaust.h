#pragma once

#include "Faults.h"

#include <functional>
#include <optional>
#include <string>
#include <vector>

/** Runs an operation again and again, each time with the next call failing. */
namespace Exhaustion {

struct Operation
{
    std::string name;
    std::function<std::string()> run;  ///< gives what came of it, as text, or throws
    std::optional<std::string> result; ///< the only one it may have; none: it must always throw
};

struct Run
{
    Faults::Kind kind = Faults::Kind::ALLOCATION;
    int error = 0;
    bool fromThereOn = false;
    const char* spared = nullptr; ///< see Faults::Plan
    const char* only = nullptr;   ///< the same
    /** What may keep a whole process from succeeding after it has failed in its first operation. */
    const char* lasting = nullptr;
    bool mustSurvive = false; ///< whether the failure must not show
    unsigned long stride = 1; ///< each n-th call fails; EXHAUSTION_STRIDE in the environment wins
};

struct Report
{
    unsigned long failed = 0; ///< how many calls failed
    unsigned long spared = 0; ///< how many did not, though it was their turn
    unsigned long lasted = 0; ///< after how many the process never succeeded, as it may
    unsigned long calls = 0;  ///< how many the operation makes
    std::vector<std::string> findings;
};

/**
 * Each failure leaves the operation as a std::exception or does not show, no memory and no
 * descriptor is lost, and the operation succeeds without the failure. The process ends, with a
 * message, if an operation does not.
 */
Report Exhaust(const Operation& operation, const Run& run);

/** The same, each time in a new process that has not used any library yet. */
Report ExhaustFreshProcesses(const Operation& operation, const Run& run);

} // namespace Exhaustion
