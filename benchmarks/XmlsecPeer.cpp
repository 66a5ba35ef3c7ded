#include "XmlsecPeer.h"

#include "devsts/security/Signing.h"
#include "devsts/security/XmlSec.h"

#include <libxml/parser.h>
#include <openssl/pem.h>
#include <openssl/x509.h>
#include <xmlsec/openssl/app.h>
#include <xmlsec/xmldsig.h>
#include <xmlsec/xmltree.h>

#include <stdexcept>

namespace Benchmarks {

namespace {

struct FreeDocument
{
    void operator()(xmlDoc* document) const noexcept { xmlFreeDoc(document); }
};
using DocumentOwner = std::unique_ptr<xmlDoc, FreeDocument>;

template <auto Free>
struct Deleter
{
    template <class T>
    void operator()(T* handle) const noexcept
    {
        Free(handle);
    }
};

/** The key alone: xmlsec1 copies a certificate that stands beside it for each signature. */
std::string GetPublicKeyPem(const std::string& certificatePem)
{
    using BioOwner = std::unique_ptr<BIO, Deleter<BIO_free_all>>;
    const BioOwner in(
        BIO_new_mem_buf(certificatePem.data(), static_cast<int>(certificatePem.size())));
    const std::unique_ptr<X509, Deleter<X509_free>> certificate(
        PEM_read_bio_X509(in.get(), nullptr, nullptr, nullptr));
    const BioOwner out(BIO_new(BIO_s_mem()));
    if (certificate == nullptr
        || PEM_write_bio_PUBKEY(out.get(), X509_get0_pubkey(certificate.get())) != 1) {
        throw std::runtime_error("The certificate of a benchmark cannot be read");
    }
    char* text = nullptr;
    const long size = BIO_get_mem_data(out.get(), &text);
    return {text, static_cast<std::size_t>(size)};
}

} // namespace

struct XmlsecPeer::Key
{
    DevSts::SecKey key;
};

XmlsecPeer::XmlsecPeer(const std::string& certificatePem)
{
    DevSts::InitializeXmlSec();
    const std::string pem = GetPublicKeyPem(certificatePem);
    _key = std::make_unique<Key>(Key{DevSts::SecKey(xmlSecOpenSSLAppKeyLoadMemory(
        reinterpret_cast<const xmlSecByte*>(pem.data()),
        static_cast<xmlSecSize>(pem.size()),
        xmlSecKeyDataFormatPem,
        nullptr,
        nullptr,
        nullptr))});
    if (_key->key == nullptr) {
        throw std::runtime_error("xmlsec1 reads no key");
    }
}

XmlsecPeer::~XmlsecPeer() = default;

bool XmlsecPeer::Run(const std::string& xml) const
{
    const DocumentOwner document(
        xmlReadMemory(xml.data(), static_cast<int>(xml.size()), nullptr, nullptr, XML_PARSE_NONET));
    xmlNode* const root = document == nullptr ? nullptr : xmlDocGetRootElement(document.get());
    if (root == nullptr) {
        return false;
    }
    DevSts::RegisterId(root, {"", "ID"});
    xmlNode* const signature = xmlSecFindChild(root, xmlSecNodeSignature, xmlSecDSigNs);
    const DevSts::SecSignature context(xmlSecDSigCtxCreate(nullptr));
    context->signKey = xmlSecKeyDuplicate(_key->key.get());
    return xmlSecDSigCtxVerify(context.get(), signature) == 0
           && context->status == xmlSecDSigStatusSucceeded;
}

} // namespace Benchmarks
