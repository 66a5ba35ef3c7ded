#include "Tokens.h"

#include "TestData.h"

#include "devsts/security/Signing.h"

#include <libxml/parser.h>

#include <memory>
#include <stdexcept>

namespace Benchmarks {

namespace {

constexpr char Head[] =
    R"(<saml:Assertion xmlns:saml="urn:oasis:names:tc:SAML:2.0:assertion" )"
    R"(xmlns:xs="http://www.w3.org/2001/XMLSchema" )"
    R"(xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance" ID="_1" )"
    R"(IssueInstant="2026-01-01T00:00:00Z" Version="2.0">)"
    R"(<saml:Issuer Format="urn:oasis:names:tc:SAML:2.0:nameid-format:entity">sts</saml:Issuer>)"
    R"(<saml:Subject><saml:NameID Format="http://schemas.xmlsoap.org/claims/UPN">user@example.com)"
    R"(</saml:NameID><saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer">)"
    R"(<saml:SubjectConfirmationData NotOnOrAfter="2026-12-31T00:00:00Z"/></saml:SubjectConfirmation>)"
    R"(</saml:Subject><saml:Conditions NotBefore="2026-01-01T00:00:00Z" )"
    R"(NotOnOrAfter="2026-12-31T00:00:00Z"/><saml:AuthnStatement )"
    R"(AuthnInstant="2026-01-01T00:00:00Z"><saml:AuthnContext><saml:AuthnContextClassRef>)"
    R"(urn:oasis:names:tc:SAML:2.0:ac:classes:Password</saml:AuthnContextClassRef>)"
    R"(</saml:AuthnContext></saml:AuthnStatement><saml:AttributeStatement>)";
constexpr char Tail[] = "</saml:AttributeStatement></saml:Assertion>";

constexpr char OpenGroups[] =
    R"(<saml:Attribute Name="http://www.rsa.com/schemas/attr-names/2009/01/GroupIdentity" )"
    R"(NameFormat="urn:oasis:names:tc:SAML:2.0:attrname-format:uri">)";
constexpr char OpenOther[] = R"(<saml:Attribute Name="urn:example:other" )"
                             R"(NameFormat="urn:oasis:names:tc:SAML:2.0:attrname-format:uri">)";
constexpr char OpenValue[] = R"(<saml:AttributeValue xsi:type="xs:string">)";
constexpr char CloseValue[] = "</saml:AttributeValue>";
constexpr char CloseAttribute[] = "</saml:Attribute>";

std::string MakeNumber(std::size_t index)
{
    const std::string digits = std::to_string(index);
    return std::string(6 - digits.size(), '0') + digits;
}

/** One of what there are many of. */
std::string MakeItem(Bulk bulk, std::size_t index)
{
    const std::string number = MakeNumber(index);
    switch (bulk) {
    case Bulk::GROUPS:
        return OpenValue + ("example.com\\Group-" + number) + CloseValue;
    case Bulk::ATTRIBUTES:
        return std::string(CloseAttribute) + OpenOther + OpenValue + number + CloseValue;
    case Bulk::NAMESPACES:
        return "<saml:AttributeValue xmlns:n" + number + "=\"urn:example:" + number + "\">v"
               + CloseValue;
    case Bulk::TEXT:
        return "text " + number + " ";
    case Bulk::COMMENTS:
        return "<!-- comment " + number + " -->";
    }
    throw std::logic_error("There is no such bulk");
}

std::string MakeAssertion(Bulk bulk, std::size_t size)
{
    std::string text = Head;
    text += bulk == Bulk::GROUPS ? OpenGroups : OpenOther;
    text += bulk == Bulk::TEXT ? OpenValue : "";
    for (std::size_t index = 0; text.size() < size; ++index) {
        text += MakeItem(bulk, index);
    }
    text += bulk == Bulk::TEXT ? CloseValue : "";
    return text + CloseAttribute + Tail;
}

struct FreeDocument
{
    void operator()(xmlDoc* document) const noexcept { xmlFreeDoc(document); }
};

} // namespace

const char* ToString(Bulk bulk) noexcept
{
    switch (bulk) {
    case Bulk::GROUPS:
        return "groups";
    case Bulk::ATTRIBUTES:
        return "attributes";
    case Bulk::NAMESPACES:
        return "namespaces";
    case Bulk::TEXT:
        return "text";
    case Bulk::COMMENTS:
        break;
    }
    return "comments";
}

std::string MakeToken(Bulk bulk, std::size_t size)
{
    constexpr std::size_t SignatureSize = 2'200;
    const std::string text = MakeAssertion(bulk, size > SignatureSize ? size - SignatureSize : 0);
    const std::unique_ptr<xmlDoc, FreeDocument> document(xmlReadMemory(
        text.data(), static_cast<int>(text.size()), nullptr, nullptr, XML_PARSE_HUGE));
    if (document == nullptr) {
        throw std::runtime_error("The token of a benchmark is not well-formed");
    }
    static const DevSts::Signer signer(ReadFile("keys/sts-key.pem"), ReadFile("keys/sts-cert.pem"));
    signer.SignAssertion(document.get());
    xmlChar* written = nullptr;
    int length = 0;
    xmlDocDumpMemoryEnc(document.get(), &written, &length, "UTF-8");
    std::string token(reinterpret_cast<const char*>(written), static_cast<std::size_t>(length));
    xmlFree(written);
    return token;
}

} // namespace Benchmarks
