#pragma once

#include <libxml/c14n.h>
#include <libxml/parser.h>

#include <memory>
#include <string>
#include <vector>

// A tree and canonical forms that owe nothing to the project's own.

struct DocDeleter
{
    void operator()(xmlDoc* doc) const noexcept { xmlFreeDoc(doc); }
};
using DocOwner = std::unique_ptr<xmlDoc, DocDeleter>;

/** Null if it is not well-formed; namespaces are not looked at. */
inline DocOwner ParseWithLibxml(const std::string& text)
{
    return DocOwner(xmlReadMemory(
        text.data(),
        static_cast<int>(text.size()),
        "",
        nullptr,
        XML_PARSE_NONET | XML_PARSE_NOENT | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
}

/** Whether a node, or the element of an attribute or namespace, lies under the chosen apex. */
inline int IsUnderApex(void* apex, xmlNode* node, xmlNode* parent)
{
    const bool isNamespace = node->type == XML_NAMESPACE_DECL;
    for (xmlNode* up = isNamespace ? parent : node; up != nullptr; up = up->parent) {
        if (up == apex) {
            return 1;
        }
    }
    return 0;
}

/** "failed" if it cannot. @param apex  null for the whole document. */
inline std::string CanonicalizeWithLibxml(
    xmlDoc* doc, xmlNode* apex, bool isExclusive, const std::vector<std::string>& prefixes)
{
    std::vector<xmlChar*> list;
    for (const std::string& prefix : prefixes) {
        list.push_back(const_cast<xmlChar*>(reinterpret_cast<const xmlChar*>(prefix.c_str())));
    }
    list.push_back(nullptr);
    xmlOutputBuffer* buffer = xmlAllocOutputBuffer(nullptr);
    const int result = xmlC14NExecute(
        doc,
        apex == nullptr ? nullptr : &IsUnderApex,
        apex,
        isExclusive ? XML_C14N_EXCLUSIVE_1_0 : XML_C14N_1_0,
        isExclusive ? list.data() : nullptr,
        0,
        buffer);
    std::string text = "failed";
    if (result >= 0) {
        text.assign(
            reinterpret_cast<const char*>(xmlOutputBufferGetContent(buffer)),
            xmlOutputBufferGetSize(buffer));
    }
    xmlOutputBufferClose(buffer);
    return text;
}

/** Of a tree, in document order. */
inline void CollectElements(xmlNode* node, std::vector<xmlNode*>& elements)
{
    for (; node != nullptr; node = node->next) {
        if (node->type == XML_ELEMENT_NODE) {
            elements.push_back(node);
            CollectElements(node->children, elements);
        }
    }
}
