#include "devsts/security/MessageSignature.h"

#include "devsts/security/SignatureReader.h"
#include "devsts/security/Verifying.h"
#include "devsts/security/XmlSec.h"
#include "devsts/wire/Base64.h"
#include "devsts/wire/Fault.h"
#include "devsts/wire/Names.h"

namespace DevSts {

namespace {

void RequireValue(const xmlNode* element, const XmlName& attribute, const std::string& expected)
{
    const std::string found = RequireAttribute(element, attribute);
    if (found != expected) {
        throw ShapeError(
            "Attribute '" + std::string(attribute.local) + "' must be '" + expected + "', not '"
            + found + "'");
    }
}

// Exactly these two, in this order: what else a message might have signed is of no concern, and
// what it has not signed must not be believed. [WSS11 8]
void RequireReferences(const SignatureParts& parts, const Request& request)
{
    const std::string body = "#" + RegisterId(request.body, {Names::Wsu, "Id"});
    const std::string timestamp = "#" + RegisterId(request.timestamp, {Names::Wsu, "Id"});
    if (parts.references.size() != 2 || parts.references[0].uri != body
        || parts.references[1].uri != timestamp) {
        throw ShapeError(
            "The signature of the message must have two references, first to the Body, then to "
            "the Timestamp");
    }
}

xmlNode* ReadKeyInfo(const xmlNode* keyInfo)
{
    AllowAttributes(keyInfo, {});
    ChildCursor children(keyInfo);
    xmlNode* reference = children.Take({Names::Wsse, "SecurityTokenReference"});
    children.RequireEnd();
    return reference;
}

// [WSS-X509 3.2.1]
std::string ReadDirectReference(const xmlNode* reference)
{
    AllowAttributes(reference, {});
    ChildCursor children(reference);
    const xmlNode* element = children.Take({Names::Wsse, "Reference"});
    children.RequireEnd();
    AllowAttributes(element, {{"", "URI"}, {"", "ValueType"}});
    RequireValue(element, {"", "ValueType"}, Names::X509v3);
    return RequireAttribute(element, {"", "URI"});
}

// [WSS-SAML11 3.4.1]
std::string ReadSamlReference(const xmlNode* reference)
{
    AllowAttributes(reference, {{Names::Wsse11, "TokenType"}});
    RequireValue(reference, {Names::Wsse11, "TokenType"}, Names::SamlV2);
    ChildCursor children(reference);
    const xmlNode* element = children.Take({Names::Wsse, "KeyIdentifier"});
    children.RequireEnd();
    AllowAttributes(element, {{"", "ValueType"}});
    RequireValue(element, {"", "ValueType"}, Names::SamlId);
    return TextOf(element);
}

std::string ReadBinaryToken(const xmlNode* token, const std::string& uri)
{
    AllowAttributes(token, {{"", "EncodingType"}, {"", "ValueType"}, {Names::Wsu, "Id"}});
    RequireValue(token, {"", "EncodingType"}, Names::Base64Binary);
    RequireValue(token, {"", "ValueType"}, Names::X509v3);
    if ("#" + RequireAttribute(token, {Names::Wsu, "Id"}) != uri) {
        throw ShapeError("The signature names the key '" + uri + "', which is not there");
    }
    return DecodeBase64(TextOf(token));
}

} // namespace

MessageSignature::MessageSignature(const Request& request)
    : _request(request)
{
    try {
        const SignatureParts parts = ReadSignature(request.signature, SignatureKind::MESSAGE);
        RequireReferences(parts, request);
        _id = parts.id;
        _value = parts.value;
        _digests = parts.references[0].digest + parts.references[1].digest;
        _reference = ReadKeyInfo(parts.keyInfo);
    } catch (const ShapeError& error) {
        throw Fault(FaultCodes::InvalidRequest, error.what());
    }
}

std::string MessageSignature::NamedCertificate() const
{
    try {
        const std::string uri = ReadDirectReference(_reference);
        if (_request.binaryToken == nullptr) {
            throw ShapeError("The header has no BinarySecurityToken");
        }
        return ReadBinaryToken(_request.binaryToken, uri);
    } catch (const ShapeError& error) {
        throw Fault(FaultCodes::InvalidRequest, error.what());
    }
}

void MessageSignature::RequireNamesAssertion(const std::string& id) const
{
    try {
        const std::string named = ReadSamlReference(_reference);
        if (named != id) {
            throw ShapeError(
                "The signature names the assertion '" + named + "', not the presented '" + id
                + "'");
        }
    } catch (const ShapeError& error) {
        throw Fault(FaultCodes::InvalidRequest, error.what());
    }
}

bool MessageSignature::IsMadeBy(const std::string& certificateDer) const
{
    return VerifySignature(_request.signature, certificateDer);
}

void MessageSignature::RequireMadeBy(const std::string& certificateDer) const
{
    if (!IsMadeBy(certificateDer)) {
        throw Fault(FaultCodes::FailedCheck, "The signature of the message does not verify");
    }
}

} // namespace DevSts
