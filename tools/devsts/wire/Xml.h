#pragma once

#include <initializer_list>
#include <libxml/tree.h>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>

// Strict reading and plain writing on top of libxml2.

namespace DevSts {

struct XmlDocDeleter
{
    void operator()(xmlDoc* doc) const { xmlFreeDoc(doc); }
};
using XmlDocument = std::unique_ptr<xmlDoc, XmlDocDeleter>;

struct XmlStringDeleter
{
    void operator()(xmlChar* text) const { xmlFree(text); }
};
using XmlString = std::unique_ptr<xmlChar, XmlStringDeleter>;

/** The document is not what it has to be; the text says what was found and what was expected. */
class ShapeError : public std::runtime_error
{
public:
    using std::runtime_error::runtime_error;
};

/** A name of an element or attribute; an empty namespace means that it has none. */
struct XmlName
{
    const char* ns;
    const char* local;
};

/** Parses without network and without any document type declaration. @throws ShapeError */
XmlDocument ParseXml(const std::string& text);

std::string Serialize(xmlDoc* doc);

bool IsElement(const xmlNode* node, const XmlName& name);

/** The text of an element that holds nothing but text. @throws ShapeError */
std::string TextOf(const xmlNode* element);

std::optional<std::string> FindAttribute(const xmlNode* element, const XmlName& name);
std::string RequireAttribute(const xmlNode* element, const XmlName& name);

/** @throws ShapeError  the element has an attribute besides `allowed`. */
void AllowAttributes(const xmlNode* element, std::initializer_list<XmlName> allowed);

/** Walks the child elements in order; blank text between them is skipped. */
class ChildCursor
{
public:
    explicit ChildCursor(const xmlNode* parent);

    bool AtEnd() const { return _next == nullptr; }
    bool At(const XmlName& name) const { return _next != nullptr && IsElement(_next, name); }

    /** Takes the next child, which has to be `name`. @throws ShapeError */
    xmlNode* Take(const XmlName& name);

    /** Takes the next child if it is `name`; else gives null and stays. @throws ShapeError */
    xmlNode* TryTake(const XmlName& name);

    /** @throws ShapeError  a child is left. */
    void RequireEnd() const;

private:
    void SkipBlanks();

    const xmlNode* _parent;
    xmlNode* _next;
};

XmlDocument NewDocument(const char* prefix, const XmlName& root);
xmlNs* DeclareNamespace(xmlNode* element, const char* prefix, const char* uri);
xmlNode* AddElement(xmlNode* parent, xmlNs* ns, const char* name);
xmlNode* AddElement(xmlNode* parent, xmlNs* ns, const char* name, const std::string& text);
void SetAttribute(xmlNode* element, const char* name, const std::string& value);
void SetAttribute(xmlNode* element, xmlNs* ns, const char* name, const std::string& value);

} // namespace DevSts
