#include "devsts/security/Signing.h"

#include "devsts/security/XmlSec.h"
#include "devsts/wire/Names.h"

#include <libxml/parser.h>
#include <mutex>
#include <stdexcept>
#include <xmlsec/errors.h>
#include <xmlsec/openssl/app.h>
#include <xmlsec/openssl/crypto.h>
#include <xmlsec/templates.h>
#include <xmlsec/xmldsig.h>
#include <xmlsec/xmlsec.h>

namespace DevSts {

namespace {

// The prefixes that stand in attribute values, where exclusive canonicalization does not see
// that they are used. [EXC-C14N 1.3]
constexpr const char* ValuePrefixes = "del rsa saml xs";

void Require(bool success, const char* what)
{
    if (!success) {
        throw std::runtime_error(std::string("xmlsec1 failed: ") + what);
    }
}

const xmlChar* Chars(const std::string& text)
{
    return reinterpret_cast<const xmlChar*>(text.c_str());
}

xmlNode* AddSignatureTemplate(xmlNode* assertion)
{
    xmlNode* signature = xmlSecTmplSignatureCreateNsPref(
        assertion->doc,
        xmlSecTransformExclC14NId,
        xmlSecOpenSSLTransformRsaSha256Id,
        nullptr,
        Chars("ds"));
    Require(signature != nullptr, "signature template");
    // SAML wants it right after the Issuer. [SAML-CORE 2.3.3]
    xmlAddNextSibling(assertion->children, signature);

    const xmlSecTransformId digest = xmlSecOpenSSLTransformSha256Id;
    const XmlString id(xmlGetNoNsProp(assertion, Chars("ID")));
    const std::string uri = "#" + std::string(reinterpret_cast<const char*>(id.get()));
    xmlNode* reference =
        xmlSecTmplSignatureAddReference(signature, digest, nullptr, Chars(uri), nullptr);
    Require(reference != nullptr, "reference template");
    xmlNode* enveloped = xmlSecTmplReferenceAddTransform(reference, xmlSecTransformEnvelopedId);
    xmlNode* c14n = xmlSecTmplReferenceAddTransform(reference, xmlSecTransformExclC14NId);
    Require(enveloped != nullptr && c14n != nullptr, "transform templates");
    Require(
        xmlSecTmplTransformAddC14NInclNamespaces(c14n, Chars(ValuePrefixes)) == 0,
        "inclusive namespaces");

    xmlNode* keyInfo = xmlSecTmplSignatureEnsureKeyInfo(signature, nullptr);
    Require(keyInfo != nullptr, "key info template");
    xmlNode* x509 = xmlSecTmplKeyInfoAddX509Data(keyInfo);
    Require(x509 != nullptr && xmlSecTmplX509DataAddCertificate(x509) != nullptr, "X.509 template");
    return signature;
}

} // namespace

void InitializeXmlSec()
{
    static std::once_flag once;
    std::call_once(once, [] {
        // Neither libxml2 nor xmlsec1 makes its first use safe for several threads.
        xmlInitParser();
        Require(
            xmlSecInit() == 0 && xmlSecOpenSSLAppInit(nullptr) == 0 && xmlSecOpenSSLInit() == 0,
            "initialisation");
        // Failures are reported as faults; a refused signature is nothing for standard error.
        xmlSecErrorsDefaultCallbackEnableOutput(0);
    });
}

struct Signer::Key
{
    SecKey key;
};

Signer::Signer(const std::string& keyPem, const std::string& certificatePem)
{
    InitializeXmlSec();
    SecKey key(xmlSecOpenSSLAppKeyLoadMemory(
        reinterpret_cast<const xmlSecByte*>(keyPem.data()),
        static_cast<xmlSecSize>(keyPem.size()),
        xmlSecKeyDataFormatPem,
        nullptr,
        nullptr,
        nullptr));
    Require(key != nullptr, "reading the signing key");
    Require(
        xmlSecOpenSSLAppKeyCertLoadMemory(
            key.get(),
            reinterpret_cast<const xmlSecByte*>(certificatePem.data()),
            static_cast<xmlSecSize>(certificatePem.size()),
            xmlSecKeyDataFormatPem)
            == 0,
        "reading the signing certificate");
    _key = std::make_unique<const Key>(Key{std::move(key)});
}

Signer::~Signer() = default;

void Signer::SignAssertion(xmlDoc* assertion) const
{
    xmlNode* root = xmlDocGetRootElement(assertion);
    RegisterId(root, {"", "ID"});
    xmlNode* signature = AddSignatureTemplate(root);
    const SecSignature context(xmlSecDSigCtxCreate(nullptr));
    Require(context != nullptr, "signature context");
    // The context owns its key, and the key's reference counts are safe to share.
    context->signKey = xmlSecKeyDuplicate(_key->key.get());
    Require(
        context->signKey != nullptr && xmlSecDSigCtxSign(context.get(), signature) == 0, "signing");
}

} // namespace DevSts
