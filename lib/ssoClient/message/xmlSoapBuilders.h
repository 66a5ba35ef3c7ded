#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"
#include "quillon/xml/security/Signature.h"
#include "ssoClient/ServiceDialect.h"
#include "ssoClient/message/xmlCommonBuilders.h"
#include "ssoClient/wire/wireNames.h"

#include <string>
#include <vector>

namespace SsoClient {

/** What an envelope is like beside its security header and its body. */
struct EnvelopeForm
{
    SoapVersion soap = SoapVersion::SOAP_1_1;
    TrustVersion trust = TrustVersion::WS_TRUST_1_3; ///< what `wst` is bound to in the SOAP body
    std::vector<XMLBuilderPtr> addressing;           ///< headers before the security header
    SignatureScope signatureScope = SignatureScope::MESSAGE;
};

/** An unsigned SOAP envelope. A null header or body leaves its element empty. */
XMLBuilderPtr SoapBuilder(
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    const EnvelopeForm& form = EnvelopeForm());

/**
 * A SOAP envelope that is signed [SOAP Message Security 1.0, 8]: its body and timestamp, and what
 * its form says. Each build gives new ids and a new signature.
 *
 * Cost: one private-key operation a build, beside which everything else is small.
 */
class XMLSignedSoapBuilder final : public XMLBaseBuilder
{
public:
    /**
     * @param headerBuilder   makes `wsse:Security` with a timestamp; null stops the process.
     * @param key             signs; not owned, it must outlive this object.
     * @param keyInfoBuilder  makes what says whose key it is; null for nothing.
     */
    XMLSignedSoapBuilder(
        XMLBuilderPtr headerBuilder,
        XMLBuilderPtr bodyBuilder,
        const Quillon::Crypto::PrivateKey* key,
        XMLBuilderPtr keyInfoBuilder,
        EnvelopeForm form = EnvelopeForm());

    void build(Quillon::Ref<Quillon::Xml::ElementNode>& out) const override;

private:
    XMLBuilderPtr _headerBuilder;
    XMLBuilderPtr _bodyBuilder;
    const Quillon::Crypto::PrivateKey* _key;
    XMLBuilderPtr _keyInfoBuilder;
    EnvelopeForm _form;
};

/** Refers to the key by the ID of a SAML assertion, which is in the header already. */
boost::shared_ptr<const XMLSignedSoapBuilder> SamlRefSignedSoapBuilder(
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    const Quillon::Crypto::PrivateKey* key,
    const std::string& assertionId,
    const char* tokenType = Wire::Saml20TokenType,
    const EnvelopeForm& form = EnvelopeForm());

/** Adds the certificate to the header and refers to it. */
boost::shared_ptr<const XMLSignedSoapBuilder> CertRefSignedSoapBuilder(
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    const Quillon::Crypto::PrivateKey* key,
    const Quillon::Crypto::Certificate* certificate,
    const EnvelopeForm& form = EnvelopeForm());

/** `wsse:SecurityTokenReference` to the certificate that `CertRefSignedSoapBuilder` adds. */
XMLBuilderPtr CertificateReferenceBuilder();

/**
 * Signs body and timestamp of `envelope`, or what `form` says of it, which it was built by; the
 * signature becomes the last part of its security header.
 */
void SignSoapMessage(
    const Quillon::Crypto::PrivateKey* key,
    const XMLBuilderPtr& keyInfoBuilder,
    Quillon::Xml::ElementNode* envelope,
    const EnvelopeForm& form = EnvelopeForm());

/** Gives the element a `wsu:Id` if it has none. @return its `wsu:Id`. */
std::string CreateWssuId(Quillon::Xml::ElementNode* element);

/** Refers to `element` by its `wsu:Id`, in exclusive canonical form and by its SHA-256 digest. */
void AddElementToSignature(
    Quillon::Xml::Security::Signature* signature, Quillon::Xml::ElementNode* element);

} // namespace SsoClient
