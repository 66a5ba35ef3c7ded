#include "ExchangeRecord.h"

void ExchangeRecord::Note(const Quillon::Http::ExchangeFacts& facts)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    _latest = facts;
}

std::optional<Quillon::Http::ExchangeFacts> ExchangeRecord::GetLatest() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return _latest;
}
