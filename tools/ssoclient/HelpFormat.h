#pragma once

#include <cstddef>
#include <string>

// Help for a terminal of any width; 80 columns where there is none.

/** `text` in lines that fit, the second and later ones indented. Ends with a line break. */
std::string Wrap(const std::string& text, std::size_t indent);

/** One entry of a list in two columns. */
std::string FormatEntry(const std::string& name, const std::string& description);
