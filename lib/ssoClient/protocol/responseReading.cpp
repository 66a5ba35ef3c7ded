#include "ssoClient/protocol/responseReading.h"

#include "quillon/xml/security/Identifiers.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/xmlReading.h"

using Quillon::Xml::ElementNode;

namespace SsoClient {

void ThrowUnexpectedFormat()
{
    throw SsoException("Unexpected XML format");
}

const ElementNode* FindDescendant(
    const ElementNode& element, std::initializer_list<std::string_view> path)
{
    const ElementNode* current = &element;
    for (const std::string_view localName : path) {
        current = current->FindChildElement(localName);
        if (current == nullptr) {
            return nullptr;
        }
    }
    return current;
}

const ElementNode& RequireDescendant(
    const ElementNode& element, std::initializer_list<std::string_view> path)
{
    const ElementNode* const descendant = FindDescendant(element, path);
    if (descendant == nullptr) {
        ThrowUnexpectedFormat();
    }
    return *descendant;
}

// Inclusive, because it keeps every namespace declaration in scope: prefixes that only stand in
// attribute values and text stay bound, and a signature in either canonical form still verifies.
std::string ToAssertionText(const ElementNode& assertion)
{
    return ToCanonicalXml(&assertion, Quillon::Xml::Security::InclusiveC14n);
}

} // namespace SsoClient
