#include "fuzz/fuzzing.h"
#include "support/Libxml.h"
#include "unit/quillon/xml/XmlSupport.h"

#include <expat.h>

#include <algorithm>
#include <array>
#include <utility>

// A document is accepted if libxml2's own tree and expat accept it, but for what is refused on
// purpose, and says the same then.
namespace {

using namespace Quillon::Xml;

std::string ToString(const xmlChar* text)
{
    return text == nullptr ? "" : reinterpret_cast<const char*>(text);
}

/** One line for each thing; declarations sorted, because libxml2 keeps them apart. */
class Description
{
public:
    void Element(const std::string& name, std::vector<std::string> declarations)
    {
        EndText();
        std::sort(declarations.begin(), declarations.end());
        _lines += "<" + name + "\n";
        for (const std::string& declaration : declarations) {
            _lines += declaration + "\n";
        }
    }

    void Attribute(const std::string& name, const std::string& value)
    {
        _lines += "@" + name + "=" + value + "\n";
    }

    void Text(const std::string& text) { _text += text; }

    void Other(const std::string& line)
    {
        EndText();
        _lines += line + "\n";
    }

    std::string Take()
    {
        EndText();
        return std::move(_lines);
    }

private:
    void EndText()
    {
        if (!_text.empty()) {
            _lines += "'" + std::exchange(_text, "") + "'\n";
        }
    }

    std::string _lines;
    std::string _text;
};

// ---------------------------------------------------------------------------------- ours

void DescribeElement(const ElementNode& element, Description& out)
{
    std::vector<std::string> declarations;
    for (const Attribute& attribute : element.GetAttributes()) {
        // What is bound to the prefix `xml` is known, so that libxml2 does not keep it.
        if (attribute.IsNamespaceDeclaration() && attribute.name != "xmlns:xml") {
            declarations.push_back(
                std::string(attribute.name) + "=" + std::string(attribute.value));
        }
    }
    out.Element(std::string(element.GetName()), declarations);
    for (const Attribute& attribute : element.GetAttributes()) {
        if (!attribute.IsNamespaceDeclaration()) {
            out.Attribute(std::string(attribute.name), std::string(attribute.value));
        }
    }
}

void Describe(const Node* node, Description& out)
{
    for (; node != nullptr; node = node->GetNextSibling()) {
        switch (node->GetNodeType()) {
        case NodeType::ELEMENT:
            DescribeElement(*AsElement(node), out);
            Describe(node->GetFirstChild(), out);
            out.Other(">");
            break;
        case NodeType::TEXT:
            out.Text(std::string(AsText(node)->GetText()));
            break;
        case NodeType::COMMENT:
            out.Other("!" + std::string(static_cast<const CommentNode*>(node)->GetText()));
            break;
        case NodeType::PROCESSING_INSTRUCTION: {
            const auto* instruction = static_cast<const ProcessingInstructionNode*>(node);
            out.Other(
                "?" + std::string(instruction->GetTarget()) + " "
                + std::string(instruction->GetData()));
            break;
        }
        }
    }
}

// -------------------------------------------------------------------------------- libxml2

std::string NameOf(const xmlNs* ns, const xmlChar* name)
{
    const std::string prefix = ns != nullptr ? ToString(ns->prefix) : "";
    return prefix.empty() ? ToString(name) : prefix + ":" + ToString(name);
}

void DescribeElement(xmlNode& element, Description& out)
{
    std::vector<std::string> declarations;
    for (const xmlNs* ns = element.nsDef; ns != nullptr; ns = ns->next) {
        const std::string prefix = ToString(ns->prefix);
        declarations.push_back(
            (prefix.empty() ? "xmlns" : "xmlns:" + prefix) + "=" + ToString(ns->href));
    }
    out.Element(NameOf(element.ns, element.name), declarations);
    for (xmlAttr* attribute = element.properties; attribute != nullptr;
         attribute = attribute->next) {
        xmlChar* value = xmlNodeListGetString(element.doc, attribute->children, 1);
        out.Attribute(NameOf(attribute->ns, attribute->name), ToString(value));
        xmlFree(value);
    }
}

void Describe(xmlNode* node, Description& out)
{
    for (; node != nullptr; node = node->next) {
        switch (node->type) {
        case XML_ELEMENT_NODE:
            DescribeElement(*node, out);
            Describe(node->children, out);
            out.Other(">");
            break;
        case XML_TEXT_NODE:
        case XML_CDATA_SECTION_NODE:
            out.Text(ToString(node->content));
            break;
        case XML_COMMENT_NODE:
            out.Other("!" + ToString(node->content));
            break;
        case XML_PI_NODE:
            out.Other("?" + ToString(node->name) + " " + ToString(node->content));
            break;
        default:
            out.Other("unexpected");
        }
    }
}

// ---------------------------------------------------------------------------- the others' word

/** Names beyond ASCII are those of the fourth edition of XML to expat, of the fifth to libxml2. */
bool ExpatAccepts(std::string_view text)
{
    XML_Parser parser = XML_ParserCreate("UTF-8");
    const bool isWellFormed =
        XML_Parse(parser, text.data(), static_cast<int>(text.size()), 1) == XML_STATUS_OK;
    const bool mayBeAName = XML_GetErrorCode(parser) == XML_ERROR_INVALID_TOKEN
                            && std::any_of(text.begin(), text.end(), [](char character) {
                                   return static_cast<unsigned char>(character) >= 0x80;
                               });
    XML_ParserFree(parser);
    return isWellFormed || mayBeAName;
}

/** What is refused on purpose, by what its text contains. */
bool IsOnPurpose(const std::string& refusal)
{
    constexpr std::array<std::string_view, 14> Reasons{
        "DOCTYPE",
        "Encoding '",
        "More than ",
        " octets",
        "is not UTF-8",
        "only UTF-8 is read",
        "XML version '",
        "is not a valid URI",
        "NUL character",        // libxml2 takes it for the end
        "colons are forbidden", // in the name of an instruction
        "QName",                // two colons
        "xmlns",                // declarations that libxml2 only warns of
        "namespace",            // an empty or a reserved one
        "Namespace"};
    return std::any_of(Reasons.begin(), Reasons.end(), [&refusal](std::string_view reason) {
        return refusal.find(reason) != std::string::npos;
    });
}

void CompareTrees(const Document& ours, xmlDoc& theirs)
{
    Description a;
    Describe(ours.GetFirstChild(), a);
    Description b;
    Describe(theirs.children, b);
    const std::string textOfOurs = a.Take();
    const std::string textOfTheirs = b.Take();
    Fuzzing::Require(
        textOfOurs == textOfTheirs, "ours:\n" + textOfOurs + "libxml2's:\n" + textOfTheirs);
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string text(Fuzzing::ToText(data, size));
    const DocOwner theirs = ParseWithLibxml(text);
    try {
        const Quillon::Ref<Document> ours = ParseText(text);
        Fuzzing::Require(theirs != nullptr, "accepted, but not by libxml2");
        Fuzzing::Require(ExpatAccepts(text), "accepted, but not by expat");
        CompareTrees(*ours, *theirs);
    } catch (const XMLParseException& error) {
        Fuzzing::Require(
            theirs == nullptr || IsOnPurpose(error.what()),
            std::string("refused, but not by libxml2: ") + error.what());
    }
    return 0;
}
