#include "xml/Escape.h"

#include <cstdint>

namespace Quillon::Xml {

namespace {

/** Sixteen bytes that are compared at once; GCC and Clang make the best of it on any machine. */
using Block __attribute__((vector_size(16))) = char;

/** For a `char` whether it is special in character data; for a `Block`, for each of its bytes. */
struct InText
{
    template <class Bytes>
    static auto IsSpecial(Bytes bytes) noexcept
    {
        return (bytes == '&') | (bytes == '<') | (bytes == '>') | (bytes == '\r');
    }
};

/** The same for attribute values. */
struct InAttribute
{
    template <class Bytes>
    static auto IsSpecial(Bytes bytes) noexcept
    {
        return (bytes == '&') | (bytes == '<') | (bytes == '"') | (bytes == '\t') | (bytes == '\n')
               | (bytes == '\r');
    }
};

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

/** Whether one of the sixteen bytes is special. */
template <class Context>
bool BlockHasSpecial(const char* bytes) noexcept
{
    Block block;
    std::memcpy(&block, bytes, sizeof block);
    const auto matches = Context::IsSpecial(block);
    std::array<std::uint64_t, 2> halves{};
    static_assert(sizeof halves == sizeof matches);
    std::memcpy(halves.data(), &matches, sizeof matches);
    return (halves[0] | halves[1]) != 0;
}

/** The length of the part of `text` before the first special byte. */
template <class Context>
std::size_t FindSpecial(std::string_view text) noexcept
{
    std::size_t position = 0;
    while (position + sizeof(Block) <= text.size()
           && !BlockHasSpecial<Context>(text.data() + position)) {
        position += sizeof(Block);
    }
    while (position < text.size() && !Context::IsSpecial(text[position])) {
        ++position;
    }
    return position;
}

template <class Context, std::string_view (*Escape)(char)>
void AppendEscaped(OutputBuffer& out, std::string_view text)
{
    while (true) {
        const std::size_t plain = FindSpecial<Context>(text);
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
    AppendEscaped<InText, TextEscape>(out, text);
}

void AppendAttributeValue(OutputBuffer& out, std::string_view value)
{
    AppendEscaped<InAttribute, AttributeEscape>(out, value);
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
