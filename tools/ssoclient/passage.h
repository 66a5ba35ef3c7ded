#pragma once

#include <string>

/**
 * The passage of `text` that a message is about, with `[here]` at the place, if the message names a
 * line and a column, as in `at line 3, column 8` or `at 3,8`; otherwise empty.
 */
std::string FindPassage(const std::string& message, const std::string& text);
