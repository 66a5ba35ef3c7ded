#pragma once

#include "quillon/Reader.h"
#include "quillon/system/DateTime.h"
#include "quillon/xml/Node.h"
#include "quillon/xml/QName.h"

#include <boost/optional.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

/**
 * Strict, forward-only reading of a tree. A parser takes an iterator on its element, checks the
 * name, then the attribute set, reads the attributes, walks the children in their fixed order and
 * demands that none is left. Whatever deviates is a `ParseException`.
 *
 * Thread safety: everything here only reads the tree.
 */
namespace SsoClient {

/** Decides which nodes an iterator sees. */
class NodeFilter
{
public:
    virtual bool Accept(Quillon::Xml::Node* node) const = 0;

protected:
    ~NodeFilter() = default;
};

/** Hides comments, and text of nothing but white space. */
class SkipWsAndCommentsFilter final : public NodeFilter
{
public:
    bool Accept(Quillon::Xml::Node* node) const override;
};

/** A position among the children of an element; at end when it has no current node. */
class NodeFilterIterator
{
public:
    /** Stands on `start` itself, whether the filter accepts it or not. */
    NodeFilterIterator(
        Quillon::Xml::Node* start, const boost::shared_ptr<const NodeFilter>& filter);

    /** Moves to the first accepted child of the current node. Must not be at end. */
    NodeFilterIterator& MoveToChild();

    /** Moves to the next accepted sibling. Must not be at end. */
    NodeFilterIterator& MoveToSibling();

    /** A copy of this iterator, moved to the first accepted child. */
    NodeFilterIterator GetChild() const;

    /** The first accepted child of the current node, null if there is none. */
    Quillon::Xml::Node* FirstChild() const;

    bool IsAtEnd() const noexcept { return _current == nullptr; }
    Quillon::Xml::Node* GetNode() const noexcept { return _current; }

    /** The first of `node` and its following siblings that the filter accepts; null if none. */
    Quillon::Xml::Node* FirstAccepted(Quillon::Xml::Node* node) const;

private:
    Quillon::Xml::Node* _current;
    boost::shared_ptr<const NodeFilter> _filter;
};

/** The iterator's element; null if it is at end or on another kind of node. */
Quillon::Xml::ElementNode* IteratorToElement(const NodeFilterIterator& iterator) noexcept;

/** A name in no namespace. */
Quillon::Xml::QName LocalName(const char* name);

/** Whether `element` is there and has that name; its prefix must resolve. */
bool ElementQNameIs(
    const Quillon::Xml::ElementNode* element,
    std::string_view localName,
    std::string_view namespaceUri) noexcept;
void RequireElementQName(
    const Quillon::Xml::ElementNode* element,
    std::string_view localName,
    std::string_view namespaceUri);

/** Whether the element has an `xsi:type` that names `type`. @throws ParseException */
bool ElementXsiTypeIs(const Quillon::Xml::ElementNode* element, const Quillon::Xml::QName& type);

/** Expands a name by the declarations in scope at `element`. @throws ParseException */
void ResolveQName(
    const Quillon::Xml::ElementNode* element,
    std::string_view qname,
    std::string_view defaultNamespace,
    Quillon::Xml::QName& result);

/** Expands a name as `xsi:type` writes it: without prefix it lies in the default namespace. */
void ResolveTypeName(
    const Quillon::Xml::ElementNode* element, std::string_view qname, Quillon::Xml::QName& result);

void RequireEmptyElement(const NodeFilterIterator& iterator);

/** Gives the element's only text as it is written, blanks included. */
void RequireTextualContent(const NodeFilterIterator& iterator, std::string& text);

/** Throws "Unexpected elements after `predecessor`" unless the iterator is at end. */
void RequireNothingAfter(const NodeFilterIterator& iterator, const char* predecessor);

/** Checks an attribute set by names as they are written; declarations are always allowed. */
void RequireElementAttributesNames(
    const Quillon::Xml::ElementNode* element,
    std::initializer_list<std::string_view> required,
    std::initializer_list<std::string_view> optional);
void RequireNoAttributes(const Quillon::Xml::ElementNode* element);

/** The same by expanded names. */
void RequireElementAttributesQNames(
    const Quillon::Xml::ElementNode* element,
    const std::vector<Quillon::Xml::QName>& required,
    const std::vector<Quillon::Xml::QName>& optional);

/** The attribute's value; empty if it is absent. Lives as long as the tree. */
std::string_view GetTextAttribute(
    const Quillon::Xml::ElementNode* element, std::string_view name) noexcept;
void GetDateAttribute(
    const Quillon::Xml::ElementNode* element, const char* name, Quillon::System::DateTime& out);
void GetBoolAttribute(const Quillon::Xml::ElementNode* element, const char* name, bool& out);

/** Leaves `out` as it is if the attribute is absent. */
void GetULongOptionalAttribute(
    const Quillon::Xml::ElementNode* element,
    const char* name,
    boost::optional<unsigned long long>& out);

/** @throws Quillon::Xml::XMLParseException */
void ParseXML(Quillon::Reader* reader, Quillon::Ref<Quillon::Xml::Document>& doc);
void ParseXML(const std::string& text, Quillon::Ref<Quillon::Xml::Document>& doc);

/** The node's very first child if that is text; null otherwise. */
const Quillon::Xml::TextNode* GetTextNode(const Quillon::Xml::Node* node) noexcept;

/** Empty for null. */
std::string GetText(const Quillon::Xml::TextNode* node);

/** The text that an element starts with; empty for no element and for one without such a text. */
std::string GetElementText(const Quillon::Xml::ElementNode* element);

/** The element as text in the canonical form that `algorithm` names. */
std::string ToCanonicalXml(const Quillon::Xml::ElementNode* element, const std::string& algorithm);

} // namespace SsoClient
