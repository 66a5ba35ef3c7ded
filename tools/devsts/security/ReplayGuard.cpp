#include "devsts/security/ReplayGuard.h"

namespace DevSts {

bool ReplayGuard::Remember(const std::string& mark, TimePoint until, TimePoint now)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    while (!_ends.empty() && _ends.begin()->first < now) {
        _marks.erase(_ends.begin()->second);
        _ends.erase(_ends.begin());
    }
    if (!_marks.insert(mark).second) {
        return false;
    }
    _ends.emplace(until, mark);
    return true;
}

} // namespace DevSts
