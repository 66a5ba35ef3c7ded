#include "ssoClient/wire/xmlReading.h"

#include "quillon/PanicVerify.h"
#include "quillon/StringUtil.h"
#include "quillon/xml/Parser.h"
#include "quillon/xml/security/Canonicalizer.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/assertionPlaces.h"
#include "ssoClient/wire/wireNames.h"

#include <algorithm>
#include <charconv>

namespace SsoClient {

using Quillon::Xml::AsElement;
using Quillon::Xml::AsText;
using Quillon::Xml::Attribute;
using Quillon::Xml::ElementNode;
using Quillon::Xml::Node;
using Quillon::Xml::NodeType;
using Quillon::Xml::QName;
using Quillon::Xml::TextNode;

namespace {

constexpr std::string_view XmlWhiteSpace = "\t\n\r ";

[[noreturn]] void ThrowMissingAttribute(const ElementNode* element, std::string_view name)
{
    throw ParseException(
        "Node '" + std::string(element->GetLocalName()) + " is missing required attribute '"
        + std::string(name) + "'");
}

template <class Range, class Value>
bool Contains(const Range& range, const Value& value)
{
    return std::find(range.begin(), range.end(), value) != range.end();
}

std::vector<const Attribute*> AttributesSortedByName(const ElementNode* element)
{
    std::vector<const Attribute*> attributes;
    for (const Attribute& attribute : element->GetAttributes()) {
        if (!attribute.IsNamespaceDeclaration()) {
            attributes.push_back(&attribute);
        }
    }
    std::sort(attributes.begin(), attributes.end(), [](const Attribute* a, const Attribute* b) {
        return a->name < b->name;
    });
    return attributes;
}

void ThrowFirstMissing(
    const ElementNode* element,
    const std::vector<QName>& required,
    const std::vector<QName>& present)
{
    const auto missing = std::find_if(required.begin(), required.end(), [&](const QName& name) {
        return !Contains(present, name);
    });
    if (missing == required.end()) {
        Quillon::PanicVerify(
            "missing != required.end()",
            AssertionPlaces::XmlReading,
            AssertionPlaces::NoMissingAttribute);
    }
    const std::string& namespaceUri = missing->GetNamespaceUri();
    ThrowMissingAttribute(
        element,
        namespaceUri.empty() ? missing->GetLocalName()
                             : namespaceUri + ":" + missing->GetLocalName());
}

[[noreturn]] void ThrowBadValue(const ElementNode* element, const char* name, const char* problem)
{
    throw ParseException(std::string(element->GetLocalName()) + "/@" + name + problem);
}

/** Reads a decimal integer with an optional sign; false if it is not one or does not fit. */
bool ReadInteger(std::string_view text, long long& value) noexcept
{
    if (text.size() > 1 && text[0] == '+' && text[1] != '-') {
        text.remove_prefix(1);
    }
    const char* end = text.data() + text.size();
    const std::from_chars_result result = std::from_chars(text.data(), end, value);
    return result.ec == std::errc() && result.ptr == end;
}

} // namespace

bool SkipWsAndCommentsFilter::Accept(Node* node) const
{
    if (const TextNode* text = AsText(node)) {
        return text->GetText().find_first_not_of(XmlWhiteSpace) != std::string_view::npos;
    }
    return node->GetNodeType() != NodeType::COMMENT;
}

NodeFilterIterator::NodeFilterIterator(
    Node* start, const boost::shared_ptr<const NodeFilter>& filter)
    : _current(start)
    , _filter(filter)
{}

NodeFilterIterator& NodeFilterIterator::MoveToChild()
{
    _current = FirstChild();
    return *this;
}

NodeFilterIterator& NodeFilterIterator::MoveToSibling()
{
    _current = FirstAccepted(_current->GetNextSibling());
    return *this;
}

NodeFilterIterator NodeFilterIterator::GetChild() const
{
    NodeFilterIterator child(*this);
    child.MoveToChild();
    return child;
}

Node* NodeFilterIterator::FirstChild() const
{
    return FirstAccepted(_current->GetFirstChild());
}

Node* NodeFilterIterator::FirstAccepted(Node* node) const
{
    while (node != nullptr && !_filter->Accept(node)) {
        node = node->GetNextSibling();
    }
    return node;
}

ElementNode* IteratorToElement(const NodeFilterIterator& iterator) noexcept
{
    return AsElement(iterator.GetNode());
}

QName LocalName(const char* name)
{
    return {std::string(), name};
}

bool ElementQNameIs(
    const ElementNode* element, std::string_view localName, std::string_view namespaceUri) noexcept
{
    return element != nullptr && element->HasQName(localName, namespaceUri);
}

void RequireElementQName(
    const ElementNode* element, std::string_view localName, std::string_view namespaceUri)
{
    if (element == nullptr || element->GetLocalName() != localName) {
        throw ParseException("Expected element '" + std::string(localName) + "' not found.");
    }
    if (!element->HasQName(localName, namespaceUri)) {
        throw ParseException("Element '" + std::string(localName) + "' has unexpected namespace");
    }
}

bool ElementXsiTypeIs(const ElementNode* element, const QName& type)
{
    const Attribute* attribute = element->FindAttribute("type", Wire::XsiNamespace);
    if (attribute == nullptr) {
        return false;
    }
    QName found;
    ResolveTypeName(element, attribute->value, found);
    return found == type;
}

void ResolveQName(
    const ElementNode* element,
    std::string_view qname,
    std::string_view defaultNamespace,
    QName& result)
{
    const std::size_t colon = qname.find(':');
    if (colon == std::string_view::npos) {
        result = QName(std::string(defaultNamespace), std::string(qname));
        return;
    }
    const std::string_view prefix = qname.substr(0, colon);
    std::string_view namespaceUri;
    if (!element->LookupNamespace(prefix, namespaceUri)) {
        throw ParseException(
            "Element " + std::string(element->GetLocalName()) + "at "
            + std::to_string(element->GetLine()) + "," + std::to_string(element->GetColumn())
            + " uses undefined prefix: `" + std::string(prefix) + "'");
    }
    result = QName(std::string(namespaceUri), std::string(qname.substr(colon + 1)));
}

void ResolveTypeName(const ElementNode* element, std::string_view qname, QName& result)
{
    std::string_view defaultNamespace;
    element->LookupNamespace(std::string_view(), defaultNamespace);
    ResolveQName(element, qname, defaultNamespace, result);
}

void RequireEmptyElement(const NodeFilterIterator& iterator)
{
    if (iterator.FirstChild() != nullptr) {
        const ElementNode* element = IteratorToElement(iterator);
        throw ParseException(
            "Element '" + std::string(element->GetLocalName()) + "' must be empty");
    }
}

void RequireTextualContent(const NodeFilterIterator& iterator, std::string& text)
{
    const Node* child = iterator.FirstChild();
    const TextNode* content = AsText(child);
    if (content == nullptr || iterator.FirstAccepted(child->GetNextSibling()) != nullptr) {
        const ElementNode* element = IteratorToElement(iterator);
        throw ParseException(
            "Element '" + std::string(element->GetLocalName())
            + "' must only have textual content (but has extra children or is empty).");
    }
    text = content->GetText();
}

void RequireNothingAfter(const NodeFilterIterator& iterator, const char* predecessor)
{
    if (!iterator.IsAtEnd()) {
        throw ParseException(std::string("Unexpected elements after ") + predecessor);
    }
}

void RequireElementAttributesNames(
    const ElementNode* element,
    std::initializer_list<std::string_view> required,
    std::initializer_list<std::string_view> optional)
{
    for (const std::string_view name : required) {
        if (element->FindAttribute(name) == nullptr) {
            ThrowMissingAttribute(element, name);
        }
    }
    for (const Attribute& attribute : element->GetAttributes()) {
        if (!Contains(required, attribute.name) && !Contains(optional, attribute.name)
            && !attribute.IsNamespaceDeclaration()) {
            throw ParseException(
                "Unexpected attributes on element '" + std::string(element->GetLocalName()) + "'");
        }
    }
}

void RequireNoAttributes(const ElementNode* element)
{
    RequireElementAttributesNames(element, {}, {});
}

void RequireElementAttributesQNames(
    const ElementNode* element,
    const std::vector<QName>& required,
    const std::vector<QName>& optional)
{
    // The order by name decides which of several wrong attributes is reported.
    std::vector<QName> present;
    for (const Attribute* attribute : AttributesSortedByName(element)) {
        QName name;
        ResolveQName(element, attribute->name, std::string_view(), name);
        if (Contains(required, name)) {
            present.push_back(name);
        } else if (!Contains(optional, name)) {
            throw ParseException(
                "Unexpected attribute '" + name.ToString() + "' on element '"
                + std::string(element->GetLocalName()) + "'");
        }
    }
    if (present.size() < required.size()) {
        ThrowFirstMissing(element, required, present);
    }
}

std::string_view GetTextAttribute(const ElementNode* element, std::string_view name) noexcept
{
    const Attribute* attribute = element->FindAttribute(name);
    return attribute == nullptr ? std::string_view() : attribute->value;
}

void GetDateAttribute(const ElementNode* element, const char* name, Quillon::System::DateTime& out)
{
    try {
        out = Quillon::System::DateTime(GetTextAttribute(element, name));
    } catch (const Quillon::System::DateTimeFormatException&) {
        ThrowBadValue(element, name, " is not a date");
    }
}

void GetBoolAttribute(const ElementNode* element, const char* name, bool& out)
{
    const std::string value = Quillon::StringUtil::ToLower(GetTextAttribute(element, name));
    if (value == "1" || value == "true") {
        out = true;
    } else if (value == "0" || value == "false") {
        out = false;
    } else {
        ThrowBadValue(element, name, " is not a Boolean");
    }
}

void GetULongOptionalAttribute(
    const ElementNode* element, const char* name, boost::optional<unsigned long long>& out)
{
    const Attribute* attribute = element->FindAttribute(name);
    if (attribute == nullptr) {
        return;
    }
    long long value = 0;
    if (!ReadInteger(attribute->value, value) || value < 0) {
        ThrowBadValue(element, name, " is not a non-negative integer.");
    }
    out = static_cast<unsigned long long>(value);
}

void ParseXML(Quillon::Reader* reader, Quillon::Ref<Quillon::Xml::Document>& doc)
{
    const auto handler = Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(reader);
    doc = handler->GetDocument();
}

void ParseXML(const std::string& text, Quillon::Ref<Quillon::Xml::Document>& doc)
{
    const auto handler = Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(text);
    doc = handler->GetDocument();
}

const TextNode* GetTextNode(const Node* node) noexcept
{
    return node == nullptr ? nullptr : AsText(node->GetFirstChild());
}

std::string GetText(const TextNode* node)
{
    return node == nullptr ? std::string() : std::string(node->GetText());
}

std::string GetElementText(const ElementNode* element)
{
    return GetText(GetTextNode(element));
}

std::string ToCanonicalXml(const ElementNode* element, const std::string& algorithm)
{
    const auto writer = Quillon::CreateStringWriter();
    Quillon::Xml::Security::CreateCanonicalizer(algorithm)->Canonicalize(element, writer.get());
    return writer->TakeString();
}

} // namespace SsoClient
