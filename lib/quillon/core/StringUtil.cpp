#include "quillon/StringUtil.h"

#include "quillon/Exceptions.h"

#include <sys/random.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstdio>

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

/** Fills `bytes` from the kernel's generator; a system call each time, so forks never repeat. */
template <std::size_t Size>
void FillRandom(std::array<unsigned char, Size>& bytes)
{
    static_assert(Size <= 256, "a larger request may be answered in part");
    while (getrandom(bytes.data(), Size, 0) != static_cast<ssize_t>(Size)) {
        if (errno != EINTR) {
            throw InvalidStateException("The system gives no random numbers");
        }
    }
}

constexpr char Digits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// What the table says of characters that are not digits; a digit has its value, below 64.
constexpr std::uint8_t Padding = 0x40;
constexpr std::uint8_t WhiteSpace = 0x41;
constexpr std::uint8_t Other = 0x42;

constexpr std::array<std::uint8_t, 256> MakeDigitValues()
{
    std::array<std::uint8_t, 256> values{};
    for (std::uint8_t& value : values) {
        value = Other;
    }
    for (std::uint8_t i = 0; i < 64; ++i) {
        values[static_cast<unsigned char>(Digits[i])] = i;
    }
    values['='] = Padding;
    for (const char character : {' ', '\t', '\n', '\r'}) {
        values[static_cast<unsigned char>(character)] = WhiteSpace;
    }
    return values;
}

constexpr std::array<std::uint8_t, 256> DigitValues = MakeDigitValues();

std::uint8_t DigitValue(char character) noexcept
{
    return DigitValues[static_cast<unsigned char>(character)];
}

/** Decodes character by character what does not come in plain groups of four digits. */
class Base64Decoder
{
public:
    Base64Decoder(std::string_view text, unsigned char* out) noexcept
        : _text(text)
        , _out(out)
    {}

    /** @return the end of what was written. */
    unsigned char* Decode()
    {
        while (_position < _text.size()) {
            if (_count == 0) {
                DecodeWholeGroups();
            }
            if (_position < _text.size()) {
                DecodeCharacter();
            }
        }
        if (_count != 0) {
            Fail("ends inside a group of four digits");
        }
        return _out;
    }

private:
    void DecodeWholeGroups() noexcept
    {
        while (_paddingCount == 0 && _text.size() - _position >= 4) {
            const unsigned a = DigitValue(_text[_position]);
            const unsigned b = DigitValue(_text[_position + 1]);
            const unsigned c = DigitValue(_text[_position + 2]);
            const unsigned d = DigitValue(_text[_position + 3]);
            if ((a | b | c | d) >= 64) {
                return;
            }
            Put((a << 18) | (b << 12) | (c << 6) | d, 3);
            _position += 4;
        }
    }

    void DecodeCharacter()
    {
        const std::uint8_t value = DigitValue(_text[_position]);
        if (value == Padding) {
            AddPadding();
        } else if (value == Other) {
            Fail("has a character that is no digit");
        } else if (value != WhiteSpace) {
            AddDigit(value);
        }
        ++_position;
    }

    void AddDigit(unsigned value)
    {
        if (_paddingCount != 0) {
            Fail("has a digit after the padding");
        }
        _group = (_group << 6) | value;
        if (++_count == 4) {
            Put(_group, 3);
            _count = 0;
            _group = 0;
        }
    }

    void AddPadding()
    {
        if (_count < 2) {
            Fail("has misplaced padding");
        }
        ++_paddingCount;
        _group <<= 6;
        if (++_count == 4) {
            PutLastGroup();
        }
    }

    void PutLastGroup()
    {
        // Unused bits must be zero: one value must not have several texts [RFC 4648 3.5].
        const unsigned unused = _paddingCount == 1 ? 0xFFU : 0xFFFFU;
        if ((_group & unused) != 0) {
            Fail("has bits that its last digit should not carry");
        }
        Put(_group, 3 - _paddingCount);
        _count = 0;
        _group = 0;
    }

    void Put(unsigned group, unsigned count) noexcept
    {
        for (unsigned i = 0; i < count; ++i) {
            *_out++ = static_cast<unsigned char>(group >> (16 - 8 * i));
        }
    }

    [[noreturn]] void Fail(const char* what) const
    {
        throw Base64FormatException(
            std::string("Base64 text ") + what + " at position " + std::to_string(_position));
    }

    std::string_view _text;
    std::size_t _position = 0;
    unsigned char* _out;
    unsigned _group = 0;
    unsigned _count = 0;
    unsigned _paddingCount = 0;
};

} // namespace

std::string ToUpper(std::string_view text)
{
    return MapCase(text, UpperTable);
}

std::string ToLower(std::string_view text)
{
    return MapCase(text, LowerTable);
}

std::string GenerateUuid()
{
    std::array<unsigned char, 16> bytes{};
    FillRandom(bytes);
    bytes[6] = static_cast<unsigned char>((bytes[6] & 0x0FU) | 0x40U);
    bytes[8] = static_cast<unsigned char>((bytes[8] & 0x3FU) | 0x80U);

    constexpr char HexDigits[] = "0123456789abcdef";
    std::string text;
    text.reserve(36);
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        if (i == 4 || i == 6 || i == 8 || i == 10) {
            text += '-';
        }
        text += HexDigits[bytes[i] >> 4];
        text += HexDigits[bytes[i] & 0x0FU];
    }
    return text;
}

std::string Base64Encode(const std::vector<unsigned char>& bytes)
{
    return Base64Encode(bytes.data(), bytes.size());
}

std::string Base64Encode(const void* bytes, std::size_t length)
{
    const auto* in = static_cast<const unsigned char*>(bytes);
    std::string text((length + 2) / 3 * 4, '=');
    char* out = text.data();
    for (; length >= 3; length -= 3, in += 3, out += 4) {
        const unsigned group = (unsigned{in[0]} << 16) | (unsigned{in[1]} << 8) | in[2];
        out[0] = Digits[group >> 18];
        out[1] = Digits[(group >> 12) & 0x3FU];
        out[2] = Digits[(group >> 6) & 0x3FU];
        out[3] = Digits[group & 0x3FU];
    }
    if (length != 0) {
        const unsigned group = (unsigned{in[0]} << 16) | (length == 2 ? unsigned{in[1]} << 8 : 0U);
        out[0] = Digits[group >> 18];
        out[1] = Digits[(group >> 12) & 0x3FU];
        if (length == 2) {
            out[2] = Digits[(group >> 6) & 0x3FU];
        }
    }
    return text;
}

void Base64Decode(std::string_view text, std::vector<unsigned char>& bytes)
{
    bytes.resize(text.size() / 4 * 3 + 3);
    const unsigned char* end = Base64Decoder(text, bytes.data()).Decode();
    bytes.resize(static_cast<std::size_t>(end - bytes.data()));
}

} // namespace Quillon::StringUtil
