#pragma once

#include <cstddef>
#include <string>
#include <string_view>

// Names and fault texts come from others and shall neither break a line nor steer a terminal.

/** Keeps no copy, so that a password may be asked about. [RFC 3629 3] */
bool IsUtf8(std::string_view text);

/** Whether `text` holds a control character or a separator of lines (C0, C1, U+2028, U+2029). */
bool HasControls(std::string_view text);

/**
 * `text` as one line that shows what it holds: every control character, line separator,
 * bidirectional control and octet that is not UTF-8 is written as `\xNN` or `\uNNNN`, and a
 * backslash as two, so that no two texts look alike.
 */
std::string ToOneLine(std::string_view text);

/** How much of a text of others a message repeats. */
inline constexpr std::size_t MaxShownBytes = 300;

/** How much of a failure's message is shown: a service may put megabytes into a fault. */
inline constexpr std::size_t MaxMessageBytes = 4096;

/** At most `maxBytes` of `text`, and how long it is if that is not all of it. */
std::string Shorten(const std::string& text, std::size_t maxBytes);
