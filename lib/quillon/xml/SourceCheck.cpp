#include "xml/SourceCheck.h"

#include "quillon/xml/Parser.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string>
#include <utility>

namespace Quillon::Xml {

namespace {

constexpr std::string_view ByteOrderMark = "\xEF\xBB\xBF";

/** No tag of fewer octets has more attributes than allowed: ` a=""` is the shortest one. */
constexpr std::size_t ShortestAttribute = 5;
constexpr std::size_t HarmlessTagLength = ParserLimits::MaxAttributes * ShortestAttribute;

[[noreturn]] void Fail(std::size_t offset, const std::string& what)
{
    throw XMLParseException(what + " at octet " + std::to_string(offset));
}

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
unsigned GetSequenceLength(std::string_view source, std::size_t position) noexcept
{
    const SequenceRule rule = GetSequenceRule(ByteAt(source, position));
    const unsigned char second = ByteAt(source, position + 1);
    if (rule.length == 0 || second < rule.secondMin || second > rule.secondMax) {
        return 0;
    }
    for (unsigned i = 2; i < rule.length; ++i) {
        if ((ByteAt(source, position + i) & 0xC0U) != 0x80U) {
            return 0;
        }
    }
    return rule.length;
}

/** Whether a whole word of octets starts at `position`, and all of them are ASCII. */
bool IsAsciiWord(std::string_view source, std::size_t position) noexcept
{
    constexpr std::uint64_t NotAscii = 0x8080808080808080U;
    std::uint64_t word = NotAscii;
    if (position + sizeof word <= source.size()) {
        std::memcpy(&word, source.data() + position, sizeof word);
    }
    return (word & NotAscii) == 0;
}

void RequireUtf8(std::string_view source)
{
    std::size_t position = 0;
    while (position < source.size()) {
        if (IsAsciiWord(source, position)) {
            position += sizeof(std::uint64_t);
            continue;
        }
        if (ByteAt(source, position) < 0x80U) {
            ++position;
            continue;
        }
        const unsigned length = GetSequenceLength(source, position);
        if (length == 0) {
            Fail(position, "The text is not UTF-8");
        }
        position += length;
    }
}

/** The first octets of a document in UTF-16, UTF-32 or EBCDIC differ from these. */
void RequireAsciiStart(std::string_view source)
{
    const std::size_t start =
        source.compare(0, ByteOrderMark.size(), ByteOrderMark) == 0 ? ByteOrderMark.size() : 0;
    if (source.size() == start) {
        Fail(start, "The document is empty");
    }
    constexpr std::string_view DocumentStart = "<\t\n\r ";
    if (DocumentStart.find(source[start]) == std::string_view::npos) {
        Fail(start, "Start tag expected, '<' not found");
    }
}

/** Counts the attributes of the tag that starts at the front of `text`, up to its end. */
std::size_t CountAttributes(std::string_view text)
{
    std::size_t count = 0;
    std::size_t position = 1;
    while (position < text.size() && text[position] != '>') {
        const char byte = text[position];
        ++position;
        if (byte == '"' || byte == '\'') {
            ++count;
            const std::size_t close = text.find(byte, position);
            position = close == std::string_view::npos ? text.size() : close + 1;
        }
    }
    return count;
}

/** Tells tags from what only looks like one inside comments, CDATA and instructions. */
class TagFinder
{
public:
    explicit TagFinder(std::string_view source) noexcept
        : _source(source)
    {}

    /** Whether a tag starts at `position`. Asked for rising positions only: linear in all. */
    bool IsTag(std::size_t position) noexcept
    {
        while (_next < position) {
            _next = _source.find('<', SkipMarkup(_next));
        }
        return _next == position && SkipMarkup(_next) == _next + 1;
    }

private:
    /** The end of a comment, CDATA section or instruction; of anything else its first octet. */
    std::size_t SkipMarkup(std::size_t start) const noexcept
    {
        const std::string_view rest = _source.substr(start);
        for (const auto& [open, close] :
             {std::pair<std::string_view, std::string_view>{"<!--", "-->"},
              {"<![CDATA[", "]]>"},
              {"<?", "?>"}}) {
            if (rest.compare(0, open.size(), open) == 0) {
                return std::min(_source.find(close, start + open.size()), _source.size());
            }
        }
        return start + 1;
    }

    std::string_view _source;
    std::size_t _next = 0;
};

/**
 * A tag holds no `<` but its first [XML 3.1], so only a long stretch without one can be a tag
 * with too many attributes. Stretches are found from their far end: cheap on any real document.
 */
void LimitAttributes(std::string_view source)
{
    TagFinder tags(source);
    std::size_t start = source.find('<');
    while (start != std::string_view::npos) {
        const std::size_t next = source.substr(0, start + HarmlessTagLength).rfind('<');
        if (next != start) {
            start = next;
            continue;
        }
        const std::size_t end = source.find('<', start + 1);
        if (CountAttributes(source.substr(start, end - start)) > ParserLimits::MaxAttributes
            && tags.IsTag(start)) {
            Fail(
                start,
                "More than " + std::to_string(ParserLimits::MaxAttributes)
                    + " attributes in the tag");
        }
        start = end;
    }
}

} // namespace

void CheckSource(std::string_view source)
{
    if (source.size() > ParserLimits::MaxDocumentBytes) {
        throw XMLParseException(
            "The document has more than " + std::to_string(ParserLimits::MaxDocumentBytes)
            + " octets");
    }
    RequireAsciiStart(source);
    const std::size_t nul = source.find('\0');
    if (nul != std::string_view::npos) {
        Fail(nul, "NUL character");
    }
    RequireUtf8(source);
    LimitAttributes(source);
}

} // namespace Quillon::Xml
