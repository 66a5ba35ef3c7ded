#pragma once

#include "devsts/wire/Clock.h"

#include <map>
#include <mutex>
#include <string>
#include <unordered_set>

namespace DevSts {

/**
 * Remembers messages for as long as they count as fresh. [WSS11 13.3.1]
 *
 * Thread safety: any number of threads.
 */
class ReplayGuard
{
public:
    /** @return false if `mark` is remembered already. */
    bool Remember(const std::string& mark, TimePoint until, TimePoint now);

private:
    std::mutex _mutex;
    std::unordered_set<std::string> _marks;
    std::multimap<TimePoint, std::string> _ends;
};

} // namespace DevSts
