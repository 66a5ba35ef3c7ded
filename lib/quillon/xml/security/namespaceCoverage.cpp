#include "xml/security/namespaceCoverage.h"

#include <algorithm>

namespace Quillon::Xml::Security {

namespace {

/** [EXC-C14N 1.1]: an attribute without prefix lies in no namespace and utilizes none. */
bool VisiblyUtilizes(const ElementNode& element, std::string_view prefix) noexcept
{
    const AttributeRange attributes = element.GetAttributes();
    return element.GetPrefix() == prefix
           || (!prefix.empty()
               && std::any_of(
                   attributes.begin(), attributes.end(), [prefix](const Attribute& attribute) {
                       return attribute.GetPrefix() == prefix;
                   }));
}

/** The element that renders the binding which the canonical form shows at `element`; null if none.
 */
const ElementNode* FindRenderer(
    const ElementNode& apex, const ElementNode& element, std::string_view prefix) noexcept
{
    const ElementNode* renderer = &element;
    while (!VisiblyUtilizes(*renderer, prefix)) {
        if (renderer == &apex) {
            return nullptr;
        }
        renderer = renderer->GetParent();
    }
    return renderer;
}

bool StandsIn(const ElementNode& apex, const ElementNode& element) noexcept
{
    const ElementNode* ancestor = &element;
    while (ancestor != nullptr && ancestor != &apex) {
        ancestor = ancestor->GetParent();
    }
    return ancestor != nullptr;
}

std::string_view GetBinding(const ElementNode& element, std::string_view prefix) noexcept
{
    std::string_view uri;
    element.LookupNamespace(prefix, uri);
    return uri;
}

} // namespace

bool Covers(
    const CanonicalizationMethod& method,
    const ElementNode& apex,
    const ElementNode& element,
    std::string_view prefix) noexcept
{
    if (!StandsIn(apex, element)) {
        return false;
    }
    const auto& listed = method.inclusivePrefixes;
    if (!method.isExclusive || std::find(listed.begin(), listed.end(), prefix) != listed.end()) {
        return true;
    }
    // Whatever declares the prefix anew below its renderer is not in the canonical form.
    const ElementNode* renderer = FindRenderer(apex, element, prefix);
    return renderer != nullptr && GetBinding(*renderer, prefix) == GetBinding(element, prefix);
}

} // namespace Quillon::Xml::Security
