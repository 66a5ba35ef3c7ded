#include "ssoClient/message/xmlSoapBuilders.h"

#include "quillon/PanicVerify.h"
#include "quillon/StringUtil.h"
#include "quillon/xml/security/Identifiers.h"
#include "ssoClient/dialect/trustNames.h"
#include "ssoClient/message/xmlSecurityBuilders.h"
#include "ssoClient/wire/assertionPlaces.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <utility>

using Quillon::Ref;
using Quillon::Xml::ElementNode;
namespace Security = Quillon::Xml::Security;

namespace SsoClient {

namespace {

constexpr char CertificateId[] = "holderOfKeyCertificate";

void RequireHeaderBuilder(const XMLBuilderPtr& headerBuilder, int line)
{
    if (headerBuilder == nullptr) {
        Quillon::PanicVerify("headerBuilder != __null", AssertionPlaces::XmlSoapBuilders, line);
    }
}

ElementNode* RequireChild(
    const ElementNode* parent,
    const char* localName,
    const char* namespaceUri,
    const char* expression,
    int line)
{
    ElementNode* const child = parent->FindChildElement(localName, namespaceUri);
    if (child == nullptr) {
        Quillon::PanicVerify(expression, AssertionPlaces::XmlSoapBuilders, line);
    }
    return child;
}

/**
 * An xs:ID is a name and begins with no digit [XML Schema Part 2, 3.3.8], as most UUIDs do; this
 * one begins with a letter. 118 random bits are left.
 */
std::string GenerateUuidThatIsAName()
{
    std::string uuid = Quillon::StringUtil::GenerateUuid();
    uuid.front() = 'a';
    return uuid;
}

// Every security header that is signed was made with a timestamp.
ElementNode* FindTimestamp(const ElementNode& wsseSecurity)
{
    return wsseSecurity.FindChildElement("Timestamp", Wire::WsuNamespace);
}

// The addressing headers come first, and none without addressing.
void AddAddressingToSignature(
    Security::Signature* signature, const ElementNode& soapHeader, const EnvelopeForm& form)
{
    Quillon::Xml::Node* node = soapHeader.GetFirstChild();
    for (std::size_t i = 0; i < form.addressing.size(); ++i) {
        ElementNode* const header = Quillon::Xml::AsElement(node);
        if (form.signatureScope == SignatureScope::MESSAGE || header->GetLocalName() == "To") {
            AddElementToSignature(signature, header);
        }
        node = node->GetNextSibling();
    }
}

void AddKeyInfo(Security::Signature* signature, const XMLBuilderPtr& keyInfoBuilder)
{
    if (keyInfoBuilder != nullptr) {
        Ref<ElementNode> keyInfo;
        keyInfoBuilder->build(keyInfo);
        signature->AddKeyInfoContent(keyInfo.get());
    }
}

} // namespace

XMLBuilderPtr SoapBuilder(
    XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder, const EnvelopeForm& form)
{
    const auto header = Composite(ElementBuilder("soapenv", "Header"), form.addressing);
    header->Add(std::move(headerBuilder));
    return Composite(
        ElementBuilder(
            "soapenv", "Envelope", {{"xmlns:soapenv", Wire::GetSoapNamespace(form.soap)}}),
        {header,
         // Some bodies use `wst` without declaring it.
         Composite(
             ElementBuilder(
                 "soapenv",
                 "Body",
                 {{"xmlns:wst", Wire::GetTrustNames(form.trust).trustNamespace}}),
             {std::move(bodyBuilder)})});
}

XMLSignedSoapBuilder::XMLSignedSoapBuilder(
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    const Quillon::Crypto::PrivateKey* key,
    XMLBuilderPtr keyInfoBuilder,
    EnvelopeForm form)
    : _headerBuilder(std::move(headerBuilder))
    , _bodyBuilder(std::move(bodyBuilder))
    , _key(key)
    , _keyInfoBuilder(std::move(keyInfoBuilder))
    , _form(std::move(form))
{
    RequireHeaderBuilder(_headerBuilder, AssertionPlaces::SignedEnvelopeWithoutHeader);
}

void XMLSignedSoapBuilder::build(Ref<ElementNode>& out) const
{
    SoapBuilder(_headerBuilder, _bodyBuilder, _form)->build(out);
    SignSoapMessage(_key, _keyInfoBuilder, out.get(), _form);
}

boost::shared_ptr<const XMLSignedSoapBuilder> SamlRefSignedSoapBuilder(
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    const Quillon::Crypto::PrivateKey* key,
    const std::string& assertionId,
    const char* tokenType,
    const EnvelopeForm& form)
{
    return boost::make_shared<XMLSignedSoapBuilder>(
        std::move(headerBuilder),
        std::move(bodyBuilder),
        key,
        WsseSamlKeyIdReferenceBuilder(assertionId, tokenType),
        form);
}

boost::shared_ptr<const XMLSignedSoapBuilder> CertRefSignedSoapBuilder(
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    const Quillon::Crypto::PrivateKey* key,
    const Quillon::Crypto::Certificate* certificate,
    const EnvelopeForm& form)
{
    RequireHeaderBuilder(headerBuilder, AssertionPlaces::CertRefSignedEnvelopeWithoutHeader);
    return boost::make_shared<XMLSignedSoapBuilder>(
        Composite(
            std::move(headerBuilder),
            {WsseX509v3BinarySecTokenBuilder(CertificateId, certificate)}),
        std::move(bodyBuilder),
        key,
        CertificateReferenceBuilder(),
        form);
}

XMLBuilderPtr CertificateReferenceBuilder()
{
    return WsseX509v3BSTReferenceBuilder(CertificateId);
}

void SignSoapMessage(
    const Quillon::Crypto::PrivateKey* key,
    const XMLBuilderPtr& keyInfoBuilder,
    ElementNode* envelope,
    const EnvelopeForm& form)
{
    const char* const soapNamespace = Wire::GetSoapNamespace(form.soap);
    ElementNode* const soapBody = RequireChild(
        envelope,
        "Body",
        soapNamespace,
        "soapBody != __null",
        AssertionPlaces::EnvelopeWithoutBody);
    ElementNode* const soapHeader = RequireChild(
        envelope,
        "Header",
        soapNamespace,
        "soapHeader != __null",
        AssertionPlaces::EnvelopeWithoutHeader);
    ElementNode* const wsseSecurity = RequireChild(
        soapHeader,
        "Security",
        Wire::WsseNamespace,
        "wsseSecurity != __null",
        AssertionPlaces::HeaderWithoutSecurity);
    Ref<Security::Signature> signature;
    Security::CreateBlankSignature(
        envelope, Security::ExclusiveC14n, Security::RsaSha256, "ds", signature);
    if (form.signatureScope == SignatureScope::MESSAGE) {
        AddElementToSignature(signature.get(), soapBody);
    }
    AddElementToSignature(signature.get(), FindTimestamp(*wsseSecurity));
    AddAddressingToSignature(signature.get(), *soapHeader, form);
    AddKeyInfo(signature.get(), keyInfoBuilder);
    signature->Sign(key);
    signature->GetElement()->DefineAttribute("Id", Wire::ProofSignatureId);
    wsseSecurity->AppendChild(signature->GetElement());
}

std::string CreateWssuId(ElementNode* element)
{
    if (const auto* const attribute = element->FindAttribute("Id", Wire::WsuNamespace)) {
        return std::string(attribute->value);
    }
    std::string id = GenerateUuidThatIsAName();
    element->DefineAttribute("xmlns:wsu", Wire::WsuNamespace);
    element->DefineAttribute("wsu:Id", id);
    return id;
}

void AddElementToSignature(Security::Signature* signature, ElementNode* element)
{
    Security::Reference* const reference = signature->AddReference("#" + CreateWssuId(element));
    reference->SetDigestMethod(Security::DigestSha256);
    // The elements do not contain the signature, so there is no enveloped-signature transform.
    reference->AddTransform(Security::ExclusiveC14n);
}

} // namespace SsoClient
