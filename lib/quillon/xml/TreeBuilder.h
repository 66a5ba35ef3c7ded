#pragma once

#include "quillon/xml/Parser.h"
#include "xml/Arena.h"

#include <string>
#include <string_view>
#include <vector>

namespace Quillon::Xml {

/** What the parser reports of a tag, in the layout of its arrays. Lives only during the event. */
struct TagEvent
{
    /** Where the parser stands: at the `>` or `/>` of the tag. */
    const char* tagEnd;
    /** Prefix and URI of each declaration; the declaration of `xml` is left out. */
    const unsigned char* const* namespaces;
    unsigned namespaceCount;
    /** Local name, prefix, URI, begin and end of the value of each attribute. */
    const unsigned char* const* attributes;
    unsigned attributeCount;
};

/**
 * Builds the tree of one document from the parser's events. Names and values are taken from the
 * text itself wherever they stand there as they are; only what the parser had to change (entity
 * and character references, normalised white space) is copied.
 */
class TreeBuilder
{
public:
    /** @param source  lives as long as `arena`. */
    TreeBuilder(Ref<Arena> arena, std::string_view source);

    void StartElement(const TagEvent& tag);
    void EndElement();
    void Characters(std::string_view text);
    void Comment(std::string_view text);
    void ProcessingInstruction(std::string_view target, std::string_view data);

    /** @return the document's root; null if there was none. */
    ElementNode* Finish();

private:
    void FlushText();
    void Link(Node* node);
    bool IsInSource(std::string_view text) const noexcept;
    std::string_view Keep(std::string_view text);
    ElementNode* MakeElement(std::string_view text, const TagEvent& tag);
    void ReadAttributes(ElementNode& element, std::string_view text, TagEvent tag);
    std::string_view TakeNamespace(std::string_view raw, TagEvent& tag);
    std::string_view TakeAttribute(std::string_view raw, TagEvent& tag);
    void EnterNamespaces(const ElementNode& element);

    Ref<Arena> _arena;
    std::string_view _source;
    ElementNode* _current = nullptr;
    ElementNode* _root = nullptr;
    Node* _lastTopLevel = nullptr;
    // The tag that was read last, without its brackets, and the element that was made of it.
    std::string_view _lastTag;
    ElementNode* _lastElement = nullptr;
    unsigned _depth = 0;
    unsigned _namespacesInScope = 0;

    // The text run being gathered: a stretch of the source as long as that holds all of it.
    std::string_view _run;
    std::string _mixedRun;
    bool _isMixed = false;
    std::vector<Attribute> _attributes;
};

} // namespace Quillon::Xml
