#include "xml/security/signatureTarget.h"
#include "core/quote.h"

#include "quillon/xml/security/Exceptions.h"
#include "xml/Arena.h"
#include "xml/treeWalk.h"

#include <algorithm>
#include <string_view>

namespace Quillon::Xml::Security {

namespace {

/** `ID`, `Id`, `id`, `xml:id`, `wsu:Id`: whatever a reader might look an ID up by. */
bool IsIdAttribute(const Attribute& attribute) noexcept
{
    const std::string_view name = attribute.name;
    const std::size_t size = name.size();
    return size >= 2 && (name[size - 1] == 'D' || name[size - 1] == 'd')
           && (name[size - 2] == 'I' || name[size - 2] == 'i')
           && (size == 2 || name[size - 3] == ':') && !attribute.IsNamespaceDeclaration();
}

bool HasId(const ElementNode& element, std::string_view id) noexcept
{
    const AttributeRange attributes = element.GetAttributes();
    return std::any_of(attributes.begin(), attributes.end(), [id](const Attribute& attribute) {
        return IsIdAttribute(attribute) && attribute.value == id;
    });
}

const ElementNode& GetRoot(const ElementNode& element) noexcept
{
    const ElementNode* root = &element;
    while (root->GetParent() != nullptr) {
        root = root->GetParent();
    }
    return *root;
}

/** Finds the elements with one ID. */
class IdFinder
{
public:
    explicit IdFinder(std::string_view id) noexcept
        : _id(id)
    {}

    void Enter(const ElementNode& element) noexcept
    {
        if (HasId(element, _id)) {
            _found = &element;
            ++_count;
        }
    }
    void Leave(const ElementNode& /*element*/) noexcept {}
    template <class Leaf>
    void Visit(const Leaf& /*leaf*/) noexcept
    {}

    const ElementNode* GetFound() const noexcept { return _found; }
    unsigned GetCount() const noexcept { return _count; }

private:
    std::string_view _id;
    const ElementNode* _found = nullptr;
    unsigned _count = 0;
};

} // namespace

void RequireTarget(const std::string& uri, const ElementNode& parent)
{
    if (uri.empty()) {
        if (parent.GetParent() != nullptr) {
            throw XmlSecurityException(
                "The reference covers a whole document of which the signed element is a part");
        }
        return;
    }
    const std::string_view id = std::string_view(uri).substr(1);
    if (uri.front() != '#' || id.empty() || !HasId(parent, id)) {
        throw XmlSecurityException(
            "Reference " + Quote(uri) + " does not name the element that encloses the signature");
    }
    // A reader that validates by schema takes white space off the ends of an ID, and would see
    // another ID than was compared here [XML Schema 2, 4.3.6].
    if (id.find_first_of("\t\n\r ") != std::string_view::npos) {
        throw XmlSecurityException("Reference " + Quote(uri) + " has white space in its ID");
    }
    FindTarget(uri, parent);
}

const ElementNode& FindTarget(const std::string& uri, const ElementNode& context)
{
    IdFinder finder(std::string_view(uri).substr(1));
    WalkTree(GetRoot(context), nullptr, finder);
    if (finder.GetCount() != 1) {
        throw XmlSecurityException(
            "Reference " + Quote(uri) + " names " + std::to_string(finder.GetCount())
            + " elements of the document");
    }
    return *finder.GetFound();
}

const Node* GetFirstTopLevel(const ElementNode& root) noexcept
{
    return Arena::Of(root).GetFirstTopLevel();
}

} // namespace Quillon::Xml::Security
