#pragma once

#include "http/Curl.h"

#include "quillon/http/ExchangeFacts.h"

namespace Quillon::Http {

/** What libcurl knows of a transfer: the peer's address and the times. */
ExchangeFacts ReadFacts(CURL* easy);

/**
 * Reads a `Retry-After` [RFC 9110 10.2.3]; nothing for anything else.
 *
 * @param now  when the reply was made, as far as it says so: a date counts from there.
 */
boost::optional<long long> ParseRetryAfter(
    const std::string& text, const boost::optional<System::DateTime>& now);

/** Reads a date of a header field [RFC 9110 5.6.7]; nothing for anything else. */
boost::optional<System::DateTime> ParseHttpDate(const std::string& text);

} // namespace Quillon::Http
