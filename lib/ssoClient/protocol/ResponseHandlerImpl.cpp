#include "ssoClient/protocol/ResponseHandlerImpl.h"

#include "quillon/PanicVerify.h"
#include "quillon/http/ClientResponse.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/protocol/exchangeLog.h"
#include "ssoClient/protocol/responseReading.h"
#include "ssoClient/protocol/xmlSpnego.h"
#include "ssoClient/wire/assertionPlaces.h"
#include "ssoClient/wire/wireNames.h"
#include "ssoClient/wire/xmlReading.h"

#include <algorithm>
#include <iterator>

using Quillon::Ref;
using Quillon::Xml::ElementNode;
using Quillon::Xml::QName;

namespace SsoClient {

namespace {

static_assert(
    Quillon::Http::ReplyLimits::MaxBodyBytes == Quillon::Xml::ParserLimits::MaxDocumentBytes,
    "a reply that the parser would refuse is not received, and one that it takes is");

// A name in the reply's own terms: prefixes differ between services.
struct FaultName
{
    const char* namespaceUri;
    const char* localName;
};

// [WST13 11], [SOAP Message Security 1.0, 12]
constexpr FaultName BadCredentials[] = {
    {Wire::WsTrustNamespace, "FailedAuthentication"},
    {Wire::WsTrustNamespace, "InvalidSecurityToken"},
    {Wire::WsseNamespace, "InvalidSecurityToken"},
};

bool IsBadCredentials(const QName& code)
{
    return std::any_of(
        std::begin(BadCredentials), std::end(BadCredentials), [&code](const FaultName& name) {
            return code.GetNamespaceUri() == name.namespaceUri
                   && code.GetLocalName() == name.localName;
        });
}

[[noreturn]] void ThrowFault(const ElementNode& fault)
{
    const ElementNode* const faultCode = fault.FindChildElement("faultcode");
    const std::string codeText = GetElementText(faultCode);
    QName code;
    if (!codeText.empty()) {
        ResolveQName(faultCode, codeText, Wire::SoapNamespace, code);
    }
    if (code.GetLocalName().empty()) {
        throw SsoException("Invalid SOAP response: missing faultcode.");
    }
    const std::string faultString = GetElementText(fault.FindChildElement("faultstring"));
    LogFault(codeText, faultString);
    if (IsBadCredentials(code)) {
        throw InvalidCredentialsException(
            "Authentication failed" + (faultString.empty() ? faultString : ": " + faultString));
    }
    throw SsoException("Unexpected SOAP fault: " + codeText + "; request failed.");
}

void ThrowIfFault(const ElementNode& envelope)
{
    const ElementNode* const body = envelope.FindChildElement("Body");
    const ElementNode* const fault = body != nullptr ? body->FindChildElement("Fault") : nullptr;
    if (fault != nullptr) {
        ThrowFault(*fault);
    }
}

Ref<Quillon::Xml::Document> ParseResponse(Quillon::Reader* body)
{
    Ref<Quillon::Xml::Document> document;
    try {
        ParseXML(body, document);
    } catch (const Quillon::Xml::XMLParseException& error) {
        throw SsoException(std::string("Response is not well-formed XML: ") + error.what());
    }
    return document;
}

// Hands the SOAP body of a reply that is not a fault to `extractor`.
template <class Extractor>
auto ProcessResponseWith(Quillon::Reader* body, const Extractor& extractor)
{
    const Ref<Quillon::Xml::Document> document = ParseResponse(body);
    const ElementNode* const envelope = document->GetRootElement();
    if (envelope == nullptr) {
        Quillon::PanicVerify(
            "envelope != __null",
            AssertionPlaces::ResponseHandlerImpl,
            AssertionPlaces::DocumentWithoutRoot);
    }
    ThrowIfFault(*envelope);
    const ElementNode* const soapBody = envelope->FindChildElement("Body");
    if (soapBody == nullptr) {
        throw SsoException("Unexpected response format: missing SAOP Body.");
    }
    return extractor(*soapBody);
}

std::string ExtractIssuedToken(const ElementNode& soapBody)
{
    return ToAssertionText(RequireDescendant(
        soapBody,
        {"RequestSecurityTokenResponseCollection",
         "RequestSecurityTokenResponse",
         "RequestedSecurityToken",
         "Assertion"}));
}

// Only an issue request is answered by a collection [WST13 4.3, 5].
std::string ExtractRenewedToken(const ElementNode& soapBody)
{
    return ToAssertionText(RequireDescendant(
        soapBody, {"RequestSecurityTokenResponse", "RequestedSecurityToken", "Assertion"}));
}

bool ExtractValidity(const ElementNode& soapBody)
{
    const ElementNode& code =
        RequireDescendant(soapBody, {"RequestSecurityTokenResponse", "Status", "Code"});
    const Quillon::Xml::Node* const child = code.GetFirstChild();
    const Quillon::Xml::TextNode* const text = Quillon::Xml::AsText(child);
    if (text == nullptr) {
        Quillon::ThrowTypeMismatchException(
            ToString(Quillon::Xml::NodeType::TEXT),
            child != nullptr ? ToString(child->GetNodeType()) : "nothing");
    }
    if (text->GetText() == Wire::ValidStatus) {
        return true;
    }
    if (text->GetText() == Wire::InvalidStatus) {
        return false;
    }
    ThrowUnexpectedFormat();
}

} // namespace

void ResponseHandlerImpl::HandleAcquireTokenResponse(
    Quillon::Reader* body, std::string& tokenXml) const
{
    tokenXml = ProcessResponseWith(body, ExtractIssuedToken);
}

bool ResponseHandlerImpl::HandleValidateSubjectResponse(Quillon::Reader* body) const
{
    return ProcessResponseWith(body, ExtractValidity);
}

void ResponseHandlerImpl::HandleRenewTokenResponse(
    Quillon::Reader* body, std::string& tokenXml) const
{
    tokenXml = ProcessResponseWith(body, ExtractRenewedToken);
}

void ResponseHandlerImpl::HandleSPNegoResponse(
    Quillon::Reader* body, SPNegoResponse& response) const
{
    response = ProcessResponseWith(body, ExtractSPNegoResponse);
}

} // namespace SsoClient
