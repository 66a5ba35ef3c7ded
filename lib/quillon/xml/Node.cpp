#include "quillon/xml/Node.h"

#include "core/quote.h"
#include "quillon/Exceptions.h"
#include "xml/Arena.h"
#include "xml/characters.h"

#include <algorithm>
#include <limits>

namespace Quillon::Xml {

namespace {

constexpr std::string_view XmlnsPrefix = "xmlns:";

std::string JoinName(std::string_view prefix, std::string_view localName)
{
    std::string name;
    name.reserve(prefix.size() + 1 + localName.size());
    if (!prefix.empty()) {
        name.append(prefix).push_back(':');
    }
    return name.append(localName);
}

/** Whether `attribute` declares `prefix`, the empty one being the default namespace. */
bool Declares(const Attribute& attribute, std::string_view prefix) noexcept
{
    if (!attribute.IsNamespaceDeclaration()) {
        return false;
    }
    return prefix.empty() ? attribute.name.size() == XmlnsPrefix.size() - 1
                          : attribute.name.size() == XmlnsPrefix.size() + prefix.size()
                                && attribute.name.substr(XmlnsPrefix.size()) == prefix;
}

const Attribute* FindDeclaration(const AttributeRange& attributes, std::string_view prefix) noexcept
{
    for (const Attribute& attribute : attributes) {
        if (Declares(attribute, prefix)) {
            return &attribute;
        }
    }
    return nullptr;
}

} // namespace

const char* ToString(NodeType type) noexcept
{
    switch (type) {
    case NodeType::ELEMENT:
        return "element";
    case NodeType::TEXT:
        return "text";
    case NodeType::COMMENT:
        return "comment";
    case NodeType::PROCESSING_INSTRUCTION:
        break;
    }
    return "processing instruction";
}

void intrusive_ptr_add_ref(const Node* node) noexcept
{
    intrusive_ptr_add_ref(node->_arena);
}

void intrusive_ptr_release(const Node* node) noexcept
{
    intrusive_ptr_release(node->_arena);
}

Node* Node::GetFirstChild() const noexcept
{
    return _type == NodeType::ELEMENT ? static_cast<const ElementNode*>(this)->GetFirstChild()
                                      : nullptr;
}

void TextNode::SetText(std::string_view text)
{
    if (const auto fault = FindCharacterFault(text)) {
        throw InvalidArgumentException(
            (_parent == nullptr ? "The text" : "The text of element " + Quote(_parent->GetName()))
            + " " + *fault);
    }
    _text = _arena->CopyText(text);
}

std::string_view Attribute::GetPrefix() const noexcept
{
    const std::size_t colon = name.find(':');
    return colon == std::string_view::npos ? std::string_view() : name.substr(0, colon);
}

std::string_view Attribute::GetLocalName() const noexcept
{
    const std::size_t colon = name.find(':');
    return colon == std::string_view::npos ? name : name.substr(colon + 1);
}

ElementNode::ElementNode(Arena* arena, std::string_view name) noexcept
    : Node(NodeType::ELEMENT, arena)
    , _name(name)
{
    const std::size_t colon = name.find(':');
    _prefixLength = colon == std::string_view::npos ? 0 : static_cast<std::uint32_t>(colon);
}

ElementNode::ElementNode(Arena* arena, const ElementNode& sameTag) noexcept
    : Node(NodeType::ELEMENT, arena)
    , _name(sameTag._name)
    , _attributes(sameTag._attributes)
    , _attributeCount(sameTag._attributeCount)
    , _prefixLength(sameTag._prefixLength)
{
    _declaresNamespaces = sameTag._declaresNamespaces;
}

unsigned ElementNode::GetLine() const noexcept
{
    const std::string_view source = _arena->GetSource();
    if (source.empty()) {
        return 0;
    }
    const auto* begin = source.data();
    return static_cast<unsigned>(std::count(begin, begin + _offset, '\n')) + 1;
}

unsigned ElementNode::GetColumn() const noexcept
{
    const std::string_view before = _arena->GetSource().substr(0, _offset);
    if (_arena->GetSource().empty()) {
        return 0;
    }
    const std::size_t newLine = before.rfind('\n');
    return static_cast<unsigned>(
        newLine == std::string_view::npos ? before.size() + 1 : before.size() - newLine);
}

bool ElementNode::LookupNamespace(std::string_view prefix, std::string_view& uri) const noexcept
{
    for (const ElementNode* element = this; element != nullptr; element = element->_parent) {
        if (!element->_declaresNamespaces) {
            continue;
        }
        if (const Attribute* found = FindDeclaration(element->GetAttributes(), prefix)) {
            uri = found->value;
            return true;
        }
    }
    if (prefix == "xml") {
        uri = XmlNamespace;
        return true;
    }
    return false;
}

bool ElementNode::HasQName(std::string_view localName, std::string_view namespaceUri) const noexcept
{
    std::string_view uri;
    return GetLocalName() == localName && (LookupNamespace(GetPrefix(), uri) || GetPrefix().empty())
           && uri == namespaceUri;
}

std::map<std::string, std::string> ElementNode::GetAttributeMap() const
{
    std::map<std::string, std::string> attributes;
    for (const Attribute& attribute : GetAttributes()) {
        attributes.emplace(attribute.name, attribute.value);
    }
    return attributes;
}

const Attribute* ElementNode::FindAttribute(std::string_view name) const noexcept
{
    for (const Attribute& attribute : GetAttributes()) {
        if (attribute.name == name) {
            return &attribute;
        }
    }
    return nullptr;
}

const Attribute* ElementNode::FindAttribute(
    std::string_view localName, std::string_view namespaceUri) const noexcept
{
    for (const Attribute& attribute : GetAttributes()) {
        if (attribute.IsNamespaceDeclaration() || attribute.GetLocalName() != localName) {
            continue;
        }
        // An unprefixed attribute is in no namespace [XML Names 6.2].
        std::string_view uri;
        const std::string_view prefix = attribute.GetPrefix();
        if ((prefix.empty() || LookupNamespace(prefix, uri)) && uri == namespaceUri) {
            return &attribute;
        }
    }
    return nullptr;
}

bool ElementNode::GetAttribute(std::string_view name, std::string& value) const
{
    const Attribute* attribute = FindAttribute(name);
    if (attribute == nullptr) {
        return false;
    }
    value = attribute->value;
    return true;
}

ElementNode* ElementNode::FindChildElement(std::string_view localName) const noexcept
{
    for (Node* child = _firstChild; child != nullptr; child = child->GetNextSibling()) {
        ElementNode* element = AsElement(child);
        if (element != nullptr && element->GetLocalName() == localName) {
            return element;
        }
    }
    return nullptr;
}

ElementNode* ElementNode::FindChildElement(
    std::string_view localName, std::string_view namespaceUri) const noexcept
{
    for (Node* child = _firstChild; child != nullptr; child = child->GetNextSibling()) {
        ElementNode* element = AsElement(child);
        if (element != nullptr && element->HasQName(localName, namespaceUri)) {
            return element;
        }
    }
    return nullptr;
}

void ElementNode::DefineAttribute(std::string_view name, std::string_view value)
{
    if (const auto fault = FindCharacterFault(value)) {
        throw InvalidArgumentException("The value of attribute " + Quote(name) + " " + *fault);
    }
    const std::string_view ownValue = _arena->CopyText(value);
    if (_attributeCapacity < _attributeCount) {
        OwnAttributes(_attributeCount);
    }
    for (std::uint32_t i = 0; i < _attributeCount; ++i) {
        if (_attributes[i].name == name) {
            _attributes[i].value = ownValue;
            return;
        }
    }
    if (_attributeCount == _attributeCapacity) {
        OwnAttributes(std::max<std::uint32_t>(2, 2 * _attributeCapacity));
    }
    Attribute* attribute =
        new (_attributes + _attributeCount) Attribute{_arena->CopyText(name), ownValue};
    ++_attributeCount;
    _declaresNamespaces = _declaresNamespaces || attribute->IsNamespaceDeclaration();
}

/** Puts the attributes where there is room for as many, and where only this element uses them. */
void ElementNode::OwnAttributes(std::uint32_t capacity)
{
    auto* attributes = static_cast<Attribute*>(_arena->Allocate(capacity * sizeof(Attribute)));
    std::uninitialized_copy_n(_attributes, _attributeCount, attributes);
    _attributes = attributes;
    _attributeCapacity = capacity;
}

void ElementNode::AppendChild(Node* child)
{
    for (const ElementNode* ancestor = this; ancestor != nullptr; ancestor = ancestor->_parent) {
        if (ancestor == child) {
            throw InvalidArgumentException("An element cannot be appended to itself");
        }
    }
    if (child->_parent != nullptr) {
        child->_parent->RemoveChild(child);
    } else {
        child->_arena->RemoveTopLevel(child);
    }
    Arena& arena = _arena->GetRoot();
    Arena& childArena = child->_arena->GetRoot();
    if (&arena != &childArena) {
        arena.Merge(childArena);
    }
    child->_parent = this;
    child->_nextSibling = nullptr;
    (_lastChild == nullptr ? _firstChild : _lastChild->_nextSibling) = child;
    _lastChild = child;
}

void ElementNode::RemoveChild(Node* child) noexcept
{
    Node* previous = nullptr;
    for (Node* node = _firstChild; node != child; node = node->_nextSibling) {
        previous = node;
    }
    (previous == nullptr ? _firstChild : previous->_nextSibling) = child->_nextSibling;
    if (_lastChild == child) {
        _lastChild = previous;
    }
    child->_parent = nullptr;
    child->_nextSibling = nullptr;
}

void CreateElementNode(std::string_view prefix, std::string_view localName, Ref<ElementNode>& out)
{
    const Ref<Arena> arena = Arena::Create(ArenaContent::COMPOSED);
    out = arena->NewElement(arena->CopyText(JoinName(prefix, localName)));
}

void CreateTextNode(Ref<TextNode>& out)
{
    const Ref<Arena> arena = Arena::Create(ArenaContent::COMPOSED);
    out = arena->NewText({});
}

} // namespace Quillon::Xml
