#pragma once

#include <string>

// Checks of option values. Each returns what is wrong with the value, or an empty text.

/** An empty value must not pass for an option that was left out. */
std::string CheckNotEmpty(const std::string& value);

/** A text goes into the request, which is XML: no octets and characters that XML cannot hold. */
std::string CheckText(const std::string& value);

/** A text that is not empty. */
std::string CheckNotEmptyText(const std::string& value);

/** A name goes into the request and into descriptions: it is text without control characters. */
std::string CheckName(const std::string& value);

/** 100 years of 365 days: from now, far from the last date that can be written. */
inline constexpr long long MaxSeconds = 100LL * 365 * 24 * 3600;

/** At most `MaxSeconds`. The lower bound is the library's to judge. */
std::string CheckLifetime(const std::string& value);
