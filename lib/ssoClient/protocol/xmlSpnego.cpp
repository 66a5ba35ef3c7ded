#include "ssoClient/protocol/xmlSpnego.h"

#include "quillon/Exceptions.h"
#include "quillon/StringUtil.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/protocol/responseReading.h"
#include "ssoClient/wire/wireNames.h"
#include "ssoClient/wire/xmlReading.h"

#include <utility>

using Quillon::Ref;
using Quillon::Xml::ElementNode;

namespace SsoClient {

namespace {

constexpr char Context[] = "Context";
constexpr char BinaryExchange[] = "BinaryExchange";
constexpr char RequestedToken[] = "RequestedSecurityToken";
constexpr char Response[] = "RequestSecurityTokenResponse";

// While the negotiation goes on, the service answers with a single response; an issued token comes
// in a collection [WST13 4.3, 8].
const ElementNode& RequireResponse(const ElementNode& soapBody)
{
    const ElementNode* const single = soapBody.FindChildElement(Response);
    return single != nullptr
               ? *single
               : RequireDescendant(soapBody, {"RequestSecurityTokenResponseCollection", Response});
}

Leg DecodeLeg(const std::string& text)
{
    Leg leg;
    try {
        Quillon::StringUtil::Base64Decode(text, leg);
    } catch (const Quillon::Base64FormatException&) {
        throw SsoException("Base64 format exception");
    }
    return leg;
}

void RequireSamlToken(const ElementNode& response)
{
    const std::string tokenType = GetElementText(response.FindChildElement("TokenType"));
    if (tokenType != Wire::SamlNamespace) {
        throw SsoException(
            "Invalid token type: " + tokenType + " (expected: " + Wire::SamlNamespace);
    }
}

} // namespace

XMLBuilderPtr WstSPNegoBinExchangeBuilder(const Leg& leg)
{
    return TextElementBuilder(
        "wst",
        BinaryExchange,
        {{"ValueType", Wire::SpnegoValueType}, {"EncodingType", Wire::Base64BinaryEncoding}},
        Quillon::StringUtil::Base64Encode(leg));
}

XMLBodyBuilderInitialSPNego::XMLBodyBuilderInitialSPNego(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec, const Leg& leg, IssueForm form)
    : _confirmation(confirmation)
    , _spec(spec)
    , _leg(leg)
    , _form(std::move(form))
{}

void XMLBodyBuilderInitialSPNego::build(Ref<ElementNode>& out) const
{
    XMLCompositeBuilder request(AcquireSecurityTokenBuilder(_confirmation, _spec, _form));
    request.Add(WstSPNegoBinExchangeBuilder(_leg)).build(out);
    ElementDefineAttribute(out.get(), {Context, "urn:uuid:" + Quillon::StringUtil::GenerateUuid()});
}

XMLBodyBuilderContinuedSPNego::XMLBodyBuilderContinuedSPNego(
    const std::string& contextId, const Leg& leg)
    : _contextId(contextId)
    , _leg(leg)
{}

// The SOAP body declares the prefix.
void XMLBodyBuilderContinuedSPNego::build(Ref<ElementNode>& out) const
{
    XMLCompositeBuilder response(ElementBuilder("wst", Response));
    response.Add(WstSPNegoBinExchangeBuilder(_leg)).build(out);
    ElementDefineAttribute(out.get(), {Context, _contextId});
}

SPNegoResponse ExtractSPNegoResponse(const ElementNode& soapBody)
{
    const ElementNode& response = RequireResponse(soapBody);
    const ElementNode* const exchange = response.FindChildElement(BinaryExchange);
    SPNegoResponse result;
    if (!response.GetAttribute(Context, result.contextId)) {
        ThrowUnexpectedFormat();
    }
    result.leg = DecodeLeg(GetElementText(exchange));
    if (const ElementNode* assertion = FindDescendant(response, {RequestedToken, "Assertion"})) {
        RequireSamlToken(response);
        result.token = ToAssertionText(*assertion);
    }
    if (exchange == nullptr && response.FindChildElement(RequestedToken) == nullptr) {
        ThrowUnexpectedFormat();
    }
    return result;
}

} // namespace SsoClient
