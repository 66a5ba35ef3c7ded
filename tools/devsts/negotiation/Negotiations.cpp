#include "devsts/negotiation/Negotiations.h"

#include "devsts/wire/Fault.h"

namespace DevSts {

namespace {

constexpr std::chrono::minutes LongestAge(5);

} // namespace

void Negotiations::Put(std::unique_ptr<Negotiation> negotiation, TimePoint now)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    DropOld(now);
    if (_pending.size() >= _most) {
        throw Fault(
            FaultCodes::RequestFailed,
            "Too many negotiations are under way: " + std::to_string(_pending.size()));
    }
    const std::string& id = negotiation->id;
    _pending.emplace(id, std::move(negotiation));
}

std::unique_ptr<Negotiation> Negotiations::Take(
    const std::string& id, const std::set<std::string>& cookies, TimePoint now)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    DropOld(now);
    const auto found = _pending.find(id);
    if (found == _pending.end()) {
        throw Fault(
            FaultCodes::InvalidRequest,
            "No negotiation is under way with the Context '" + id + "'");
    }
    if (cookies.count(found->second->cookie) == 0) {
        throw Fault(
            FaultCodes::InvalidRequest,
            "The request does not carry the cookie of the negotiation '" + id + "'");
    }
    std::unique_ptr<Negotiation> negotiation = std::move(found->second);
    _pending.erase(found);
    return negotiation;
}

void Negotiations::DropOld(TimePoint now)
{
    for (auto next = _pending.begin(); next != _pending.end();) {
        const bool isOld = next->second->begun + LongestAge <= now;
        next = isOld ? _pending.erase(next) : std::next(next);
    }
}

} // namespace DevSts
