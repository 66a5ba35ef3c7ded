#include "fuzz/xmlMutation.h"

#include <libxml/parser.h>
#include <libxml/tree.h>

#include <array>
#include <memory>
#include <random>
#include <vector>

namespace Fuzzing {

namespace {

struct DocumentDeleter
{
    void operator()(xmlDoc* document) const { xmlFreeDoc(document); }
};
using Document = std::unique_ptr<xmlDoc, DocumentDeleter>;

struct StringDeleter
{
    void operator()(xmlChar* text) const { xmlFree(text); }
};
using String = std::unique_ptr<xmlChar, StringDeleter>;

const xmlChar* ToXml(const char* text)
{
    return reinterpret_cast<const xmlChar*>(text);
}

/** Applies changes to one document. */
class Mutation
{
public:
    Mutation(xmlDoc* document, unsigned seed)
        : _document(document)
        , _random(seed)
    {}

    void Change()
    {
        static constexpr std::array Changes = {
            &Mutation::Remove,
            &Mutation::Copy,
            &Mutation::Copy,
            &Mutation::Move,
            &Mutation::Wrap,
            &Mutation::Rename,
            &Mutation::ExchangeText,
            &Mutation::CutText,
            &Mutation::ExchangeAttribute,
            &Mutation::RepeatId,
            &Mutation::DropAttribute,
            &Mutation::Declare,
            &Mutation::HideInCopy,
        };
        (this->*Changes[Draw(Changes.size())])();
    }

private:
    std::size_t Draw(std::size_t count) { return count == 0 ? 0 : _random() % count; }

    void Collect(xmlNode* node, xmlElementType type, std::vector<xmlNode*>& found) const
    {
        for (; node != nullptr; node = node->next) {
            if (node->type == type) {
                found.push_back(node);
            }
            if (node->type == XML_ELEMENT_NODE) {
                Collect(node->children, type, found);
            }
        }
    }

    /** Any element or text; null if there is none. The root only where it is asked for. */
    xmlNode* Pick(xmlElementType type = XML_ELEMENT_NODE, bool withRoot = true)
    {
        xmlNode* const root = xmlDocGetRootElement(_document);
        std::vector<xmlNode*> found;
        Collect(withRoot ? root : root->children, type, found);
        return found.empty() ? nullptr : found[Draw(found.size())];
    }

    static bool IsWithin(const xmlNode* node, const xmlNode* ancestor)
    {
        for (; node != nullptr; node = node->parent) {
            if (node == ancestor) {
                return true;
            }
        }
        return false;
    }

    /** As a child of `parent`, at either end, or beside it. */
    void Insert(xmlNode* node, xmlNode* parent)
    {
        const std::size_t place = Draw(3);
        if (place == 0 && parent->children != nullptr) {
            xmlAddPrevSibling(parent->children, node);
        } else if (
            place == 1 && parent->parent != nullptr && parent->parent->type == XML_ELEMENT_NODE) {
            xmlAddNextSibling(parent, node);
        } else {
            xmlAddChild(parent, node);
        }
        xmlReconciliateNs(_document, xmlDocGetRootElement(_document));
    }

    void Remove()
    {
        if (xmlNode* const node = Pick(XML_ELEMENT_NODE, false)) {
            xmlUnlinkNode(node);
            xmlFreeNode(node);
        }
    }

    void Copy()
    {
        xmlNode* const from = Pick();
        xmlNode* const to = Pick();
        Insert(xmlDocCopyNode(from, _document, 1), to);
    }

    void Move()
    {
        xmlNode* const node = Pick(XML_ELEMENT_NODE, false);
        xmlNode* const to = Pick();
        if (node != nullptr && !IsWithin(to, node)) {
            xmlUnlinkNode(node);
            Insert(node, to);
        }
    }

    /** In another element of the name of some element. */
    void Wrap()
    {
        xmlNode* const node = Pick(XML_ELEMENT_NODE, false);
        const xmlNode* const like = Pick();
        if (node == nullptr) {
            return;
        }
        xmlNode* const wrapper = xmlNewDocNode(_document, like->ns, like->name, nullptr);
        xmlReplaceNode(node, wrapper);
        xmlAddChild(wrapper, node);
        xmlReconciliateNs(_document, xmlDocGetRootElement(_document));
    }

    void Rename()
    {
        xmlNode* const node = Pick();
        const String name(xmlStrdup(Pick()->name));
        xmlNodeSetName(node, name.get());
    }

    void ExchangeText()
    {
        xmlNode* const one = Pick(XML_TEXT_NODE);
        const xmlNode* const other = Pick(XML_TEXT_NODE);
        if (one != nullptr) {
            const String text(xmlEncodeSpecialChars(_document, other->content));
            xmlNodeSetContent(one, text.get());
        }
    }

    /** By a comment or an instruction in its middle. */
    void CutText()
    {
        xmlNode* const text = Pick(XML_TEXT_NODE);
        if (text == nullptr) {
            return;
        }
        const int length = xmlStrlen(text->content);
        const int at = static_cast<int>(Draw(static_cast<std::size_t>(length) + 1));
        if (at > 0 && (text->content[at] & 0xC0) == 0x80) {
            return; // within a character
        }
        xmlNode* const rest = xmlNewDocText(_document, text->content + at);
        xmlNode* const cut = Draw(2) == 0 ? xmlNewDocComment(_document, ToXml("x"))
                                          : xmlNewDocPI(_document, ToXml("x"), nullptr);
        const String start(xmlStrndup(text->content, at));
        const String encoded(xmlEncodeSpecialChars(_document, start.get()));
        xmlNodeSetContent(text, encoded.get());
        xmlAddNextSibling(text, cut);
        // A sibling that is a text as well would become one with its neighbour.
        if (xmlAddNextSibling(cut, rest) == nullptr) {
            xmlFreeNode(rest);
        }
    }

    xmlAttr* PickAttribute()
    {
        std::vector<xmlNode*> elements;
        Collect(xmlDocGetRootElement(_document), XML_ELEMENT_NODE, elements);
        std::vector<xmlAttr*> found;
        for (const xmlNode* element : elements) {
            for (xmlAttr* attribute = element->properties; attribute != nullptr;
                 attribute = attribute->next) {
                found.push_back(attribute);
            }
        }
        return found.empty() ? nullptr : found[Draw(found.size())];
    }

    void ExchangeAttribute()
    {
        xmlAttr* const one = PickAttribute();
        const xmlAttr* const other = PickAttribute();
        if (one != nullptr) {
            const String value(xmlNodeListGetString(_document, other->children, 1));
            xmlSetNsProp(one->parent, one->ns, one->name, value.get());
        }
    }

    /** The root's ID, on another element under one of the names that IDs have. */
    void RepeatId()
    {
        const String id(xmlGetNoNsProp(xmlDocGetRootElement(_document), ToXml("ID")));
        constexpr std::array Names = {"ID", "Id", "id", "xml:id", "AssertionID"};
        xmlNode* const element = Pick(XML_ELEMENT_NODE, false);
        if (element != nullptr && id != nullptr) {
            xmlSetProp(element, ToXml(Names[Draw(Names.size())]), id.get());
        }
    }

    void DropAttribute()
    {
        if (xmlAttr* const attribute = PickAttribute()) {
            xmlRemoveProp(attribute);
        }
    }

    /** A prefix that is in use somewhere, for another namespace. */
    void Declare()
    {
        const xmlNode* const like = Pick();
        const xmlNode* const other = Pick();
        if (like->ns != nullptr && other->ns != nullptr) {
            xmlNewNs(Pick(), other->ns->href, like->ns->prefix);
        }
    }

    /** The whole becomes a part of a copy of itself, in which something is changed. */
    void HideInCopy()
    {
        xmlNode* const old = xmlDocGetRootElement(_document);
        xmlNode* const original = xmlDocCopyNode(old, _document, 1);
        ExchangeText();
        ExchangeAttribute();
        Insert(original, Pick());
    }

    xmlDoc* const _document;
    std::minstd_rand _random;
};

} // namespace

std::string MutateXml(const std::string& xml, unsigned seed)
{
    constexpr int Quietly = XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING;
    const Document document(
        xmlReadMemory(xml.data(), static_cast<int>(xml.size()), nullptr, nullptr, Quietly));
    if (document == nullptr || xmlDocGetRootElement(document.get()) == nullptr) {
        return "";
    }
    Mutation mutation(document.get(), seed);
    for (unsigned count = 0; count <= seed % 3; ++count) {
        mutation.Change();
    }
    xmlChar* bytes = nullptr;
    int size = 0;
    xmlDocDumpMemory(document.get(), &bytes, &size);
    const String owner(bytes);
    return {reinterpret_cast<const char*>(bytes), static_cast<std::size_t>(size)};
}

} // namespace Fuzzing
