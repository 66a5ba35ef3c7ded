#include "Floor.h"

#include <libxml/SAX2.h>
#include <libxml/parser.h>

#include <openssl/evp.h>
#include <openssl/rsa.h>

#include <array>
#include <cstring>
#include <stdexcept>

namespace Benchmarks {

namespace {

constexpr std::size_t DigestLength = 32;
using DigestBytes = std::array<unsigned char, DigestLength>;

template <auto Free>
struct Deleter
{
    template <class T>
    void operator()(T* handle) const noexcept
    {
        Free(handle);
    }
};
using KeyOwner = std::unique_ptr<EVP_PKEY, Deleter<EVP_PKEY_free>>;
using ContextOwner = std::unique_ptr<EVP_PKEY_CTX, Deleter<EVP_PKEY_CTX_free>>;
using MdOwner = std::unique_ptr<EVP_MD, Deleter<EVP_MD_free>>;
using MdContextOwner = std::unique_ptr<EVP_MD_CTX, Deleter<EVP_MD_CTX_free>>;

void Require(bool condition)
{
    if (!condition) {
        throw std::runtime_error("The floor's key cannot be made");
    }
}

void OnStartElement(
    void* /*data*/,
    const xmlChar* /*localName*/,
    const xmlChar* /*prefix*/,
    const xmlChar* /*uri*/,
    int /*namespaceCount*/,
    const xmlChar** /*namespaces*/,
    int /*attributeCount*/,
    int /*defaultedCount*/,
    const xmlChar** /*attributes*/)
{}

void OnEndElement(
    void* /*data*/, const xmlChar* /*localName*/, const xmlChar* /*prefix*/, const xmlChar* /*uri*/)
{}

void OnCharacters(void* data, const xmlChar* /*text*/, int length)
{
    *static_cast<std::size_t*>(data) += static_cast<std::size_t>(length);
}

bool ParsePass(const std::string& xml)
{
    xmlSAXHandler handler;
    std::memset(&handler, 0, sizeof handler);
    handler.initialized = XML_SAX2_MAGIC;
    handler.startElementNs = &OnStartElement;
    handler.endElementNs = &OnEndElement;
    handler.characters = &OnCharacters;
    std::size_t characters = 0;
    return xmlSAXUserParseMemory(&handler, &characters, xml.data(), static_cast<int>(xml.size()))
               == 0
           && characters != 0;
}

} // namespace

struct VerifyFloor::Handles
{
    MdOwner sha256;
    KeyOwner key;
    DigestBytes signedDigest{};
    std::vector<unsigned char> signature;

    bool HashPass(const std::string& xml) const
    {
        const MdContextOwner context(EVP_MD_CTX_new());
        DigestBytes digest{};
        return EVP_DigestInit_ex2(context.get(), sha256.get(), nullptr) == 1
               && EVP_DigestUpdate(context.get(), xml.data(), xml.size()) == 1
               && EVP_DigestFinal_ex(context.get(), digest.data(), nullptr) == 1;
    }

    ContextOwner MakeContext(int (*init)(EVP_PKEY_CTX*)) const
    {
        ContextOwner context(EVP_PKEY_CTX_new_from_pkey(nullptr, key.get(), nullptr));
        Require(
            context && init(context.get()) == 1
            && EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_PADDING) == 1
            && EVP_PKEY_CTX_set_signature_md(context.get(), sha256.get()) == 1);
        return context;
    }

    bool RsaPass() const
    {
        return EVP_PKEY_verify(
                   MakeContext(&EVP_PKEY_verify_init).get(),
                   signature.data(),
                   signature.size(),
                   signedDigest.data(),
                   signedDigest.size())
               == 1;
    }
};

VerifyFloor::VerifyFloor()
    : _handles(std::make_unique<Handles>())
{
    _handles->sha256.reset(EVP_MD_fetch(nullptr, "SHA256", nullptr));
    _handles->key.reset(EVP_RSA_gen(2048));
    Require(_handles->sha256 != nullptr && _handles->key != nullptr);
    std::size_t length = static_cast<std::size_t>(EVP_PKEY_get_size(_handles->key.get()));
    _handles->signature.resize(length);
    Require(
        EVP_PKEY_sign(
            _handles->MakeContext(&EVP_PKEY_sign_init).get(),
            _handles->signature.data(),
            &length,
            _handles->signedDigest.data(),
            _handles->signedDigest.size())
        == 1);
}

VerifyFloor::~VerifyFloor() = default;

bool VerifyFloor::Run(const std::string& xml) const
{
    return ParsePass(xml) && _handles->HashPass(xml) && _handles->HashPass(xml)
           && _handles->RsaPass();
}

} // namespace Benchmarks
