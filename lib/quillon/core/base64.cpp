#include "quillon/StringUtil.h"

#include "quillon/Exceptions.h"

#include <array>
#include <cstdint>

namespace Quillon::StringUtil {

namespace {

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

/** What a digit adds to its group of four, for each place in the group; `NoDigit` of others. */
constexpr std::uint32_t NoDigit = 0x01000000;
using PlaceValues = std::array<std::array<std::uint32_t, 256>, 4>;

constexpr PlaceValues MakePlaceValues()
{
    PlaceValues places{};
    for (unsigned place = 0; place < 4; ++place) {
        for (unsigned character = 0; character < 256; ++character) {
            const std::uint32_t value = DigitValues[character];
            places[place][character] = value < 64 ? value << (18 - 6 * place) : NoDigit;
        }
    }
    return places;
}

constexpr PlaceValues Places = MakePlaceValues();

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
        const auto* in = reinterpret_cast<const unsigned char*>(_text.data()) + _position;
        for (; _paddingCount == 0 && _text.size() - _position >= 4; in += 4, _position += 4) {
            const std::uint32_t group =
                Places[0][in[0]] | Places[1][in[1]] | Places[2][in[2]] | Places[3][in[3]];
            if (group >= NoDigit) {
                return;
            }
            Put(group, 3);
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
