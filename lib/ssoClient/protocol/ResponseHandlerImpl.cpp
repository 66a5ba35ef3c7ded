#include "ssoClient/protocol/ResponseHandlerImpl.h"

#include "quillon/PanicVerify.h"
#include "quillon/http/ClientResponse.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/dialect/trustNames.h"
#include "ssoClient/protocol/faults.h"
#include "ssoClient/protocol/responseReading.h"
#include "ssoClient/protocol/xmlSpnego.h"
#include "ssoClient/wire/assertionPlaces.h"
#include "ssoClient/wire/xmlReading.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <utility>

using Quillon::Ref;
using Quillon::Xml::ElementNode;

namespace SsoClient {

namespace {

static_assert(
    Quillon::Http::ReplyLimits::MaxBodyBytes == Quillon::Xml::ParserLimits::MaxDocumentBytes,
    "a reply that the parser would refuse is not received, and one that it takes is");

void ThrowIfFault(const ElementNode& envelope, const ReplyForm& form)
{
    const ElementNode* const body = envelope.FindChildElement("Body");
    const ElementNode* const fault = body != nullptr ? body->FindChildElement("Fault") : nullptr;
    if (fault == nullptr) {
        return;
    }
    if (form.faultObserver) {
        form.faultObserver(ReadFault(*fault));
    }
    ThrowFault(*fault, form.dialect);
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
auto ProcessResponseWith(Quillon::Reader* body, const ReplyForm& form, const Extractor& extractor)
{
    const Ref<Quillon::Xml::Document> document = ParseResponse(body);
    const ElementNode* const envelope = document->GetRootElement();
    if (envelope == nullptr) {
        Quillon::PanicVerify(
            "envelope != __null",
            AssertionPlaces::ResponseHandlerImpl,
            AssertionPlaces::DocumentWithoutRoot);
    }
    ThrowIfFault(*envelope, form);
    const ElementNode* const soapBody = envelope->FindChildElement("Body");
    if (soapBody == nullptr) {
        throw SsoException("Unexpected response format: missing SAOP Body.");
    }
    return extractor(*soapBody, form.dialect);
}

constexpr char Collection[] = "RequestSecurityTokenResponseCollection";
constexpr char RequestedToken[] = "RequestedSecurityToken";

// The dialect may leave it to the service.
bool IsOtherForm(const ElementNode& soapBody, const ServiceDialect& dialect, bool hasCollection)
{
    const bool isCollection = soapBody.FindChildElement(Collection) != nullptr;
    return dialect.anyReplyForm && isCollection != hasCollection;
}

// An encrypted token is one only for a reading that can decrypt it.
const ElementNode* FindEncrypted(const ElementNode& response, const ServiceDialect& dialect)
{
    if (!dialect.reading || dialect.reading->rules.decryptionKeys.empty()) {
        return nullptr;
    }
    const ElementNode* const assertion =
        FindDescendant(response, {RequestedToken, "EncryptedAssertion"});
    return assertion != nullptr ? assertion
                                : FindDescendant(response, {RequestedToken, "EncryptedData"});
}

std::string ExtractToken(const ElementNode& response, const ServiceDialect& dialect)
{
    const ElementNode* const encrypted = FindEncrypted(response, dialect);
    return ToAssertionText(
        encrypted != nullptr ? *encrypted
                             : RequireDescendant(response, {RequestedToken, "Assertion"}));
}

std::string ExtractFromCollection(const ElementNode& soapBody, const ServiceDialect& dialect)
{
    return ExtractToken(
        RequireDescendant(soapBody, {Collection, "RequestSecurityTokenResponse"}), dialect);
}

std::string ExtractFromSingleResponse(const ElementNode& soapBody, const ServiceDialect& dialect)
{
    return ExtractToken(RequireDescendant(soapBody, {"RequestSecurityTokenResponse"}), dialect);
}

// Only an issue request is answered by a collection [WST13 4.3, 5].
std::string ExtractIssuedToken(const ElementNode& soapBody, const ServiceDialect& dialect)
{
    return IsOtherForm(soapBody, dialect, true) ? ExtractFromSingleResponse(soapBody, dialect)
                                                : ExtractFromCollection(soapBody, dialect);
}

std::string ExtractRenewedToken(const ElementNode& soapBody, const ServiceDialect& dialect)
{
    return IsOtherForm(soapBody, dialect, false) ? ExtractFromCollection(soapBody, dialect)
                                                 : ExtractFromSingleResponse(soapBody, dialect);
}

bool ExtractValidity(const ElementNode& soapBody, const ServiceDialect& dialect)
{
    const Wire::TrustNames& trust = Wire::GetTrustNames(dialect.trust);
    const ElementNode& code =
        RequireDescendant(soapBody, {"RequestSecurityTokenResponse", "Status", "Code"});
    const Quillon::Xml::Node* const child = code.GetFirstChild();
    const Quillon::Xml::TextNode* const text = Quillon::Xml::AsText(child);
    if (text == nullptr) {
        Quillon::ThrowTypeMismatchException(
            ToString(Quillon::Xml::NodeType::TEXT),
            child != nullptr ? ToString(child->GetNodeType()) : "nothing");
    }
    if (text->GetText() == trust.validStatus) {
        return true;
    }
    if (text->GetText() == trust.invalidStatus) {
        return false;
    }
    ThrowUnexpectedFormat();
}

} // namespace

ResponseHandlerImpl::ResponseHandlerImpl(ReplyForm form)
    : _form(std::move(form))
{}

void ResponseHandlerImpl::HandleAcquireTokenResponse(
    Quillon::Reader* body, std::string& tokenXml) const
{
    tokenXml = ProcessResponseWith(body, _form, ExtractIssuedToken);
}

bool ResponseHandlerImpl::HandleValidateSubjectResponse(Quillon::Reader* body) const
{
    return ProcessResponseWith(body, _form, ExtractValidity);
}

void ResponseHandlerImpl::HandleRenewTokenResponse(
    Quillon::Reader* body, std::string& tokenXml) const
{
    tokenXml = ProcessResponseWith(body, _form, ExtractRenewedToken);
}

void ResponseHandlerImpl::HandleSPNegoResponse(
    Quillon::Reader* body, SPNegoResponse& response) const
{
    response = ProcessResponseWith(
        body, _form, [](const ElementNode& soapBody, const ServiceDialect& /*dialect*/) {
            return ExtractSPNegoResponse(soapBody);
        });
}

boost::shared_ptr<const ResponseHandler> ResponseHandlerImpl::ShowingFaultsTo(
    const FaultObserver& observer) const
{
    ReplyForm form = _form;
    form.faultObserver = [callers = _form.faultObserver, observer](const SoapFault& fault) {
        if (callers) {
            callers(fault);
        }
        observer(fault);
    };
    return boost::make_shared<ResponseHandlerImpl>(form);
}

} // namespace SsoClient
