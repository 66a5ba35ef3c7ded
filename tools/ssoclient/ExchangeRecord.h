#pragma once

#include "quillon/http/ExchangeFacts.h"

#include <mutex>
#include <optional>

/** Remembers the latest exchange with the service. Thread safety: any number of threads. */
class ExchangeRecord
{
public:
    void Note(const Quillon::Http::ExchangeFacts& facts);

    /** Nothing if there was none, or none that is known of. */
    std::optional<Quillon::Http::ExchangeFacts> GetLatest() const;

private:
    mutable std::mutex _mutex;
    std::optional<Quillon::Http::ExchangeFacts> _latest;
};
