#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"
#include "quillon/xml/security/Signature.h"
#include "ssoClient/message/xmlCommonBuilders.h"

#include <string>

namespace SsoClient {

/** An unsigned SOAP 1.1 envelope. A null header or body leaves its element empty. */
XMLBuilderPtr SoapBuilder(XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder);

/**
 * A SOAP 1.1 envelope whose body and timestamp are signed [SOAP Message Security 1.0, 8]. Each
 * build gives new ids and a new signature.
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
        XMLBuilderPtr keyInfoBuilder);

    void build(Quillon::Ref<Quillon::Xml::ElementNode>& out) const override;

private:
    XMLBuilderPtr _headerBuilder;
    XMLBuilderPtr _bodyBuilder;
    const Quillon::Crypto::PrivateKey* _key;
    XMLBuilderPtr _keyInfoBuilder;
};

/** Refers to the key by the ID of a SAML assertion, which is in the header already. */
boost::shared_ptr<const XMLSignedSoapBuilder> SamlRefSignedSoapBuilder(
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    const Quillon::Crypto::PrivateKey* key,
    const std::string& assertionId);

/** Adds the certificate to the header and refers to it. */
boost::shared_ptr<const XMLSignedSoapBuilder> CertRefSignedSoapBuilder(
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    const Quillon::Crypto::PrivateKey* key,
    const Quillon::Crypto::Certificate* certificate);

/** Signs body and timestamp of `envelope`; the signature becomes the last part of its header. */
void SignSoapMessage(
    const Quillon::Crypto::PrivateKey* key,
    const XMLBuilderPtr& keyInfoBuilder,
    Quillon::Xml::ElementNode* envelope);

/** Gives the element a `wsu:Id` if it has none. @return its `wsu:Id`. */
std::string CreateWssuId(Quillon::Xml::ElementNode* element);

/** Refers to `element` by its `wsu:Id`, in exclusive canonical form and by its SHA-256 digest. */
void AddElementToSignature(
    Quillon::Xml::Security::Signature* signature, Quillon::Xml::ElementNode* element);

} // namespace SsoClient
