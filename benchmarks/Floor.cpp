#include "Floor.h"

#include <libxml/SAX2.h>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>

#include <array>
#include <cstring>
#include <stdexcept>
#include <utility>

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
using BioOwner = std::unique_ptr<BIO, Deleter<BIO_free_all>>;

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

using ParserOwner = std::unique_ptr<xmlParserCtxt, Deleter<xmlFreeParserCtxt>>;

xmlSAXHandler MakeHandler()
{
    xmlSAXHandler handler;
    std::memset(&handler, 0, sizeof handler);
    handler.initialized = XML_SAX2_MAGIC;
    handler.startElementNs = &OnStartElement;
    handler.endElementNs = &OnEndElement;
    handler.characters = &OnCharacters;
    return handler;
}

bool ParsePass(xmlParserCtxt& parser, const std::string& xml)
{
    std::size_t characters = 0;
    xmlCtxtReset(&parser);
    *parser.sax = MakeHandler();
    parser.userData = &characters;
    inputPush(
        &parser, xmlNewStringInputStream(&parser, reinterpret_cast<const xmlChar*>(xml.c_str())));
    return xmlParseDocument(&parser) == 0 && characters != 0;
}

// An RSA key and the digest that it signs.
struct RsaOperation
{
    MdOwner sha256{EVP_MD_fetch(nullptr, "SHA256", nullptr)};
    KeyOwner key;
    DigestBytes signedDigest{};

    explicit RsaOperation(KeyOwner ownKey)
        : key(std::move(ownKey))
    {
        Require(sha256 != nullptr && key != nullptr);
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

    bool Sign(EVP_PKEY_CTX& context, std::vector<unsigned char>& signature) const
    {
        std::size_t length = static_cast<std::size_t>(EVP_PKEY_get_size(key.get()));
        signature.resize(length);
        return EVP_PKEY_sign(
                   &context, signature.data(), &length, signedDigest.data(), signedDigest.size())
               == 1;
    }
};

KeyOwner ReadKey(const std::string& pem)
{
    const BioOwner text(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
    return KeyOwner(PEM_read_bio_PrivateKey(text.get(), nullptr, nullptr, nullptr));
}

} // namespace

// Whatever can be made once and used again is.
struct VerifyFloor::Handles
{
    RsaOperation rsa{KeyOwner(EVP_RSA_gen(2048))};
    ContextOwner verifying = rsa.MakeContext(&EVP_PKEY_verify_init);
    MdContextOwner hashing{EVP_MD_CTX_new()};
    ParserOwner parser{xmlNewParserCtxt()};
    std::vector<unsigned char> signature;

    bool HashPass(const std::string& xml) const
    {
        DigestBytes digest{};
        return EVP_DigestInit_ex2(hashing.get(), rsa.sha256.get(), nullptr) == 1
               && EVP_DigestUpdate(hashing.get(), xml.data(), xml.size()) == 1
               && EVP_DigestFinal_ex(hashing.get(), digest.data(), nullptr) == 1;
    }

    bool VerifyOnce() const
    {
        return EVP_PKEY_verify(
                   verifying.get(),
                   signature.data(),
                   signature.size(),
                   rsa.signedDigest.data(),
                   rsa.signedDigest.size())
               == 1;
    }
};

VerifyFloor::VerifyFloor()
    : _handles(std::make_unique<Handles>())
{
    Require(_handles->hashing != nullptr && _handles->parser != nullptr);
    Require(
        _handles->rsa.Sign(*_handles->rsa.MakeContext(&EVP_PKEY_sign_init), _handles->signature));
}

VerifyFloor::~VerifyFloor() = default;

bool VerifyFloor::Run(const std::string& xml) const
{
    return ParsePass(*_handles->parser, xml) && _handles->HashPass(xml) && _handles->HashPass(xml)
           && _handles->VerifyOnce();
}

struct SignFloor::Handles
{
    RsaOperation rsa;
    ContextOwner signing;

    explicit Handles(KeyOwner key)
        : rsa(std::move(key))
        , signing(rsa.MakeContext(&EVP_PKEY_sign_init))
    {}
};

SignFloor::SignFloor(const std::string& keyPem)
    : _handles(std::make_unique<Handles>(ReadKey(keyPem)))
{}

SignFloor::~SignFloor() = default;

bool SignFloor::Run() const
{
    std::vector<unsigned char> signature;
    return _handles->rsa.Sign(*_handles->signing, signature);
}

} // namespace Benchmarks
