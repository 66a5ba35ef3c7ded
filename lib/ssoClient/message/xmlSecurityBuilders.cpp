#include "ssoClient/message/xmlSecurityBuilders.h"

#include "quillon/StringUtil.h"
#include "quillon/system/Clock.h"
#include "ssoClient/wire/wireNames.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <cstdint>

using Quillon::System::DateTime;

namespace SsoClient {

namespace {

void AppendPadded(std::string& text, int value, std::size_t width)
{
    const std::string digits = std::to_string(value);
    if (digits.size() < width) {
        text.append(width - digits.size(), '0');
    }
    text += digits;
}

} // namespace

std::string DateTimeFormatter(const DateTime& time)
{
    const Quillon::System::DateTimeFields fields = time.GetFields();
    std::string text;
    text.reserve(sizeof("2011-07-05T09:03:07.042Z"));
    AppendPadded(text, 100 * fields.century + fields.yearOfCentury, 4);
    text += '-';
    AppendPadded(text, fields.month, 2);
    text += '-';
    AppendPadded(text, fields.day, 2);
    text += 'T';
    AppendPadded(text, fields.hour, 2);
    text += ':';
    AppendPadded(text, fields.minute, 2);
    text += ':';
    AppendPadded(text, fields.second, 2);
    text += '.';
    AppendPadded(text, fields.millisecond, 3);
    text += time.ToShortStringBias();
    return text;
}

DateTime AddMinutesToDate(const DateTime& time, int minutes)
{
    // Unsigned, because only there is the wrap of a 32-bit product defined.
    const std::uint32_t product = static_cast<std::uint32_t>(minutes) * 60'000'000U;
    const auto microseconds = static_cast<std::int32_t>(product);
    return Quillon::System::DateTimeFromUtc(time.GetUtcTime() + microseconds, false);
}

XMLBuilderPtr WssuTimestampBuilder(int validityMinutes)
{
    const DateTime now = Quillon::System::GetUtcDateTime();
    auto timestamp = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("wsu", "Timestamp", {{"xmlns:wsu", Wire::WsuNamespace}}));
    timestamp->Add(TextElementBuilder("wsu", "Created", DateTimeFormatter(now)))
        .Add(TextElementBuilder(
            "wsu", "Expires", DateTimeFormatter(AddMinutesToDate(now, validityMinutes))));
    return timestamp;
}

XMLBuilderPtr WsSecurityHeaderBuilder(int validityMinutes)
{
    auto security = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("wsse", "Security", {{"xmlns:wsse", Wire::WsseNamespace}}));
    security->Add(WssuTimestampBuilder(validityMinutes));
    return security;
}

XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName)
{
    auto usernameToken = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("wsse", "UsernameToken", {{"xmlns:wsse", Wire::WsseNamespace}}));
    usernameToken->Add(TextElementBuilder("wsse", "Username", userName));
    return usernameToken;
}

XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName, const std::string& password)
{
    auto usernameToken =
        boost::make_shared<XMLCompositeBuilder>(WsseUsernameTokenBuilder(userName));
    usernameToken->Add(
        TextElementBuilder("wsse", "Password", {{"Type", Wire::PasswordTextType}}, password));
    return usernameToken;
}

XMLBuilderPtr WsseX509v3BinarySecTokenBuilder(
    const std::string& id, const Quillon::Crypto::Certificate* certificate)
{
    return TextElementBuilder(
        "wsse",
        "BinarySecurityToken",
        {{"EncodingType", Wire::Base64BinaryEncoding},
         {"ValueType", Wire::X509v3ValueType},
         {"wsu:Id", id},
         {"xmlns:wsu", Wire::WsuNamespace}},
        Quillon::StringUtil::Base64Encode(certificate->GetEncoded()));
}

XMLBuilderPtr WsseX509v3BSTReferenceBuilder(const std::string& id)
{
    auto tokenReference = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("wsse", "SecurityTokenReference", {{"xmlns:wsse", Wire::WsseNamespace}}));
    tokenReference->Add(ElementBuilder(
        "wsse", "Reference", {{"URI", "#" + id}, {"ValueType", Wire::X509v3ValueType}}));
    return tokenReference;
}

XMLBuilderPtr WsseSamlKeyIdReferenceBuilder(const std::string& assertionId)
{
    auto tokenReference = boost::make_shared<XMLCompositeBuilder>(ElementBuilder(
        "wsse",
        "SecurityTokenReference",
        {{"wsse11:TokenType", Wire::Saml20TokenType},
         {"xmlns:wsse", Wire::WsseNamespace},
         {"xmlns:wsse11", Wire::Wsse11Namespace}}));
    tokenReference->Add(TextElementBuilder(
        "wsse", "KeyIdentifier", {{"ValueType", Wire::SamlIdValueType}}, assertionId));
    return tokenReference;
}

} // namespace SsoClient
