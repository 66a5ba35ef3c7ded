#pragma once

#include <string>
#include <string_view>

/**
 * `text` with every control character and line separator replaced by a blank: names and fault
 * texts come from others and shall neither break a line nor steer a terminal.
 */
std::string ToOneLine(std::string_view text);
