#include "OneLine.h"

#include "quillon/MessageFormatter.h"

#include <algorithm>
#include <array>
#include <cstdio>

namespace {

struct Character
{
    std::size_t bytes; ///< how many it has in UTF-8
    char32_t code;
    bool isUtf8;
};

struct LeadByte
{
    unsigned char mask;
    unsigned char value;
    char32_t least; ///< of the codes that take so many octets
};
constexpr std::array<LeadByte, 4> LeadBytes = {
    {{0x80, 0x00, 0}, {0xe0, 0xc0, 0x80}, {0xf0, 0xe0, 0x800}, {0xf8, 0xf0, 0x10000}}};

bool IsScalarValue(char32_t code, char32_t least)
{
    return code >= least && code <= 0x10ffff && (code < 0xd800 || code > 0xdfff);
}

/** The first character of `text`; one octet that is not UTF-8 counts as one. [RFC 3629 3] */
Character Decode(std::string_view text)
{
    const auto first = static_cast<unsigned char>(text[0]);
    const auto lead = std::find_if(LeadBytes.begin(), LeadBytes.end(), [&](const LeadByte& form) {
        return (first & form.mask) == form.value;
    });
    const std::size_t bytes = static_cast<std::size_t>(lead - LeadBytes.begin()) + 1;
    if (lead == LeadBytes.end() || text.size() < bytes) {
        return {1, first, false};
    }
    char32_t code = first & static_cast<unsigned char>(~lead->mask);
    for (std::size_t i = 1; i < bytes; ++i) {
        const auto next = static_cast<unsigned char>(text[i]);
        if ((next & 0xc0U) != 0x80) {
            return {1, first, false};
        }
        code = (code << 6) | (next & 0x3fU);
    }
    return IsScalarValue(code, lead->least) ? Character{bytes, code, true}
                                            : Character{1, first, false};
}

bool IsControl(char32_t code)
{
    return code < 0x20 || (code >= 0x7f && code < 0xa0) || code == 0x2028 || code == 0x2029;
}

/** What changes the direction of the text around it [UAX 9 2]. */
bool IsBidirectionalControl(char32_t code)
{
    return code == 0x061c || code == 0x200e || code == 0x200f || (code >= 0x202a && code <= 0x202e)
           || (code >= 0x2066 && code <= 0x2069);
}

std::string Escape(const Character& character)
{
    std::array<char, 8> text = {};
    const bool isByte = !character.isUtf8 || character.code < 0x80;
    std::snprintf(
        text.data(),
        text.size(),
        isByte ? "\\x%02x" : "\\u%04x",
        static_cast<unsigned>(character.code));
    return text.data();
}

} // namespace

bool IsUtf8(std::string_view text)
{
    while (!text.empty()) {
        const Character character = Decode(text);
        if (!character.isUtf8) {
            return false;
        }
        text.remove_prefix(character.bytes);
    }
    return true;
}

bool HasControls(std::string_view text)
{
    for (std::size_t at = 0; at < text.size();) {
        const Character character = Decode(text.substr(at));
        if (character.isUtf8 && IsControl(character.code)) {
            return true;
        }
        at += character.bytes;
    }
    return false;
}

std::string ToOneLine(std::string_view text)
{
    std::string line;
    line.reserve(text.size());
    for (std::size_t at = 0; at < text.size();) {
        const Character character = Decode(text.substr(at));
        if (!character.isUtf8 || IsControl(character.code)
            || IsBidirectionalControl(character.code)) {
            line += Escape(character);
        } else if (character.code == '\\') {
            line += "\\\\";
        } else {
            line += text.substr(at, character.bytes);
        }
        at += character.bytes;
    }
    return line;
}

std::string Shorten(const std::string& text, std::size_t maxBytes)
{
    if (text.size() <= maxBytes) {
        return text;
    }
    std::size_t end = maxBytes;
    while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xc0U) == 0x80) {
        --end; // not in the middle of a character
    }
    return Quillon::MessageFormatter::ASPrint(
        "%1... (%2 bytes in all)", text.substr(0, end), text.size());
}
