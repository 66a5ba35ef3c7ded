#include "devsts/security/XmlSec.h"

#include <algorithm>
#include <cctype>

namespace DevSts {

namespace {

// xmlsec1 puts the ID into an XPointer expression, where a quote would end it.
bool IsPlain(const std::string& id)
{
    return !id.empty() && std::all_of(id.begin(), id.end(), [](unsigned char character) {
        return std::isalnum(character) != 0 || character == '_' || character == '-'
               || character == '.';
    });
}

} // namespace

std::string RegisterId(xmlNode* element, const XmlName& name)
{
    std::string id = RequireAttribute(element, name);
    const auto* local = reinterpret_cast<const xmlChar*>(name.local);
    xmlAttr* attribute =
        *name.ns == '\0' ? xmlHasNsProp(element, local, nullptr)
                         : xmlHasNsProp(element, local, reinterpret_cast<const xmlChar*>(name.ns));
    const auto* value = reinterpret_cast<const xmlChar*>(id.c_str());
    if (!IsPlain(id)) {
        throw ShapeError("The ID '" + id + "' is not made of letters, digits, '_', '-' and '.'");
    }
    if (xmlAddID(nullptr, element->doc, value, attribute) == nullptr) {
        throw ShapeError("The ID '" + id + "' is used twice");
    }
    return id;
}

} // namespace DevSts
