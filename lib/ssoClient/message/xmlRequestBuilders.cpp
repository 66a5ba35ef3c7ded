#include "ssoClient/message/xmlRequestBuilders.h"

#include "quillon/PanicVerify.h"
#include "quillon/system/Clock.h"
#include "ssoClient/message/xmlSecurityBuilders.h"
#include "ssoClient/wire/wireNames.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <limits>

using Quillon::System::DateTime;

namespace SsoClient {

namespace {

constexpr char Unit[] = "lib/ssoClient/xmlRequestBuilders";

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
    Quillon::PanicVerify("false", Unit, 379);
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

boost::shared_ptr<XMLCompositeBuilder> CreateRequestSecurityToken(
    const char* tokenType, const char* requestType)
{
    auto request = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("wst", "RequestSecurityToken", {{"xmlns:wst", Wire::WsTrustNamespace}}));
    request->Add(TextElementBuilder("wst", "TokenType", tokenType))
        .Add(TextElementBuilder("wst", "RequestType", requestType));
    return request;
}

// An element that holds the assertion of `token`.
XMLBuilderPtr CreateTarget(const char* localName, const SamlToken& token)
{
    auto target = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("wst", localName));
    target->Add(InsertSamlTokenBuilder(token));
    return target;
}

} // namespace

XMLBuilderPtr WssuLifetimeBuilder(long long lifetimeSec)
{
    const DateTime now = Quillon::System::GetUtcDateTime();
    auto lifetime = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("wst", "Lifetime", {{"xmlns:wsu", Wire::WsuNamespace}}));
    lifetime->Add(TextElementBuilder("wsu", "Created", DateTimeFormatter(now)))
        .Add(TextElementBuilder(
            "wsu", "Expires", DateTimeFormatter(AddSecondsToDate(now, lifetimeSec))));
    return lifetime;
}

XMLBuilderPtr WstRenewingBuilder(bool allow)
{
    return ElementBuilder("wst", "Renewing", {{"Allow", ToText(allow)}, {"OK", ToText(false)}});
}

XMLBuilderPtr WstDelegateToBuilder(const std::string& userName)
{
    auto delegateTo = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("wst", "DelegateTo"));
    delegateTo->Add(WsseUsernameTokenBuilder(userName));
    return delegateTo;
}

XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string>& participants)
{
    auto builder = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("wst", "Participants", {{"xmlns:wsa", Wire::WsAddressingNamespace}}));
    for (const std::string& participant : participants) {
        builder->Add(WstParticipantBuilder(participant));
    }
    return builder;
}

XMLBuilderPtr WstParticipantBuilder(const std::string& participant)
{
    auto builder = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("wst", "Participant"));
    builder->Add(WsaEndpointAddressReferenceBuilder(participant));
    return builder;
}

XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string& address)
{
    auto reference =
        boost::make_shared<XMLCompositeBuilder>(ElementBuilder("wsa", "EndpointReference"));
    reference->Add(TextElementBuilder("wsa", "Address", address));
    return reference;
}

XMLBuilderPtr RsaAdviceSetBuilder(const std::vector<Advice>& advice)
{
    auto adviceSet = boost::make_shared<XMLCompositeBuilder>(ElementBuilder(
        "rsa-advice",
        "AdviceSet",
        {{"xmlns:rsa-advice", Wire::RsaAdviceNamespace},
         {"xmlns:saml", Wire::SamlNamespace},
         {"xmlns:xs", Wire::XsNamespace},
         {"xmlns:xsi", Wire::XsiNamespace}}));
    for (const Advice& item : advice) {
        adviceSet->Add(RsaAdviceBuilder(item));
    }
    return adviceSet;
}

XMLBuilderPtr RsaAdviceBuilder(const Advice& advice)
{
    auto builder = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("rsa-advice", "Advice", {{"AdviceSource", advice.source}}));
    for (const AdviceAttribute& attribute : advice.attributes) {
        builder->Add(RsaAttributeBuilder(attribute));
    }
    return builder;
}

XMLBuilderPtr RsaAttributeBuilder(const AdviceAttribute& attribute)
{
    auto builder = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("rsa-advice", "Attribute", {{"Name", attribute.name}}));
    for (const std::string& value : attribute.values) {
        builder->Add(
            TextElementBuilder("rsa-advice", "AttributeValue", {{"xsi:type", "xs:string"}}, value));
    }
    return builder;
}

boost::shared_ptr<XMLCompositeBuilder> CommonAcquireSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec)
{
    auto request = CreateRequestSecurityToken(Wire::SamlNamespace, Wire::IssueRequestType);
    request->Add(TextElementBuilder("wst", "KeyType", GetKeyType(confirmation)))
        .Add(WssuLifetimeBuilder(spec.tokenLifetimeSec))
        .Add(WstRenewingBuilder(spec.renewable))
        .Add(TextElementBuilder("wst", "Delegatable", ToText(spec.delegable)));
    if (spec.delegateTo) {
        request->Add(WstDelegateToBuilder(*spec.delegateTo));
    }
    if (!spec.audienceRestriction.empty()) {
        request->Add(WstParticipantsBuilders(spec.audienceRestriction));
    }
    if (!spec.advice.empty()) {
        request->Add(RsaAdviceSetBuilder(spec.advice));
    }
    return request;
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
            "token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY", Unit, 513);
    }
    auto request = CreateRequestSecurityToken(Wire::SamlNamespace, Wire::RenewRequestType);
    request->Add(WssuLifetimeBuilder(lifetimeSec)).Add(CreateTarget("RenewTarget", token));
    return request;
}

XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken& token)
{
    auto request = CreateRequestSecurityToken(Wire::StatusTokenType, Wire::ValidateRequestType);
    request->Add(CreateTarget("ValidateTarget", token));
    return request;
}

} // namespace SsoClient
