#include "xml/sourceCheck.h"

#include "quillon/xml/Parser.h"
#include "xml/characters.h"

#include <algorithm>
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

void RequireUtf8(std::string_view source)
{
    const std::size_t position = FindNotUtf8(source);
    if (position != std::string_view::npos) {
        Fail(position, "The text is not UTF-8");
    }
}

/**
 * [XML F.1] The encoding that is told by a byte order mark, or by the zeros around the first `<`;
 * empty if it is none with characters wider than an octet.
 */
std::string_view NameWideEncoding(std::string_view source) noexcept
{
    using namespace std::string_view_literals;
    // UTF-32 first: its mark begins with that of UTF-16.
    const std::string_view start = source.substr(0, 4);
    for (const std::string_view wide :
         {"\0\0\xFE\xFF"sv, "\xFF\xFE\0\0"sv, "\0\0\0<"sv, "<\0\0\0"sv}) {
        if (start == wide) {
            return "UTF-32";
        }
    }
    const std::string_view mark = source.substr(0, 2);
    const bool isMarked = mark == "\xFE\xFF"sv || mark == "\xFF\xFE"sv;
    const bool alternates =
        start.size() == 4
        && ((mark == "\0<"sv && start[2] == '\0') || (mark == "<\0"sv && start[3] == '\0'));
    return isMarked || alternates ? "UTF-16" : "";
}

/** Says what the text is, where the first octet that does not fit would puzzle the reader. */
void RefuseWideCharacters(std::string_view source)
{
    const std::string_view encoding = NameWideEncoding(source);
    if (!encoding.empty()) {
        throw XMLParseException(
            "The document is in " + std::string(encoding) + "; only UTF-8 is read");
    }
}

/** The first octets of a document in EBCDIC, or of something else, differ from these. */
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

/** Where the last `<` stands; there is one. */
std::size_t FindLastTag(std::string_view text) noexcept
{
    const auto* found = static_cast<const char*>(memrchr(text.data(), '<', text.size()));
    return static_cast<std::size_t>(found - text.data());
}

/**
 * A tag holds no `<` but its first [XML 3.1], so only a long stretch without one can be a tag
 * with too many attributes. Stretches are found from their far end: cheap on any real document.
 */
void LimitAttributes(std::string_view source)
{
    TagFinder tags(source);
    std::size_t start = source.find('<');
    while (start != std::string_view::npos) {
        const std::size_t next = FindLastTag(source.substr(0, start + HarmlessTagLength));
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
    RefuseWideCharacters(source);
    RequireAsciiStart(source);
    const std::size_t nul = source.find('\0');
    if (nul != std::string_view::npos) {
        Fail(nul, "NUL character");
    }
    RequireUtf8(source);
    LimitAttributes(source);
}

} // namespace Quillon::Xml
