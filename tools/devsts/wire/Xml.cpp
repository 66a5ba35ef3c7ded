#include "devsts/wire/Xml.h"

#include <algorithm>
#include <libxml/parser.h>
#include <new>
#include <string_view>

namespace DevSts {

namespace {

struct ParserDeleter
{
    void operator()(xmlParserCtxt* parser) const { xmlFreeParserCtxt(parser); }
};

const xmlChar* Chars(const char* text)
{
    return reinterpret_cast<const xmlChar*>(text);
}

std::string_view View(const xmlChar* text)
{
    return text == nullptr ? std::string_view() : reinterpret_cast<const char*>(text);
}

// Every allocation of libxml2 that fails gives null.
template <typename Node>
Node* Allocated(Node* node)
{
    if (node == nullptr) {
        throw std::bad_alloc();
    }
    return node;
}

std::string_view NamespaceOf(const xmlNs* ns)
{
    return ns == nullptr ? std::string_view() : View(ns->href);
}

std::string NameOf(const xmlNode* element)
{
    return std::string(View(element->name));
}

void RefuseDocumentType(void* context, const xmlChar*, const xmlChar*, const xmlChar*)
{
    auto* parser = static_cast<xmlParserCtxt*>(context);
    *static_cast<bool*>(parser->_private) = true;
    xmlStopParser(parser);
}

[[noreturn]] void ThrowSyntaxError(const xmlParserCtxt* parser)
{
    const xmlError& error = parser->lastError;
    std::string message = error.message == nullptr ? "unknown error" : error.message;
    while (!message.empty() && message.back() == '\n') {
        message.pop_back();
    }
    throw ShapeError(
        "The message is not well-formed XML: line " + std::to_string(error.line) + ": " + message);
}

bool IsBlankText(const xmlNode* node)
{
    return node->type == XML_TEXT_NODE && xmlIsBlankNode(const_cast<xmlNode*>(node)) == 1;
}

bool HasName(const xmlAttr* attribute, const XmlName& name)
{
    return View(attribute->name) == name.local && NamespaceOf(attribute->ns) == name.ns;
}

} // namespace

XmlDocument ParseXml(const std::string& text)
{
    const std::unique_ptr<xmlParserCtxt, ParserDeleter> parser(Allocated(xmlNewParserCtxt()));
    bool hasDocumentType = false;
    parser->_private = &hasDocumentType;
    parser->sax->internalSubset = RefuseDocumentType;
    XmlDocument doc(xmlCtxtReadMemory(
        parser.get(),
        text.data(),
        static_cast<int>(text.size()),
        nullptr,
        nullptr,
        XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
    if (hasDocumentType) {
        throw ShapeError("A document type declaration is not accepted");
    }
    if (doc == nullptr || parser->wellFormed == 0 || parser->nsWellFormed == 0) {
        ThrowSyntaxError(parser.get());
    }
    return doc;
}

std::string Serialize(xmlDoc* doc)
{
    xmlChar* text = nullptr;
    int size = 0;
    xmlDocDumpMemoryEnc(doc, &text, &size, "UTF-8");
    const XmlString owner(Allocated(text));
    return std::string(reinterpret_cast<const char*>(text), static_cast<std::size_t>(size));
}

bool IsElement(const xmlNode* node, const XmlName& name)
{
    return node->type == XML_ELEMENT_NODE && View(node->name) == name.local
           && NamespaceOf(node->ns) == name.ns;
}

std::string TextOf(const xmlNode* element)
{
    std::string text;
    for (const xmlNode* child = element->children; child != nullptr; child = child->next) {
        if (child->type != XML_TEXT_NODE && child->type != XML_CDATA_SECTION_NODE) {
            throw ShapeError("Element '" + NameOf(element) + "' must hold text only");
        }
        text += View(child->content);
    }
    return text;
}

std::optional<std::string> FindAttribute(const xmlNode* element, const XmlName& name)
{
    for (const xmlAttr* attribute = element->properties; attribute != nullptr;
         attribute = attribute->next) {
        if (HasName(attribute, name)) {
            const XmlString value(xmlNodeListGetString(element->doc, attribute->children, 1));
            return std::string(View(value.get()));
        }
    }
    return std::nullopt;
}

std::string RequireAttribute(const xmlNode* element, const XmlName& name)
{
    std::optional<std::string> value = FindAttribute(element, name);
    if (!value) {
        throw ShapeError("Element '" + NameOf(element) + "' has no attribute '" + name.local + "'");
    }
    return *std::move(value);
}

void AllowAttributes(const xmlNode* element, std::initializer_list<XmlName> allowed)
{
    for (const xmlAttr* attribute = element->properties; attribute != nullptr;
         attribute = attribute->next) {
        const bool known = std::any_of(allowed.begin(), allowed.end(), [&](const XmlName& name) {
            return HasName(attribute, name);
        });
        if (!known) {
            throw ShapeError(
                "Element '" + NameOf(element) + "' has an unexpected attribute '"
                + std::string(View(attribute->name)) + "'");
        }
    }
}

ChildCursor::ChildCursor(const xmlNode* parent)
    : _parent(parent)
    , _next(parent->children)
{
    SkipBlanks();
}

xmlNode* ChildCursor::Take(const XmlName& name)
{
    xmlNode* taken = TryTake(name);
    if (taken == nullptr) {
        const std::string found =
            _next == nullptr ? std::string("the end") : "'" + NameOf(_next) + "'";
        throw ShapeError(
            "Expected element '" + std::string(name.local) + "' of namespace '" + name.ns
            + "' under '" + NameOf(_parent) + "', found " + found);
    }
    return taken;
}

xmlNode* ChildCursor::TryTake(const XmlName& name)
{
    if (!At(name)) {
        return nullptr;
    }
    xmlNode* taken = _next;
    _next = taken->next;
    SkipBlanks();
    return taken;
}

void ChildCursor::RequireEnd() const
{
    if (_next != nullptr) {
        throw ShapeError("Unexpected '" + NameOf(_next) + "' under '" + NameOf(_parent) + "'");
    }
}

void ChildCursor::SkipBlanks()
{
    while (_next != nullptr && IsBlankText(_next)) {
        _next = _next->next;
    }
}

XmlDocument NewDocument(const char* prefix, const XmlName& root)
{
    XmlDocument doc(Allocated(xmlNewDoc(Chars("1.0"))));
    xmlNode* element = Allocated(xmlNewDocNode(doc.get(), nullptr, Chars(root.local), nullptr));
    xmlDocSetRootElement(doc.get(), element);
    xmlSetNs(element, DeclareNamespace(element, prefix, root.ns));
    return doc;
}

xmlNs* DeclareNamespace(xmlNode* element, const char* prefix, const char* uri)
{
    return Allocated(xmlNewNs(element, Chars(uri), Chars(prefix)));
}

xmlNode* AddElement(xmlNode* parent, xmlNs* ns, const char* name)
{
    xmlNode* element = Allocated(xmlNewDocNode(parent->doc, ns, Chars(name), nullptr));
    return xmlAddChild(parent, element);
}

xmlNode* AddElement(xmlNode* parent, xmlNs* ns, const char* name, const std::string& text)
{
    xmlNode* element = AddElement(parent, ns, name);
    xmlAddChild(element, Allocated(xmlNewDocText(parent->doc, Chars(text.c_str()))));
    return element;
}

void SetAttribute(xmlNode* element, const char* name, const std::string& value)
{
    Allocated(xmlNewProp(element, Chars(name), Chars(value.c_str())));
}

void SetAttribute(xmlNode* element, xmlNs* ns, const char* name, const std::string& value)
{
    Allocated(xmlNewNsProp(element, ns, Chars(name), Chars(value.c_str())));
}

} // namespace DevSts
