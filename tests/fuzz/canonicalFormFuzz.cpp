#include "fuzz/fuzzing.h"
#include "support/Libxml.h"
#include "unit/quillon/xml/XmlSupport.h"

// The canonical forms are libxml2's, octet for octet, of the whole document and of each element.
namespace {

using namespace Quillon::Xml;

const std::vector<std::vector<std::string>> PrefixLists{
    {}, {"a", "b"}, {"#default"}, {"#default", "ds", "unused"}};

/**
 * libxml2 writes `&` and the like in a namespace name as they are, which nobody could read again,
 * and takes an undeclared prefix for a part of the name, where ours refuses.
 */
bool IsComparable(const ElementNode& element)
{
    std::string_view uri;
    for (const Attribute& attribute : element.GetAttributes()) {
        const bool isPlain = attribute.value.find_first_of("&<>\"\r\n\t") == std::string_view::npos;
        const std::string_view prefix = attribute.GetPrefix();
        if (attribute.IsNamespaceDeclaration()
                ? !isPlain
                : !prefix.empty() && !element.LookupNamespace(prefix, uri)) {
            return false;
        }
    }
    return element.GetPrefix().empty() || element.LookupNamespace(element.GetPrefix(), uri);
}

template <class Subject>
std::string Canonicalize(
    const char* form, const Subject* subject, const std::vector<std::string>& prefixes)
{
    try {
        return CanonicalizeToText(form, subject, prefixes);
    } catch (const Security::XmlSecurityException& error) {
        // Of a declaration that is not used, too: [C14N 1.3] refuses the document.
        Fuzzing::Require(
            std::string_view(error.what()).find("is relative") != std::string_view::npos,
            error.what());
        return "failed";
    }
}

struct Form
{
    bool isExclusive;
    const std::vector<std::string>& prefixes;
};

void Compare(const Document& ours, xmlDoc& theirs, const Form& form)
{
    std::vector<const ElementNode*> ourElements;
    CollectElements(ours.GetFirstChild(), ourElements);
    for (const ElementNode* element : ourElements) {
        if (!IsComparable(*element)) {
            return;
        }
    }
    std::vector<xmlNode*> theirElements;
    CollectElements(theirs.children, theirElements);
    const char* identifier = form.isExclusive ? Security::ExclusiveC14n : Security::InclusiveC14n;
    const std::string whole = Canonicalize(identifier, &ours, form.prefixes);
    if (whole == "failed") {
        return;
    }
    Fuzzing::Require(
        whole == CanonicalizeWithLibxml(&theirs, nullptr, form.isExclusive, form.prefixes),
        "the whole differs:\n" + whole);
    for (std::size_t i = 0; i < ourElements.size(); ++i) {
        const std::string part = Canonicalize(identifier, ourElements[i], form.prefixes);
        Fuzzing::Require(
            part
                == CanonicalizeWithLibxml(
                    &theirs, theirElements[i], form.isExclusive, form.prefixes),
            "element " + std::to_string(i) + " differs:\n" + part);
    }
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    std::string_view input = Fuzzing::ToText(data, size);
    const unsigned choice = Fuzzing::TakeChoice(input);
    const bool isExclusive = choice % 2 == 1;
    const Form form{isExclusive, PrefixLists[isExclusive ? choice / 2 % PrefixLists.size() : 0]};
    const std::string text(input.substr(0, 2000)); // libxml2 takes quadratic time
    try {
        const Quillon::Ref<Document> ours = ParseText(text);
        const DocOwner theirs = ParseWithLibxml(text);
        Fuzzing::Require(theirs != nullptr, "accepted, but not by libxml2");
        Compare(*ours, *theirs, form);
    } catch (const XMLParseException&) {
        return 0; // there is a target of its own for what is a document
    }
    return 0;
}
