#pragma once

#include "http/Curl.h"

#include "quillon/http/ExchangeFacts.h"

namespace Quillon::Http {

/** What libcurl knows of a transfer: the peer's address and the times. */
ExchangeFacts ReadFacts(CURL* easy);

/** Reads a date of a header field [RFC 9110 5.6.7]; nothing for anything else. */
boost::optional<System::DateTime> ParseHttpDate(const std::string& text);

} // namespace Quillon::Http
