#pragma once

#include "quillon/xml/Parser.h"
#include "quillon/xml/security/Canonicalizer.h"
#include "quillon/xml/security/Identifiers.h"

#include <string>
#include <string_view>
#include <vector>

// What the XML tests share.
namespace Quillon::Xml {

inline Ref<Document> ParseText(std::string_view text)
{
    const Ref<DocumentHandler> handler = CreateXMLDocumentHandler();
    CreateXMLParser(handler.get())->Parse(text);
    return handler->GetDocument();
}

inline std::string SerializeToText(const ElementNode* element)
{
    const Ref<StringWriter> writer = CreateStringWriter();
    Serialize(element, writer.get());
    return writer->TakeString();
}

template <class Subject>
std::string CanonicalizeToText(
    const char* identifier,
    const Subject* subject,
    const std::vector<std::string>& inclusivePrefixes = {})
{
    const Ref<StringWriter> writer = CreateStringWriter();
    Security::CreateCanonicalizer(identifier, inclusivePrefixes)
        ->Canonicalize(subject, writer.get());
    return writer->TakeString();
}

/** Of a tree, in document order. */
inline void CollectElements(const Node* node, std::vector<const ElementNode*>& elements)
{
    for (; node != nullptr; node = node->GetNextSibling()) {
        if (const ElementNode* element = AsElement(node)) {
            elements.push_back(element);
            CollectElements(element->GetFirstChild(), elements);
        }
    }
}

/** The message of the `XMLParseException` that parsing `text` raises; "accepted" if it does not. */
inline std::string GetParseError(std::string_view text)
{
    try {
        ParseText(text);
    } catch (const XMLParseException& error) {
        return error.what();
    }
    return "accepted";
}

} // namespace Quillon::Xml
