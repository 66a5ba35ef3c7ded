#include "xml/Escape.h"

#include <cstdint>

namespace Quillon::Xml {

namespace {

using Word = std::uint64_t;

constexpr Word LowBits = 0x0101010101010101U;
constexpr Word HighBits = 0x8080808080808080U;

/** Sets the high bit of (at least) every byte of `word` that equals `byte`. */
constexpr Word MatchByte(Word word, unsigned char byte) noexcept
{
    const Word difference = word ^ (LowBits * byte);
    return (difference - LowBits) & ~difference & HighBits;
}

/** Whether any of the eight bytes may need an escape in character data. */
constexpr bool TextNeedsEscape(Word word) noexcept
{
    return (MatchByte(word, '&') | MatchByte(word, '<') | MatchByte(word, '>')
            | MatchByte(word, '\r'))
           != 0;
}

constexpr bool AttributeNeedsEscape(Word word) noexcept
{
    return (MatchByte(word, '&') | MatchByte(word, '<') | MatchByte(word, '"')
            | MatchByte(word, '\t') | MatchByte(word, '\n') | MatchByte(word, '\r'))
           != 0;
}

constexpr std::string_view TextEscape(char byte) noexcept
{
    switch (byte) {
    case '&':
        return "&amp;";
    case '<':
        return "&lt;";
    case '>':
        return "&gt;";
    case '\r':
        return "&#xD;";
    default:
        return {};
    }
}

constexpr std::string_view AttributeEscape(char byte) noexcept
{
    switch (byte) {
    case '&':
        return "&amp;";
    case '<':
        return "&lt;";
    case '"':
        return "&quot;";
    case '\t':
        return "&#x9;";
    case '\n':
        return "&#xA;";
    case '\r':
        return "&#xD;";
    default:
        return {};
    }
}

Word LoadWord(const char* bytes) noexcept
{
    Word word = 0;
    std::memcpy(&word, bytes, sizeof word);
    return word;
}

/** The length of the part of `text` before the first byte that has an escape. */
template <bool (*NeedsEscape)(Word), std::string_view (*Escape)(char)>
std::size_t FindEscape(std::string_view text) noexcept
{
    const std::size_t size = text.size();
    std::size_t position = 0;
    while (position + sizeof(Word) <= size && !NeedsEscape(LoadWord(text.data() + position))) {
        position += sizeof(Word);
    }
    // The rest of a longer text is the end of its last word.
    const bool isRest = size >= sizeof(Word) && position + sizeof(Word) > size;
    if (isRest && !NeedsEscape(LoadWord(text.data() + size - sizeof(Word)))) {
        return size;
    }
    while (position < size && Escape(text[position]).empty()) {
        ++position;
    }
    return position;
}

template <bool (*NeedsEscape)(Word), std::string_view (*Escape)(char)>
void AppendEscaped(OutputBuffer& out, std::string_view text)
{
    while (true) {
        const std::size_t plain = FindEscape<NeedsEscape, Escape>(text);
        out.Append(text.substr(0, plain));
        if (plain == text.size()) {
            return;
        }
        out.Append(Escape(text[plain]));
        text.remove_prefix(plain + 1);
    }
}

} // namespace

void AppendText(OutputBuffer& out, std::string_view text)
{
    AppendEscaped<TextNeedsEscape, TextEscape>(out, text);
}

void AppendAttributeValue(OutputBuffer& out, std::string_view value)
{
    AppendEscaped<AttributeNeedsEscape, AttributeEscape>(out, value);
}

void AppendProcessingInstruction(OutputBuffer& out, const ProcessingInstructionNode& instruction)
{
    out.Append("<?");
    out.Append(instruction.GetTarget());
    if (!instruction.GetData().empty()) {
        out.Append(' ');
        out.Append(instruction.GetData());
    }
    out.Append("?>");
}

} // namespace Quillon::Xml
