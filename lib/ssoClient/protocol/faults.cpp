#include "ssoClient/protocol/faults.h"

#include "quillon/xml/Parser.h"
#include "quillon/xml/security/Exceptions.h"
#include "quillon/xml/security/Identifiers.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/dialect/trustNames.h"
#include "ssoClient/protocol/exchangeLog.h"
#include "ssoClient/wire/wireNames.h"
#include "ssoClient/wire/xmlReading.h"

#include <algorithm>
#include <vector>

using Quillon::Xml::ElementNode;
using Quillon::Xml::QName;

namespace SsoClient {

namespace {

constexpr char XmlNamespace[] = "http://www.w3.org/XML/1998/namespace";

// [WST13 11], [SOAP Message Security 1.0, 12]. Names in the reply's own terms: prefixes differ
// between services.
bool IsBadCredentials(const QName& code, const ServiceDialect& dialect)
{
    const char* const trustNamespace = Wire::GetTrustNames(dialect.trust).trustNamespace;
    return code == QName(trustNamespace, "FailedAuthentication")
           || code == QName(trustNamespace, "InvalidSecurityToken")
           || code == QName(Wire::WsseNamespace, "InvalidSecurityToken")
           || (dialect.wsseFailedAuthentication
               && code == QName(Wire::WsseNamespace, "FailedAuthentication"));
}

[[noreturn]] void ThrowBadCredentials(const std::string& reason)
{
    throw InvalidCredentialsException(
        "Authentication failed" + (reason.empty() ? reason : ": " + reason));
}

[[noreturn]] void ThrowUnexpectedFault(const std::string& codeText)
{
    throw SsoException("Unexpected SOAP fault: " + codeText + "; request failed.");
}

[[noreturn]] void ThrowSoap11Fault(const ElementNode& fault, const ServiceDialect& dialect)
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
    if (IsBadCredentials(code, dialect)) {
        ThrowBadCredentials(faultString);
    }
    ThrowUnexpectedFault(codeText);
}

/** White space around a name does not belong to it [XML Schema Part 2, 3.2.18]. */
std::string Trim(const std::string& text)
{
    constexpr char WhiteSpace[] = " \t\r\n";
    const std::size_t start = text.find_first_not_of(WhiteSpace);
    return start == std::string::npos
               ? std::string()
               : text.substr(start, text.find_last_not_of(WhiteSpace) + 1 - start);
}

/** The values of a SOAP 1.2 fault's code and of the subcodes in it, as far as there are any. */
std::vector<const ElementNode*> FindValues(const ElementNode* code)
{
    std::vector<const ElementNode*> values;
    while (code != nullptr) {
        if (const ElementNode* const value = code->FindChildElement("Value")) {
            values.push_back(value);
        }
        code = code->FindChildElement("Subcode");
    }
    return values;
}

std::string GetReason(const ElementNode& fault)
{
    const ElementNode* const reason = fault.FindChildElement("Reason");
    return reason == nullptr ? std::string() : GetElementText(reason->FindChildElement("Text"));
}

[[noreturn]] void ThrowSoap12Fault(const ElementNode& fault, const ServiceDialect& dialect)
{
    std::string codeText;
    bool isBadCredentials = false;
    for (const ElementNode* const value : FindValues(fault.FindChildElement("Code"))) {
        const std::string text = Trim(GetElementText(value));
        QName code;
        ResolveTypeName(value, text, code);
        codeText += (codeText.empty() ? "" : "/") + text;
        isBadCredentials = isBadCredentials || IsBadCredentials(code, dialect);
    }
    if (codeText.empty()) {
        throw SsoException("Invalid SOAP response: missing fault code.");
    }
    const std::string reason = GetReason(fault);
    LogFault(codeText, reason);
    if (isBadCredentials) {
        ThrowBadCredentials(reason);
    }
    ThrowUnexpectedFault(codeText);
}

template <class Resolve>
SoapFaultCode ReadCode(const std::string& text, const Resolve& resolve)
{
    SoapFaultCode code;
    code.text = text;
    try {
        resolve(code.name);
    } catch (const ParseException&) {
        code.name = QName();
    }
    return code;
}

std::string ToXmlAsWritten(const ElementNode& element)
{
    const auto writer = Quillon::CreateStringWriter();
    Quillon::Xml::Serialize(&element, writer.get());
    return writer->TakeString();
}

/** What a service put into a detail must not keep the fault from being told. */
std::string ReadDetail(const ElementNode* detail)
{
    if (detail == nullptr) {
        return {};
    }
    try {
        return ToCanonicalXml(detail, Quillon::Xml::Security::ExclusiveC14n);
    } catch (const Quillon::Xml::Security::XmlSecurityException&) {
        return ToXmlAsWritten(*detail);
    }
}

SoapFault ReadSoap11Fault(const ElementNode& fault)
{
    const ElementNode* const faultCode = fault.FindChildElement("faultcode");
    const std::string codeText = GetElementText(faultCode);
    SoapFault result;
    if (faultCode != nullptr) {
        result.code = ReadCode(codeText, [&](QName& name) {
            ResolveQName(faultCode, codeText, Wire::SoapNamespace, name);
        });
    }
    if (const ElementNode* const text = fault.FindChildElement("faultstring")) {
        result.texts.push_back({std::string(), GetElementText(text)});
    }
    result.node = GetElementText(fault.FindChildElement("faultactor"));
    result.detail = ReadDetail(fault.FindChildElement("detail"));
    return result;
}

std::vector<SoapFaultCode> ReadSoap12Codes(const ElementNode& fault)
{
    const std::vector<const ElementNode*> values = FindValues(fault.FindChildElement("Code"));
    std::vector<SoapFaultCode> codes;
    codes.reserve(values.size());
    for (const ElementNode* const value : values) {
        const std::string text = Trim(GetElementText(value));
        codes.push_back(ReadCode(text, [&](QName& name) { ResolveTypeName(value, text, name); }));
    }
    return codes;
}

std::vector<SoapFaultText> ReadReason(const ElementNode* reason)
{
    std::vector<SoapFaultText> texts;
    const Quillon::Xml::Node* node = reason == nullptr ? nullptr : reason->GetFirstChild();
    for (; node != nullptr; node = node->GetNextSibling()) {
        const ElementNode* const text = Quillon::Xml::AsElement(node);
        if (text != nullptr && text->GetLocalName() == "Text") {
            const auto* const language = text->FindAttribute("lang", XmlNamespace);
            texts.push_back(
                {language == nullptr ? std::string() : std::string(language->value),
                 GetElementText(text)});
        }
    }
    return texts;
}

SoapFault ReadSoap12Fault(const ElementNode& fault)
{
    std::vector<SoapFaultCode> codes = ReadSoap12Codes(fault);
    SoapFault result;
    if (!codes.empty()) {
        result.code = codes.front();
        codes.erase(codes.begin());
    }
    result.subcodes = std::move(codes);
    result.texts = ReadReason(fault.FindChildElement("Reason"));
    result.node = Trim(GetElementText(fault.FindChildElement("Node")));
    result.role = Trim(GetElementText(fault.FindChildElement("Role")));
    result.detail = ReadDetail(fault.FindChildElement("Detail"));
    return result;
}

bool IsSoap12(const ElementNode& fault)
{
    return fault.FindChildElement("faultcode") == nullptr
           && fault.FindChildElement("Code") != nullptr;
}

} // namespace

SoapFault ReadFault(const ElementNode& fault)
{
    return IsSoap12(fault) ? ReadSoap12Fault(fault) : ReadSoap11Fault(fault);
}

void ThrowFault(const ElementNode& fault, const ServiceDialect& dialect)
{
    if (dialect.soap == SoapVersion::SOAP_1_2 && IsSoap12(fault)) {
        ThrowSoap12Fault(fault, dialect);
    }
    ThrowSoap11Fault(fault, dialect);
}

} // namespace SsoClient
