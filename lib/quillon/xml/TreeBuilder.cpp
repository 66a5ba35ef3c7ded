#include "xml/TreeBuilder.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <functional>
#include <memory>

namespace Quillon::Xml {

namespace {

constexpr std::size_t UsualAttributes = 8;

std::string_view ToView(const unsigned char* text) noexcept
{
    return text == nullptr ? std::string_view() : reinterpret_cast<const char*>(text);
}

constexpr bool IsBlank(char byte) noexcept
{
    return byte == ' ' || byte == '\t' || byte == '\n' || byte == '\r';
}

void SkipBlanks(std::string_view& text) noexcept
{
    while (!text.empty() && IsBlank(text.front())) {
        text.remove_prefix(1);
    }
}

/** By octet, whether it ends a name in a tag. */
constexpr std::array<bool, 256> MakeNameEnds() noexcept
{
    std::array<bool, 256> ends{};
    for (const char byte : {' ', '\t', '\n', '\r', '=', '/'}) {
        ends[static_cast<unsigned char>(byte)] = true;
    }
    return ends;
}
constexpr std::array<bool, 256> NameEnds = MakeNameEnds();

/** Takes a name off the front of a tag's text. The parser has found the tag well-formed. */
std::string_view TakeName(std::string_view& text) noexcept
{
    const auto* end = std::find_if(text.begin(), text.end(), [](char byte) {
        return NameEnds[static_cast<unsigned char>(byte)];
    });
    const auto length = static_cast<std::size_t>(end - text.begin());
    const std::string_view name = text.substr(0, length);
    text.remove_prefix(length);
    return name;
}

/** The tag was read twice, by the parser and here, with different results. */
[[noreturn]] void ThrowUnlikeTheParser()
{
    throw XMLParseException("A tag is not what the parser found in it");
}

/** Takes `= "value"` off the front of a tag's text, and gives the value as it is written. */
std::string_view TakeRawValue(std::string_view& text)
{
    SkipBlanks(text);
    text.remove_prefix(std::min<std::size_t>(1, text.size()));
    SkipBlanks(text);
    const std::size_t close = text.empty() ? std::string_view::npos : text.find(text.front(), 1);
    if (close == std::string_view::npos) {
        ThrowUnlikeTheParser();
    }
    const std::string_view value = text.substr(1, close - 1);
    text.remove_prefix(close + 1);
    return value;
}

std::uint32_t CountDeclarations(const ElementNode& element) noexcept
{
    const AttributeRange attributes = element.GetAttributes();
    return static_cast<std::uint32_t>(
        std::count_if(attributes.begin(), attributes.end(), [](const Attribute& attribute) {
            return attribute.IsNamespaceDeclaration();
        }));
}

} // namespace

TreeBuilder::TreeBuilder(Ref<Arena> arena, std::string_view source)
    : _arena(std::move(arena))
    , _source(source)
{
    _attributes.reserve(UsualAttributes);
}

void TreeBuilder::StartElement(const TagEvent& tag)
{
    FlushText();
    // The parser reports the tag first, and only then misses its end.
    if (tag.tagEnd == _source.data() + _source.size()) {
        throw XMLParseException("The document ends inside a tag");
    }
    if (!IsInSource(std::string_view(tag.tagEnd, 1))) {
        ThrowUnlikeTheParser();
    }
    // A tag holds no `<` but its first, so the one before the end is its start [XML 3.1].
    const std::size_t length = static_cast<std::size_t>(tag.tagEnd - _source.data());
    const auto* start = static_cast<const char*>(memrchr(_source.data(), '<', length));
    if (start == nullptr) {
        throw XMLParseException("A tag does not start where the parser found one");
    }
    const std::string_view text(start + 1, static_cast<std::size_t>(tag.tagEnd - start) - 1);

    ElementNode* element = MakeElement(text, tag);
    element->_offset = static_cast<std::uint32_t>(start - _source.data());
    EnterNamespaces(*element);
    Link(element);
    if (_current == nullptr) {
        _root = element;
    }
    _current = element;
    if (++_depth > ParserLimits::MaxDepth) {
        throw XMLParseException(
            "More than " + std::to_string(ParserLimits::MaxDepth) + " elements inside one another");
    }
}

/** The thousand values of one attribute have one tag: it is read once, and its parts are shared. */
ElementNode* TreeBuilder::MakeElement(std::string_view text, const TagEvent& tag)
{
    if (_lastElement != nullptr && text == _lastTag) {
        return _arena->NewElementLike(*_lastElement);
    }
    _lastTag = text;
    std::string_view rest = text;
    _lastElement = _arena->NewElement(TakeName(rest));
    ReadAttributes(*_lastElement, rest, tag);
    return _lastElement;
}

void TreeBuilder::EndElement()
{
    FlushText();
    if (_current->_declaresNamespaces) {
        _namespacesInScope -= CountDeclarations(*_current);
    }
    _current = _current->_parent;
    --_depth;
}

void TreeBuilder::Characters(std::string_view text)
{
    if (_current == nullptr || text.empty()) {
        return;
    }
    if (!_isMixed && _run.empty() && IsInSource(text)) {
        _run = text;
    } else if (!_isMixed && _run.data() + _run.size() == text.data()) {
        _run = {_run.data(), _run.size() + text.size()};
    } else {
        if (!_isMixed) {
            _mixedRun.assign(_run);
            _isMixed = true;
        }
        _mixedRun.append(text);
    }
}

void TreeBuilder::Comment(std::string_view text)
{
    FlushText();
    Link(_arena->NewComment(Keep(text)));
}

void TreeBuilder::ProcessingInstruction(std::string_view target, std::string_view data)
{
    FlushText();
    Link(_arena->NewProcessingInstruction(Keep(target), Keep(data)));
}

ElementNode* TreeBuilder::Finish()
{
    return _root;
}

void TreeBuilder::FlushText()
{
    if (_isMixed) {
        Link(_arena->NewText(_arena->CopyText(_mixedRun)));
        _mixedRun.clear();
        _isMixed = false;
    } else if (!_run.empty()) {
        Link(_arena->NewText(_run));
    }
    _run = {};
}

void TreeBuilder::Link(Node* node)
{
    node->_parent = _current;
    if (_current != nullptr) {
        Node*& last = _current->_lastChild;
        (last == nullptr ? _current->_firstChild : last->_nextSibling) = node;
        last = node;
        return;
    }
    if (_lastTopLevel == nullptr) {
        _arena->SetFirstTopLevel(node);
    } else {
        _lastTopLevel->_nextSibling = node;
    }
    _lastTopLevel = node;
}

bool TreeBuilder::IsInSource(std::string_view text) const noexcept
{
    const std::less_equal<> notAfter;
    return notAfter(_source.data(), text.data())
           && notAfter(text.data() + text.size(), _source.data() + _source.size());
}

std::string_view TreeBuilder::Keep(std::string_view text)
{
    return IsInSource(text) ? text : _arena->CopyText(text);
}

void TreeBuilder::ReadAttributes(ElementNode& element, std::string_view text, TagEvent tag)
{
    _attributes.clear();
    for (SkipBlanks(text); !text.empty() && text.front() != '/'; SkipBlanks(text)) {
        Attribute attribute{TakeName(text), {}};
        const std::string_view raw = TakeRawValue(text);
        if (attribute.IsNamespaceDeclaration()) {
            element._declaresNamespaces = true;
            attribute.value =
                attribute.name == "xmlns:xml" ? XmlNamespace : TakeNamespace(raw, tag);
        } else {
            attribute.value = TakeAttribute(raw, tag);
        }
        _attributes.push_back(attribute);
    }
    if (tag.namespaceCount != 0 || tag.attributeCount != 0) {
        ThrowUnlikeTheParser();
    }
    if (_attributes.empty()) {
        return;
    }
    auto* memory =
        static_cast<Attribute*>(_arena->Allocate(_attributes.size() * sizeof(Attribute)));
    std::uninitialized_copy(_attributes.begin(), _attributes.end(), memory);
    element._attributes = memory;
    element._attributeCount = static_cast<std::uint32_t>(_attributes.size());
}

std::string_view TreeBuilder::TakeNamespace(std::string_view raw, TagEvent& tag)
{
    if (tag.namespaceCount == 0) {
        ThrowUnlikeTheParser();
    }
    const std::string_view uri = ToView(tag.namespaces[1]);
    tag.namespaces += 2;
    --tag.namespaceCount;
    return uri == raw ? raw : _arena->CopyText(uri);
}

std::string_view TreeBuilder::TakeAttribute(std::string_view raw, TagEvent& tag)
{
    if (tag.attributeCount == 0) {
        ThrowUnlikeTheParser();
    }
    const auto* begin = reinterpret_cast<const char*>(tag.attributes[3]);
    const auto* end = reinterpret_cast<const char*>(tag.attributes[4]);
    tag.attributes += 5;
    --tag.attributeCount;
    // The parser points into the text where the value stands there as it is.
    return begin == raw.data() && end == raw.data() + raw.size()
               ? raw
               : _arena->CopyText({begin, static_cast<std::size_t>(end - begin)});
}

void TreeBuilder::EnterNamespaces(const ElementNode& element)
{
    if (!element._declaresNamespaces) {
        return;
    }
    const std::uint32_t declared = CountDeclarations(element);
    if (declared > ParserLimits::MaxNamespaces) {
        throw XMLParseException(
            "More than " + std::to_string(ParserLimits::MaxNamespaces)
            + " namespaces declared by one element");
    }
    _namespacesInScope += declared;
    if (_namespacesInScope > ParserLimits::MaxNamespacesInScope) {
        throw XMLParseException(
            "More than " + std::to_string(ParserLimits::MaxNamespacesInScope)
            + " namespaces in scope");
    }
}

} // namespace Quillon::Xml
