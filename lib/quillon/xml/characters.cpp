#include "xml/characters.h"

#include <cstdint>
#include <cstring>

namespace Quillon::Xml {

namespace {

constexpr std::uint64_t EveryByte = 0x0101010101010101U;
constexpr std::uint64_t HighBits = 0x80 * EveryByte;

constexpr unsigned char ByteAt(std::string_view text, std::size_t position) noexcept
{
    return position < text.size() ? static_cast<unsigned char>(text[position]) : 0;
}

/** A lead octet's sequence length and the range of its second octet; length 0 for no lead. */
struct SequenceRule
{
    unsigned length;
    unsigned char secondMin;
    unsigned char secondMax;
};

/** [RFC 3629 4]: the narrowed ranges exclude overlong forms, surrogates and beyond U+10FFFF. */
constexpr SequenceRule GetSequenceRule(unsigned char lead) noexcept
{
    if (lead < 0xC2) {
        return {0, 0, 0};
    }
    if (lead < 0xE0) {
        return {2, 0x80, 0xBF};
    }
    if (lead < 0xF0) {
        return {
            3,
            static_cast<unsigned char>(lead == 0xE0 ? 0xA0 : 0x80),
            static_cast<unsigned char>(lead == 0xED ? 0x9F : 0xBF)};
    }
    if (lead < 0xF5) {
        return {
            4,
            static_cast<unsigned char>(lead == 0xF0 ? 0x90 : 0x80),
            static_cast<unsigned char>(lead == 0xF4 ? 0x8F : 0xBF)};
    }
    return {0, 0, 0};
}

/** The length of the UTF-8 sequence at `position`, which is not ASCII; 0 if it is malformed. */
unsigned GetSequenceLength(std::string_view text, std::size_t position) noexcept
{
    const SequenceRule rule = GetSequenceRule(ByteAt(text, position));
    const unsigned char second = ByteAt(text, position + 1);
    if (rule.length == 0 || second < rule.secondMin || second > rule.secondMax) {
        return 0;
    }
    for (unsigned i = 2; i < rule.length; ++i) {
        if ((ByteAt(text, position + i) & 0xC0U) != 0x80U) {
            return 0;
        }
    }
    return rule.length;
}

/** Whether a whole word of octets starts at `position`, in which `Rule` finds nothing special. */
template <std::uint64_t (*Special)(std::uint64_t)>
bool IsPlainWord(std::string_view text, std::size_t position) noexcept
{
    std::uint64_t word = HighBits;
    if (position + sizeof word <= text.size()) {
        std::memcpy(&word, text.data() + position, sizeof word);
    }
    return Special(word) == 0;
}

constexpr std::uint64_t NotAscii(std::uint64_t word) noexcept
{
    return word & HighBits;
}

/** Not zero if any octet is not ASCII or less than a blank: a borrow sets the high bit. */
constexpr std::uint64_t NotPrintable(std::uint64_t word) noexcept
{
    return (word | (word - ' ' * EveryByte)) & HighBits;
}

constexpr bool IsControl(unsigned char byte) noexcept
{
    return byte < ' ' && byte != '\t' && byte != '\n' && byte != '\r';
}

/** Whether U+FFFE or U+FFFF stands at `position`. */
bool IsNoCharacter(std::string_view text, std::size_t position) noexcept
{
    const std::string_view sequence = text.substr(position, 3);
    return sequence == "\xEF\xBF\xBE" || sequence == "\xEF\xBF\xBF";
}

} // namespace

std::size_t FindNotUtf8(std::string_view text) noexcept
{
    std::size_t position = 0;
    while (position < text.size()) {
        if (IsPlainWord<NotAscii>(text, position)) {
            position += sizeof(std::uint64_t);
            continue;
        }
        const unsigned length =
            ByteAt(text, position) < 0x80U ? 1 : GetSequenceLength(text, position);
        if (length == 0) {
            return position;
        }
        position += length;
    }
    return std::string_view::npos;
}

std::optional<std::string> FindCharacterFault(std::string_view text)
{
    std::size_t position = 0;
    while (position < text.size()) {
        if (IsPlainWord<NotPrintable>(text, position)) {
            position += sizeof(std::uint64_t);
            continue;
        }
        const unsigned char byte = ByteAt(text, position);
        const bool isAscii = byte < 0x80U;
        if (isAscii ? IsControl(byte) : IsNoCharacter(text, position)) {
            return "holds a character that XML does not allow at octet " + std::to_string(position);
        }
        const unsigned length = isAscii ? 1 : GetSequenceLength(text, position);
        if (length == 0) {
            return "is not UTF-8 at octet " + std::to_string(position);
        }
        position += length;
    }
    return std::nullopt;
}

} // namespace Quillon::Xml
