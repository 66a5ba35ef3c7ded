#include "ssoClient/message/xmlSecurityBuilders.h"

#include "quillon/StringUtil.h"
#include "quillon/system/Clock.h"

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

std::vector<XMLBuilderPtr> WssuCreatedAndExpiresBuilders(
    const DateTime& created, const DateTime& expires)
{
    return {
        TextElementBuilder("wsu", "Created", DateTimeFormatter(created)),
        TextElementBuilder("wsu", "Expires", DateTimeFormatter(expires))};
}

XMLBuilderPtr WssuTimestampBuilder(int validityMinutes)
{
    const DateTime now = Quillon::System::GetUtcDateTime();
    return Composite(
        ElementBuilder("wsu", "Timestamp", {{"xmlns:wsu", Wire::WsuNamespace}}),
        WssuCreatedAndExpiresBuilders(now, AddMinutesToDate(now, validityMinutes)));
}

XMLBuilderPtr WsSecurityHeaderBuilder(int validityMinutes)
{
    return Composite(
        ElementBuilder("wsse", "Security", {{"xmlns:wsse", Wire::WsseNamespace}}),
        {WssuTimestampBuilder(validityMinutes)});
}

XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName)
{
    return Composite(
        ElementBuilder("wsse", "UsernameToken", {{"xmlns:wsse", Wire::WsseNamespace}}),
        {TextElementBuilder("wsse", "Username", userName)});
}

XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName, const std::string& password)
{
    return Composite(
        WsseUsernameTokenBuilder(userName),
        {TextElementBuilder("wsse", "Password", {{"Type", Wire::PasswordTextType}}, password)});
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
    return Composite(
        ElementBuilder("wsse", "SecurityTokenReference", {{"xmlns:wsse", Wire::WsseNamespace}}),
        {ElementBuilder(
            "wsse", "Reference", {{"URI", "#" + id}, {"ValueType", Wire::X509v3ValueType}})});
}

XMLBuilderPtr WsseSamlKeyIdReferenceBuilder(const std::string& assertionId, const char* tokenType)
{
    return Composite(
        ElementBuilder(
            "wsse",
            "SecurityTokenReference",
            {{"wsse11:TokenType", tokenType},
             {"xmlns:wsse", Wire::WsseNamespace},
             {"xmlns:wsse11", Wire::Wsse11Namespace}}),
        {TextElementBuilder(
            "wsse", "KeyIdentifier", {{"ValueType", Wire::SamlIdValueType}}, assertionId)});
}

XMLBuilderPtr DsCertificateKeyInfoBuilder(const Quillon::Crypto::Certificate* certificate)
{
    return Composite(
        ElementBuilder("ds", "KeyInfo", {{"xmlns:ds", Wire::DsNamespace}}),
        {Composite(
            ElementBuilder("ds", "X509Data"),
            {TextElementBuilder(
                "ds",
                "X509Certificate",
                Quillon::StringUtil::Base64Encode(certificate->GetEncoded()))})});
}

} // namespace SsoClient
