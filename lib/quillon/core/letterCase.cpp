#include "quillon/StringUtil.h"

#include <array>
#include <cstdint>

namespace Quillon::StringUtil {

namespace {

/** Code points below this one take at most two bytes in UTF-8; all mapped letters are there. */
constexpr unsigned CaseTableSize = 0x800;
using CaseTable = std::array<std::uint16_t, CaseTableSize>;

/** Capitals `first` to `last`, whose small letters lie `distance` further on. */
struct ShiftedLetters
{
    unsigned first;
    unsigned last;
    int distance;
};

constexpr ShiftedLetters Shifted[] = {
    {0x0041, 0x005A, 32},   // ASCII
    {0x00C0, 0x00D6, 32},   // Latin-1
    {0x00D8, 0x00DE, 32},   //
    {0x0178, 0x0178, -121}, // Y with diaeresis
    {0x037F, 0x037F, 116},  // Greek
    {0x0386, 0x0386, 38},   //
    {0x0388, 0x038A, 37},   //
    {0x038C, 0x038C, 64},   //
    {0x038E, 0x038F, 63},   //
    {0x0391, 0x03A1, 32},   //
    {0x03A3, 0x03AB, 32},   //
    {0x03CF, 0x03CF, 8},    //
    {0x03F9, 0x03F9, -7},   //
    {0x03FD, 0x03FF, -130}, //
    {0x0400, 0x040F, 80},   // Cyrillic
    {0x0410, 0x042F, 32},   //
    {0x04C0, 0x04C0, 15},   //
};

/** Capital and small letters in turn, a capital first. */
struct AlternatingLetters
{
    unsigned first;
    unsigned last;
};

constexpr AlternatingLetters Alternating[] = {
    {0x0100, 0x012F}, // Latin Extended-A
    {0x0132, 0x0137}, //
    {0x0139, 0x0148}, //
    {0x014A, 0x0177}, //
    {0x0179, 0x017E}, //
    {0x0370, 0x0373}, // Greek
    {0x0376, 0x0377}, //
    {0x03D8, 0x03EF}, //
    {0x03F7, 0x03F8}, //
    {0x03FA, 0x03FB}, //
    {0x0460, 0x0481}, // Cyrillic
    {0x048A, 0x04BF}, //
    {0x04C1, 0x04CE}, //
    {0x04D0, 0x052F}, //
};

struct OneWayLetter
{
    unsigned from;
    unsigned to;
};

// Variant forms of letters that have a pair of their own. The three whose partner is an ASCII
// letter (U+0130, U+0131 and U+017F) are left out on purpose: principals are compared without
// regard to case, and a look-alike must never equal a plain ASCII name.
constexpr OneWayLetter OnlyUpper[] = {
    {0x00B5, 0x039C},
    {0x03C2, 0x03A3},
    {0x03D0, 0x0392},
    {0x03D1, 0x0398},
    {0x03D5, 0x03A6},
    {0x03D6, 0x03A0},
    {0x03F0, 0x039A},
    {0x03F1, 0x03A1},
    {0x03F5, 0x0395},
};
constexpr OneWayLetter OnlyLower[] = {{0x03F4, 0x03B8}};

constexpr CaseTable MakeCaseTable(bool upper)
{
    CaseTable table{};
    for (unsigned i = 0; i < CaseTableSize; ++i) {
        table[i] = static_cast<std::uint16_t>(i);
    }
    const auto pair = [&table, upper](unsigned capital, unsigned small) {
        table[upper ? small : capital] = static_cast<std::uint16_t>(upper ? capital : small);
    };
    for (const ShiftedLetters& range : Shifted) {
        for (unsigned letter = range.first; letter <= range.last; ++letter) {
            pair(letter, static_cast<unsigned>(static_cast<int>(letter) + range.distance));
        }
    }
    for (const AlternatingLetters& range : Alternating) {
        for (unsigned letter = range.first; letter < range.last; letter += 2) {
            pair(letter, letter + 1);
        }
    }
    if (upper) {
        for (const OneWayLetter& letter : OnlyUpper) {
            table[letter.from] = static_cast<std::uint16_t>(letter.to);
        }
    } else {
        for (const OneWayLetter& letter : OnlyLower) {
            table[letter.from] = static_cast<std::uint16_t>(letter.to);
        }
    }
    return table;
}

constexpr CaseTable UpperTable = MakeCaseTable(true);
constexpr CaseTable LowerTable = MakeCaseTable(false);

bool IsContinuation(unsigned char byte) noexcept
{
    return (byte & 0xC0U) == 0x80U;
}

/**
 * Maps the letters of one and two bytes in place: no mapping changes the length. Longer
 * sequences and malformed bytes stay as they are.
 */
std::string MapCase(std::string_view text, const CaseTable& table)
{
    std::string result(text);
    for (std::size_t i = 0; i < result.size(); ++i) {
        const auto byte = static_cast<unsigned char>(result[i]);
        if (byte < 0x80) {
            result[i] = static_cast<char>(table[byte]);
        } else if (
            byte >= 0xC2 && byte <= 0xDF && i + 1 < result.size()
            && IsContinuation(static_cast<unsigned char>(result[i + 1]))) {
            const auto next = static_cast<unsigned char>(result[i + 1]);
            const unsigned mapped = table[((byte & 0x1FU) << 6) | (next & 0x3FU)];
            result[i] = static_cast<char>(0xC0U | (mapped >> 6));
            result[++i] = static_cast<char>(0x80U | (mapped & 0x3FU));
        }
    }
    return result;
}

} // namespace

std::string ToUpper(std::string_view text)
{
    return MapCase(text, UpperTable);
}

std::string ToLower(std::string_view text)
{
    return MapCase(text, LowerTable);
}

} // namespace Quillon::StringUtil
