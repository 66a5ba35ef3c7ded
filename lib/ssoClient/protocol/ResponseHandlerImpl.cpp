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

// The dialect may leave it to the service.
bool IsOtherForm(const ElementNode& soapBody, const ServiceDialect& dialect, bool hasCollection)
{
    const bool isCollection = soapBody.FindChildElement(Collection) != nullptr;
    return dialect.anyReplyForm && isCollection != hasCollection;
}

std::string ExtractFromCollection(const ElementNode& soapBody)
{
    return ToAssertionText(RequireDescendant(
        soapBody,
        {Collection, "RequestSecurityTokenResponse", "RequestedSecurityToken", "Assertion"}));
}

std::string ExtractFromSingleResponse(const ElementNode& soapBody)
{
    return ToAssertionText(RequireDescendant(
        soapBody, {"RequestSecurityTokenResponse", "RequestedSecurityToken", "Assertion"}));
}

// Only an issue request is answered by a collection [WST13 4.3, 5].
std::string ExtractIssuedToken(const ElementNode& soapBody, const ServiceDialect& dialect)
{
    return IsOtherForm(soapBody, dialect, true) ? ExtractFromSingleResponse(soapBody)
                                                : ExtractFromCollection(soapBody);
}

std::string ExtractRenewedToken(const ElementNode& soapBody, const ServiceDialect& dialect)
{
    return IsOtherForm(soapBody, dialect, false) ? ExtractFromCollection(soapBody)
                                                 : ExtractFromSingleResponse(soapBody);
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
