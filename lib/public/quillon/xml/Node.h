#pragma once

#include "quillon/Ref.h"

#include <cstdint>
#include <map>
#include <string>
#include <string_view>

/**
 * One lexical tree for everything: it is parsed, composed, read, canonicalized, signed and
 * verified, so that what was verified is, node for node, what is read.
 *
 * Nodes keep names as they are written; namespace declarations are ordinary attributes, and a
 * prefix is looked up through the ancestors when it is asked for. All nodes live in an arena: a
 * `Ref` to any node keeps the whole tree alive that the node stands in. Text handed out as
 * `std::string_view` lives as long as the tree.
 *
 * Thread safety: reading, and taking and giving back references, from any number of threads;
 * changing (`DefineAttribute`, `AppendChild`, `SetText`) only while no other thread uses the
 * trees involved.
 */
namespace Quillon::Xml {

class Arena;
class ElementNode;

/** What the prefix `xml` is bound to [XML Names 3]. */
inline constexpr std::string_view XmlNamespace = "http://www.w3.org/XML/1998/namespace";

enum class NodeType : std::uint8_t
{
    ELEMENT,
    TEXT,
    COMMENT,
    PROCESSING_INSTRUCTION
};

/** The name of a kind of node, for messages. */
QUILLON_API const char* ToString(NodeType type) noexcept;

class QUILLON_API Node
{
public:
    Node(const Node&) = delete;
    Node& operator=(const Node&) = delete;

    NodeType GetNodeType() const noexcept { return _type; }

    /** The element around this node; null for a root and for what stands outside the root. */
    ElementNode* GetParent() const noexcept { return _parent; }

    /** The node after this one under the same parent; null after the last. */
    Node* GetNextSibling() const noexcept { return _nextSibling; }

    /** The first child of an element; null for an empty element and for every other node. */
    Node* GetFirstChild() const noexcept;

    friend QUILLON_API void intrusive_ptr_add_ref(const Node* node) noexcept;
    friend QUILLON_API void intrusive_ptr_release(const Node* node) noexcept;

protected:
    Node(NodeType type, Arena* arena) noexcept
        : _arena(arena)
        , _type(type)
    {}
    ~Node() = default;

private:
    friend class Arena;
    friend class ElementNode;
    friend class TextNode;
    friend class TreeBuilder;

    Arena* _arena;
    ElementNode* _parent = nullptr;
    Node* _nextSibling = nullptr;
    NodeType _type;

protected:
    bool _declaresNamespaces = false; // of ElementNode; stands here to fill the gap
    std::uint32_t _offset = 0;        // of ElementNode: where its tag starts in the parsed text
};

/** Character data; adjacent text and CDATA of a document are one node. */
class QUILLON_API TextNode : public Node
{
public:
    std::string_view GetText() const noexcept { return _text; }

    /**
     * Replaces the text. It is kept as given; escaping is the writer's concern.
     *
     * @throws InvalidArgumentException  the text is not UTF-8, or holds a character that XML does
     *                                   not allow [XML 2.2]. Says at which octet, never the text.
     */
    void SetText(std::string_view text);

private:
    friend class Arena;
    friend class TreeBuilder;

    explicit TextNode(Arena* arena, std::string_view text = {}) noexcept
        : Node(NodeType::TEXT, arena)
        , _text(text)
    {}

    std::string_view _text;
};

class QUILLON_API CommentNode : public Node
{
public:
    std::string_view GetText() const noexcept { return _text; }

private:
    friend class Arena;

    CommentNode(Arena* arena, std::string_view text) noexcept
        : Node(NodeType::COMMENT, arena)
        , _text(text)
    {}

    std::string_view _text;
};

class QUILLON_API ProcessingInstructionNode : public Node
{
public:
    std::string_view GetTarget() const noexcept { return _target; }
    std::string_view GetData() const noexcept { return _data; }

private:
    friend class Arena;

    ProcessingInstructionNode(Arena* arena, std::string_view target, std::string_view data) noexcept
        : Node(NodeType::PROCESSING_INSTRUCTION, arena)
        , _target(target)
        , _data(data)
    {}

    std::string_view _target;
    std::string_view _data;
};

/** One attribute or namespace declaration, with its name as written. */
struct QUILLON_API Attribute
{
    std::string_view name;
    std::string_view value;

    /** The text before the colon of the name; empty if it has none. */
    std::string_view GetPrefix() const noexcept;
    std::string_view GetLocalName() const noexcept;

    /** Whether this is `xmlns` or `xmlns:prefix`. */
    bool IsNamespaceDeclaration() const noexcept
    {
        constexpr std::string_view Xmlns = "xmlns";
        return name.size() >= Xmlns.size()
               && std::char_traits<char>::compare(name.data(), Xmlns.data(), Xmlns.size()) == 0
               && (name.size() == Xmlns.size() || name[Xmlns.size()] == ':');
    }
};

/** A view of an element's attributes in the order in which they are written. */
class AttributeRange
{
public:
    AttributeRange(const Attribute* first, std::size_t count) noexcept
        : _first(first)
        , _count(count)
    {}
    const Attribute* begin() const noexcept { return _first; }
    const Attribute* end() const noexcept { return _first + _count; }
    std::size_t size() const noexcept { return _count; }
    bool empty() const noexcept { return _count == 0; }

private:
    const Attribute* _first;
    std::size_t _count;
};

class QUILLON_API ElementNode : public Node
{
public:
    /** The name as written, `prefix:local` or `local`. */
    std::string_view GetName() const noexcept { return _name; }
    std::string_view GetPrefix() const noexcept
    {
        return _prefixLength == 0 ? std::string_view() : _name.substr(0, _prefixLength);
    }
    std::string_view GetLocalName() const noexcept
    {
        return _prefixLength == 0 ? _name : _name.substr(_prefixLength + 1);
    }

    /**
     * Where the element's tag starts in the parsed text, from 1, the column in octets; 0 for a
     * composed element.
     */
    unsigned GetLine() const noexcept;
    unsigned GetColumn() const noexcept;

    /**
     * Looks `prefix` up among the declarations of this element and its ancestors; the empty
     * prefix is the default namespace. `xml` is always bound [XML Names 3].
     *
     * @return false, and `uri` untouched, if nothing declares it.
     */
    bool LookupNamespace(std::string_view prefix, std::string_view& uri) const noexcept;

    /** Whether the element has the local name and its prefix resolves to `namespaceUri`. */
    bool HasQName(std::string_view localName, std::string_view namespaceUri) const noexcept;

    /**
     * Whether this is known to have the parent, the name and the attributes of `sibling`, as the
     * values of one attribute have. If not, it may have them all the same.
     */
    bool RepeatsTagOf(const ElementNode& sibling) const noexcept
    {
        return GetParent() == sibling.GetParent() && _name.data() == sibling._name.data()
               && _attributes == sibling._attributes;
    }

    /** Whether any of the attributes is a namespace declaration. */
    bool DeclaresNamespaces() const noexcept { return _declaresNamespaces; }

    AttributeRange GetAttributes() const noexcept { return {_attributes, _attributeCount}; }

    /** All attributes, declarations included, by their names as written. */
    std::map<std::string, std::string> GetAttributeMap() const;

    /** Finds an attribute by its name as written. @return null if there is none. */
    const Attribute* FindAttribute(std::string_view name) const noexcept;

    /** Finds an attribute by local name and namespace (empty for none); null if there is none. */
    const Attribute* FindAttribute(
        std::string_view localName, std::string_view namespaceUri) const noexcept;

    /** Gets an attribute by its name as written. @return whether it is there. */
    bool GetAttribute(std::string_view name, std::string& value) const;

    /** The first child element with that local name, in whatever namespace; null if none. */
    ElementNode* FindChildElement(std::string_view localName) const noexcept;
    ElementNode* FindChildElement(
        std::string_view localName, std::string_view namespaceUri) const noexcept;

    Node* GetFirstChild() const noexcept { return _firstChild; }

    /**
     * Sets the attribute of that written name, after the existing ones or in its old place.
     *
     * @throws InvalidArgumentException  the value is not UTF-8, or holds a character that XML does
     *                                   not allow [XML 2.2]. Says at which octet, never the value.
     */
    void DefineAttribute(std::string_view name, std::string_view value);

    /**
     * Makes `child` the last child of this element, and its tree part of this one. A child that
     * stands under another parent leaves it.
     *
     * @throws InvalidArgumentException  `child` is this element or one of its ancestors.
     */
    void AppendChild(Node* child);

private:
    friend class Arena;
    friend class TreeBuilder;

    ElementNode(Arena* arena, std::string_view name) noexcept;
    ElementNode(Arena* arena, const ElementNode& sameTag) noexcept;

    void RemoveChild(Node* child) noexcept;
    void OwnAttributes(std::uint32_t capacity);

    std::string_view _name;
    Attribute* _attributes = nullptr;
    std::uint32_t _attributeCount = 0;
    std::uint32_t _attributeCapacity = 0; // below the count: other elements may use them too
    std::uint32_t _prefixLength = 0;
    Node* _firstChild = nullptr;
    Node* _lastChild = nullptr;
};

/** The result of a parse: the root element and what stands beside it. Immutable by itself. */
class QUILLON_API Document : public RefCounted
{
public:
    /** Never null. */
    virtual ElementNode* GetRootElement() const noexcept = 0;

    /** The first node of the document: a comment, a processing instruction or the root. */
    virtual Node* GetFirstChild() const noexcept = 0;
};

/** Creates an element without attributes; an empty prefix gives an unprefixed name. */
QUILLON_API void CreateElementNode(
    std::string_view prefix, std::string_view localName, Ref<ElementNode>& out);

/** Creates an empty text node. */
QUILLON_API void CreateTextNode(Ref<TextNode>& out);

/** The node as an element, text or comment; null if it is null or another kind of node. */
inline ElementNode* AsElement(Node* node) noexcept
{
    return node != nullptr && node->GetNodeType() == NodeType::ELEMENT
               ? static_cast<ElementNode*>(node)
               : nullptr;
}
inline const ElementNode* AsElement(const Node* node) noexcept
{
    return AsElement(const_cast<Node*>(node));
}
inline const TextNode* AsText(const Node* node) noexcept
{
    return node != nullptr && node->GetNodeType() == NodeType::TEXT
               ? static_cast<const TextNode*>(node)
               : nullptr;
}

} // namespace Quillon::Xml
