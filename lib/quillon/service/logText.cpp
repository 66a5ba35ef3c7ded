#include "service/logText.h"

#include <algorithm>
#include <string_view>

namespace Quillon::Service {

namespace {

struct Character
{
    char32_t code;
    std::size_t size; ///< in octets; 0 if the text does not begin with a character in UTF-8
};

/** The shortest form and no surrogates [RFC 3629 3]. */
bool IsScalar(char32_t code, std::size_t size) noexcept
{
    constexpr char32_t First[] = {0, 0, 0x80, 0x800, 0x10000};
    return code >= First[size] && code <= 0x10FFFF && (code < 0xD800 || code > 0xDFFF);
}

Character ReadCharacter(std::string_view text) noexcept
{
    const auto lead = static_cast<unsigned char>(text[0]);
    const std::size_t size = lead < 0x80             ? 1
                             : (lead & 0xE0) == 0xC0 ? 2
                             : (lead & 0xF0) == 0xE0 ? 3
                             : (lead & 0xF8) == 0xF0 ? 4
                                                     : 0;
    if (size == 0 || size > text.size()) {
        return {0, 0};
    }
    char32_t code = size == 1 ? lead : lead & (0x7FU >> size);
    for (const char octet : text.substr(1, size - 1)) {
        if ((octet & 0xC0) != 0x80) {
            return {0, 0};
        }
        code = code << 6 | (octet & 0x3FU);
    }
    return IsScalar(code, size) ? Character{code, size} : Character{0, 0};
}

bool IsControl(char32_t code) noexcept
{
    return (code < 0x20 && code != '\t') || (code >= 0x7F && code <= 0x9F);
}

/** Line and paragraph separator, and what changes the direction [UAX #9 2]. */
bool IsInvisibleOrder(char32_t code) noexcept
{
    return code == 0x2028 || code == 0x2029 || code == 0x061C || code == 0x200E || code == 0x200F
           || (code >= 0x202A && code <= 0x202E) || (code >= 0x2066 && code <= 0x2069);
}

bool IsHexDigit(char digit) noexcept
{
    return (digit >= '0' && digit <= '9') || (digit >= 'a' && digit <= 'f');
}

bool LooksEscaped(std::string_view text) noexcept
{
    return text.size() >= 4 && text.substr(0, 2) == "\\x" && IsHexDigit(text[2])
           && IsHexDigit(text[3]);
}

void AppendEscaped(std::string& result, std::string_view octets)
{
    constexpr char HexDigits[] = "0123456789abcdef";
    for (const char octet : octets) {
        const auto byte = static_cast<unsigned char>(octet);
        result += "\\x";
        result += HexDigits[byte >> 4];
        result += HexDigits[byte & 0x0FU];
    }
}

} // namespace

std::string ToLogText(const std::string& text)
{
    std::string result;
    std::string_view rest = text;
    while (!rest.empty()) {
        const auto [code, size] = ReadCharacter(rest);
        const std::string_view octets = rest.substr(0, std::max<std::size_t>(size, 1));
        if (size == 0 || IsControl(code) || IsInvisibleOrder(code) || LooksEscaped(rest)) {
            AppendEscaped(result, octets);
        } else {
            result += octets;
        }
        rest.remove_prefix(octets.size());
    }
    return result;
}

} // namespace Quillon::Service
