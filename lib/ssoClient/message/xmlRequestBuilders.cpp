#include "ssoClient/message/xmlRequestBuilders.h"

#include "quillon/PanicVerify.h"
#include "quillon/system/Clock.h"
#include "ssoClient/dialect/trustNames.h"
#include "ssoClient/message/xmlSecurityBuilders.h"
#include "ssoClient/wire/assertionPlaces.h"
#include "ssoClient/wire/wireNames.h"

#include <limits>

using Quillon::System::DateTime;

namespace SsoClient {

namespace {

const char* ToText(bool value) noexcept
{
    return value ? "true" : "false";
}

const char* GetKeyType(SamlToken::ConfirmationType confirmation, const Wire::TrustNames& trust)
{
    switch (confirmation) {
    case SamlToken::CONFIRM_BEARER:
        return trust.bearerKeyType;
    case SamlToken::CONFIRM_HOLDER_OF_KEY:
        return trust.publicKeyType;
    }
    Quillon::PanicVerify(
        "false", AssertionPlaces::XmlRequestBuilders, AssertionPlaces::UnknownConfirmationType);
}

// A lifetime that no date can hold ends at the last count there is, which is refused as a date,
// instead of wrapping around to an earlier one.
DateTime AddSecondsToDate(const DateTime& time, long long seconds)
{
    long long microseconds = 0;
    long long sum = 0;
    if (__builtin_mul_overflow(seconds, 1'000'000LL, &microseconds)
        || __builtin_add_overflow(time.GetUtcTime(), microseconds, &sum)) {
        sum = seconds < 0 ? std::numeric_limits<long long>::min()
                          : std::numeric_limits<long long>::max();
    }
    try {
        return Quillon::System::DateTimeFromUtc(sum, false);
    } catch (const Quillon::InvalidArgumentException&) {
        throw Quillon::InvalidArgumentException(
            "Token lifetime of " + std::to_string(seconds)
            + " seconds ends outside the years 1 to 9999");
    }
}

// What every request begins with.
XMLBuilderPtr CreateRequestSecurityToken(
    const Wire::TrustNames& trust, const char* tokenType, const char* requestType)
{
    return Composite(
        ElementBuilder("wst", "RequestSecurityToken", {{"xmlns:wst", trust.trustNamespace}}),
        {TextElementBuilder("wst", "TokenType", tokenType),
         TextElementBuilder("wst", "RequestType", requestType)});
}

XMLBuilderPtr AudienceBuilder(const std::set<std::string>& audience, AudienceForm form)
{
    if (audience.empty()) {
        return nullptr;
    }
    if (form == AudienceForm::PARTICIPANTS) {
        return WstParticipantsBuilders(audience);
    }
    if (audience.size() > 1) {
        throw Quillon::InvalidArgumentException(
            "The service takes one audience, and " + std::to_string(audience.size())
            + " are asked for");
    }
    return WspAppliesToBuilder(*audience.begin());
}

XMLBuilderPtr ClaimTypeBuilder(const RequestedClaim& claim)
{
    AttributeMap attributes = {{"Uri", claim.uri}};
    if (claim.isOptional) {
        attributes["Optional"] = ToText(true);
    }
    return ElementBuilder("ic", "ClaimType", attributes);
}

} // namespace

XMLBuilderPtr WssuLifetimeBuilder(long long lifetimeSec)
{
    const DateTime now = Quillon::System::GetUtcDateTime();
    return Composite(
        ElementBuilder("wst", "Lifetime", {{"xmlns:wsu", Wire::WsuNamespace}}),
        WssuCreatedAndExpiresBuilders(now, AddSecondsToDate(now, lifetimeSec)));
}

XMLBuilderPtr WstRenewingBuilder(bool allow)
{
    return ElementBuilder("wst", "Renewing", {{"Allow", ToText(allow)}, {"OK", ToText(false)}});
}

XMLBuilderPtr WstDelegateToBuilder(const std::string& userName)
{
    return Composite(ElementBuilder("wst", "DelegateTo"), {WsseUsernameTokenBuilder(userName)});
}

XMLBuilderPtr WstUseKeyBuilder(XMLBuilderPtr content)
{
    return Composite(
        ElementBuilder("wst", "UseKey", {{"Sig", Wire::ProofSignatureId}}), {std::move(content)});
}

XMLBuilderPtr WstClaimsBuilder(const std::vector<RequestedClaim>& claims)
{
    return Composite(
        ElementBuilder(
            "wst",
            "Claims",
            {{"Dialect", Wire::IdentityNamespace}, {"xmlns:ic", Wire::IdentityNamespace}}),
        BuildersOf(claims, ClaimTypeBuilder));
}

XMLBuilderPtr WstDelegatingTokenBuilder(PresentedTokenForm form, const SamlToken& token)
{
    return Composite(
        form == PresentedTokenForm::ON_BEHALF_OF
            ? ElementBuilder("wst", "OnBehalfOf")
            : ElementBuilder("wst14", "ActAs", {{"xmlns:wst14", Wire::WsTrust14Namespace}}),
        {InsertSamlTokenBuilder(token)});
}

XMLBuilderPtr WspAppliesToBuilder(const std::string& address)
{
    return Composite(
        ElementBuilder(
            "wsp",
            "AppliesTo",
            {{"xmlns:wsa", Wire::WsAddressingNamespace}, {"xmlns:wsp", Wire::WsPolicyNamespace}}),
        {WsaEndpointAddressReferenceBuilder(address)});
}

XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string>& participants)
{
    return Composite(
        ElementBuilder("wst", "Participants", {{"xmlns:wsa", Wire::WsAddressingNamespace}}),
        BuildersOf(participants, WstParticipantBuilder));
}

XMLBuilderPtr WstParticipantBuilder(const std::string& participant)
{
    return Composite(
        ElementBuilder("wst", "Participant"), {WsaEndpointAddressReferenceBuilder(participant)});
}

XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string& address)
{
    return Composite(
        ElementBuilder("wsa", "EndpointReference"),
        {TextElementBuilder("wsa", "Address", address)});
}

XMLBuilderPtr RsaAdviceSetBuilder(const std::vector<Advice>& advice)
{
    return Composite(
        ElementBuilder(
            "rsa-advice",
            "AdviceSet",
            {{"xmlns:rsa-advice", Wire::RsaAdviceNamespace},
             {"xmlns:saml", Wire::SamlNamespace},
             {"xmlns:xs", Wire::XsNamespace},
             {"xmlns:xsi", Wire::XsiNamespace}}),
        BuildersOf(advice, RsaAdviceBuilder));
}

XMLBuilderPtr RsaAdviceBuilder(const Advice& advice)
{
    return Composite(
        ElementBuilder("rsa-advice", "Advice", {{"AdviceSource", advice.source}}),
        BuildersOf(advice.attributes, RsaAttributeBuilder));
}

XMLBuilderPtr RsaAttributeBuilder(const AdviceAttribute& attribute)
{
    return Composite(
        ElementBuilder("rsa-advice", "Attribute", {{"Name", attribute.name}}),
        BuildersOf(attribute.values, [](const std::string& value) {
            return TextElementBuilder(
                "rsa-advice", "AttributeValue", {{"xsi:type", "xs:string"}}, value);
        }));
}

boost::shared_ptr<XMLCompositeBuilder> CommonAcquireSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec, const ServiceDialect& dialect)
{
    const Wire::TrustNames& trust = Wire::GetTrustNames(dialect.trust);
    return Composite(
        CreateRequestSecurityToken(trust, Wire::SamlNamespace, trust.issueRequestType),
        {TextElementBuilder("wst", "KeyType", GetKeyType(confirmation, trust)),
         WssuLifetimeBuilder(spec.tokenLifetimeSec),
         spec.renewable || dialect.writesFalseRenewing ? WstRenewingBuilder(spec.renewable)
                                                       : nullptr,
         spec.delegable || dialect.writesFalseDelegatable
             ? TextElementBuilder("wst", "Delegatable", ToText(spec.delegable))
             : nullptr,
         spec.delegateTo ? WstDelegateToBuilder(*spec.delegateTo) : nullptr,
         AudienceBuilder(spec.audienceRestriction, dialect.audienceForm),
         dialect.claims.empty() ? nullptr : WstClaimsBuilder(dialect.claims),
         spec.advice.empty() ? nullptr : RsaAdviceSetBuilder(spec.advice)});
}

boost::shared_ptr<XMLCompositeBuilder> AcquireSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec, const IssueForm& form)
{
    auto request = CommonAcquireSecurityTokenBuilder(confirmation, spec, form.dialect);
    if (confirmation == SamlToken::CONFIRM_HOLDER_OF_KEY && !spec.delegateTo) {
        request->Add(WstUseKeyBuilder(form.useKeyContent));
    }
    return request;
}

XMLBuilderPtr ExchangeSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec, const IssueForm& form)
{
    return form.dialect.useKeyWithPresentedToken
               ? AcquireSecurityTokenBuilder(confirmation, spec, form)
               : CommonAcquireSecurityTokenBuilder(confirmation, spec, form.dialect);
}

XMLBuilderPtr RenewSecurityTokenBuilder(
    const SamlToken& token, long long lifetimeSec, TrustVersion trust)
{
    if (token.GetConfirmationMethod() != SamlToken::CONFIRM_HOLDER_OF_KEY) {
        Quillon::PanicVerify(
            "token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY",
            AssertionPlaces::XmlRequestBuilders,
            AssertionPlaces::RenewalOfBearerToken);
    }
    const Wire::TrustNames& names = Wire::GetTrustNames(trust);
    return Composite(
        CreateRequestSecurityToken(names, Wire::SamlNamespace, names.renewRequestType),
        {WssuLifetimeBuilder(lifetimeSec),
         Composite(ElementBuilder("wst", "RenewTarget"), {InsertSamlTokenBuilder(token)})});
}

XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken& token, TrustVersion trust)
{
    const Wire::TrustNames& names = Wire::GetTrustNames(trust);
    return Composite(
        CreateRequestSecurityToken(names, names.statusTokenType, names.validateRequestType),
        {Composite(ElementBuilder("wst", "ValidateTarget"), {InsertSamlTokenBuilder(token)})});
}

} // namespace SsoClient
