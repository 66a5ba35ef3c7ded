#include "devsts/security/SignatureReader.h"

#include "devsts/wire/Names.h"

#include <cctype>

namespace DevSts {

namespace {

constexpr const char* ExclusiveC14n = "http://www.w3.org/2001/10/xml-exc-c14n#";
constexpr const char* Enveloped = "http://www.w3.org/2000/09/xmldsig#enveloped-signature";
constexpr const char* RsaSha256 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
constexpr const char* Sha256 = "http://www.w3.org/2001/04/xmlenc#sha256";

std::string WithoutBlanks(const std::string& text)
{
    std::string result;
    for (const char character : text) {
        if (std::isspace(static_cast<unsigned char>(character)) == 0) {
            result += character;
        }
    }
    return result;
}

void RequireAlgorithm(const xmlNode* element, const char* expected)
{
    AllowAttributes(element, {{"", "Algorithm"}});
    const std::string found = RequireAttribute(element, {"", "Algorithm"});
    if (found != expected) {
        throw ShapeError("The signature uses '" + found + "' where '" + expected + "' is expected");
    }
}

void RequirePlainAlgorithm(const xmlNode* element, const char* expected)
{
    RequireAlgorithm(element, expected);
    ChildCursor(element).RequireEnd();
}

void RequireListedPrefixes(const xmlNode* transform)
{
    RequireAlgorithm(transform, ExclusiveC14n);
    ChildCursor children(transform);
    if (const xmlNode* list = children.TryTake({ExclusiveC14n, "InclusiveNamespaces"})) {
        AllowAttributes(list, {{"", "PrefixList"}});
        RequireAttribute(list, {"", "PrefixList"});
        ChildCursor(list).RequireEnd();
    }
    children.RequireEnd();
}

void RequireTransforms(const xmlNode* element, SignatureKind kind)
{
    AllowAttributes(element, {});
    ChildCursor children(element);
    if (kind == SignatureKind::ASSERTION) {
        RequirePlainAlgorithm(children.Take({Names::Ds, "Transform"}), Enveloped);
        RequireListedPrefixes(children.Take({Names::Ds, "Transform"}));
    } else {
        RequirePlainAlgorithm(children.Take({Names::Ds, "Transform"}), ExclusiveC14n);
    }
    children.RequireEnd();
}

SignedReference ReadReference(const xmlNode* element, SignatureKind kind)
{
    AllowAttributes(element, {{"", "URI"}});
    SignedReference reference;
    reference.uri = RequireAttribute(element, {"", "URI"});
    ChildCursor children(element);
    RequireTransforms(children.Take({Names::Ds, "Transforms"}), kind);
    RequirePlainAlgorithm(children.Take({Names::Ds, "DigestMethod"}), Sha256);
    const xmlNode* digest = children.Take({Names::Ds, "DigestValue"});
    AllowAttributes(digest, {});
    reference.digest = WithoutBlanks(TextOf(digest));
    children.RequireEnd();
    return reference;
}

std::vector<SignedReference> ReadSignedInfo(const xmlNode* element, SignatureKind kind)
{
    AllowAttributes(element, {});
    ChildCursor children(element);
    RequirePlainAlgorithm(children.Take({Names::Ds, "CanonicalizationMethod"}), ExclusiveC14n);
    RequirePlainAlgorithm(children.Take({Names::Ds, "SignatureMethod"}), RsaSha256);
    std::vector<SignedReference> references;
    do {
        references.push_back(ReadReference(children.Take({Names::Ds, "Reference"}), kind));
    } while (!children.AtEnd());
    return references;
}

} // namespace

SignatureParts ReadSignature(const xmlNode* signature, SignatureKind kind)
{
    AllowAttributes(signature, {{"", "Id"}});
    SignatureParts parts;
    parts.id = FindAttribute(signature, {"", "Id"}).value_or("");
    ChildCursor children(signature);
    parts.references = ReadSignedInfo(children.Take({Names::Ds, "SignedInfo"}), kind);
    const xmlNode* value = children.Take({Names::Ds, "SignatureValue"});
    AllowAttributes(value, {});
    parts.value = WithoutBlanks(TextOf(value));
    parts.keyInfo = children.Take({Names::Ds, "KeyInfo"});
    children.RequireEnd();
    return parts;
}

} // namespace DevSts
