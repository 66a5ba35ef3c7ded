#pragma once

#include <string>

/**
 * Finds a character that is not ASCII where TOML has none: outside of strings and comments. One
 * behind a backslash that ends a line of a string counts, too. What toml++ does with it where it
 * asks whether it is a blank is not defined.
 *
 * @return its line, the first of which is 1; 0 if there is none.
 */
long FindForeignCharacter(const std::string& text);
