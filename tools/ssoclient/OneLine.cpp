#include "OneLine.h"

#include <algorithm>
#include <string_view>

namespace {

bool IsAsciiControl(char c)
{
    const auto byte = static_cast<unsigned char>(c);
    return byte < 0x20 || byte == 0x7f;
}

/** How many bytes the control or separator character has that `text` starts with; 0 for none. */
std::size_t CountControlBytes(std::string_view text)
{
    // U+0080 to U+009F, among them the terminal's control sequence introducer.
    if (text.size() >= 2 && text[0] == '\xc2' && static_cast<unsigned char>(text[1]) < 0xa0) {
        return 2;
    }
    // U+2028 and U+2029, line and paragraph separator.
    const std::string_view three = text.substr(0, 3);
    if (three == "\xe2\x80\xa8" || three == "\xe2\x80\xa9") {
        return 3;
    }
    return !text.empty() && IsAsciiControl(text[0]) ? 1 : 0;
}

} // namespace

std::string ToOneLine(std::string_view text)
{
    std::string line;
    line.reserve(text.size());
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t control = CountControlBytes(text.substr(at));
        line += control == 0 ? text[at] : ' ';
        at += std::max<std::size_t>(control, 1);
    }
    return line;
}
