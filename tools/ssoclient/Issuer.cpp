#include "Issuer.h"

#include "quillon/xml/Parser.h"

namespace {

constexpr std::string_view AssertionNamespace = "urn:oasis:names:tc:SAML:2.0:assertion";

/** All text of the element: a comment between its parts is not signed and must not end it. */
std::string GetText(const Quillon::Xml::ElementNode& element)
{
    std::string text;
    for (const auto* child = element.GetFirstChild(); child; child = child->GetNextSibling()) {
        if (const auto* part = Quillon::Xml::AsText(child)) {
            text += part->GetText();
        }
    }
    return text;
}

} // namespace

std::string FindIssuer(const SsoClient::SamlToken& token)
{
    const auto handler = Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(std::string_view(token.ToXml()));
    const auto document = handler->GetDocument();
    const auto* issuer = document->GetRootElement()->FindChildElement("Issuer", AssertionNamespace);
    return issuer == nullptr ? "" : GetText(*issuer);
}
