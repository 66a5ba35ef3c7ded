#include "ssoClient/message/xmlRequestBuilders.h"

#include "quillon/PanicVerify.h"
#include "quillon/system/Clock.h"
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

const char* GetKeyType(SamlToken::ConfirmationType confirmation)
{
    switch (confirmation) {
    case SamlToken::CONFIRM_BEARER:
        return Wire::BearerKeyType;
    case SamlToken::CONFIRM_HOLDER_OF_KEY:
        return Wire::PublicKeyType;
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
XMLBuilderPtr CreateRequestSecurityToken(const char* tokenType, const char* requestType)
{
    return Composite(
        ElementBuilder("wst", "RequestSecurityToken", {{"xmlns:wst", Wire::WsTrustNamespace}}),
        {TextElementBuilder("wst", "TokenType", tokenType),
         TextElementBuilder("wst", "RequestType", requestType)});
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
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec)
{
    return Composite(
        CreateRequestSecurityToken(Wire::SamlNamespace, Wire::IssueRequestType),
        {TextElementBuilder("wst", "KeyType", GetKeyType(confirmation)),
         WssuLifetimeBuilder(spec.tokenLifetimeSec),
         WstRenewingBuilder(spec.renewable),
         TextElementBuilder("wst", "Delegatable", ToText(spec.delegable)),
         spec.delegateTo ? WstDelegateToBuilder(*spec.delegateTo) : nullptr,
         spec.audienceRestriction.empty() ? nullptr
                                          : WstParticipantsBuilders(spec.audienceRestriction),
         spec.advice.empty() ? nullptr : RsaAdviceSetBuilder(spec.advice)});
}

XMLBuilderPtr AcquireSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec)
{
    auto request = CommonAcquireSecurityTokenBuilder(confirmation, spec);
    if (confirmation == SamlToken::CONFIRM_HOLDER_OF_KEY && !spec.delegateTo) {
        request->Add(ElementBuilder("wst", "UseKey", {{"Sig", Wire::ProofSignatureId}}));
    }
    return request;
}

XMLBuilderPtr ExchangeSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec)
{
    return CommonAcquireSecurityTokenBuilder(confirmation, spec);
}

XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken& token, long long lifetimeSec)
{
    if (token.GetConfirmationMethod() != SamlToken::CONFIRM_HOLDER_OF_KEY) {
        Quillon::PanicVerify(
            "token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY",
            AssertionPlaces::XmlRequestBuilders,
            AssertionPlaces::RenewalOfBearerToken);
    }
    return Composite(
        CreateRequestSecurityToken(Wire::SamlNamespace, Wire::RenewRequestType),
        {WssuLifetimeBuilder(lifetimeSec),
         Composite(ElementBuilder("wst", "RenewTarget"), {InsertSamlTokenBuilder(token)})});
}

XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken& token)
{
    return Composite(
        CreateRequestSecurityToken(Wire::StatusTokenType, Wire::ValidateRequestType),
        {Composite(ElementBuilder("wst", "ValidateTarget"), {InsertSamlTokenBuilder(token)})});
}

} // namespace SsoClient
