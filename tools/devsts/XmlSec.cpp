#include "devsts/XmlSec.h"

namespace DevSts {

std::string RegisterId(xmlNode* element, const XmlName& name)
{
    const std::string id = RequireAttribute(element, name);
    const auto* local = reinterpret_cast<const xmlChar*>(name.local);
    xmlAttr* attribute =
        *name.ns == '\0' ? xmlHasNsProp(element, local, nullptr)
                         : xmlHasNsProp(element, local, reinterpret_cast<const xmlChar*>(name.ns));
    const auto* value = reinterpret_cast<const xmlChar*>(id.c_str());
    if (id.empty() || xmlAddID(nullptr, element->doc, value, attribute) == nullptr) {
        throw ShapeError("The ID '" + id + "' is empty or used twice");
    }
    return id;
}

} // namespace DevSts
