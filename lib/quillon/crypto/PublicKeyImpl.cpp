#include "crypto/PublicKeyImpl.h"

#include "crypto/handles.h"
#include "crypto/keyFacts.h"

#include <vector>

namespace Quillon::Crypto {

namespace {

/** The DER form that OpenSSL wants of a signature given as r || s; empty if it is not one. */
std::vector<unsigned char> ToDerEcdsa(
    const EVP_PKEY* key, const unsigned char* signature, std::size_t length)
{
    const std::size_t half = GetEcdsaIntegerLength(key);
    if (length != 2 * half) {
        return {};
    }
    EcdsaSigOwner value(ECDSA_SIG_new());
    BIGNUM* r = BN_bin2bn(signature, static_cast<int>(half), nullptr);
    BIGNUM* s = BN_bin2bn(signature + half, static_cast<int>(half), nullptr);
    if (!value || r == nullptr || s == nullptr || ECDSA_SIG_set0(value.get(), r, s) != 1) {
        BN_free(r);
        BN_free(s);
        return {};
    }
    const int size = i2d_ECDSA_SIG(value.get(), nullptr);
    std::vector<unsigned char> der(size > 0 ? static_cast<std::size_t>(size) : 0);
    unsigned char* out = der.data();
    const bool isWritten = size > 0 && i2d_ECDSA_SIG(value.get(), &out) == size;
    return isWritten ? der : std::vector<unsigned char>();
}

bool SetUpRsa(EVP_PKEY_CTX* context, const EVP_MD* digest)
{
    return EVP_PKEY_verify_init(context) == 1
           && EVP_PKEY_CTX_set_rsa_padding(context, RSA_PKCS1_PADDING) == 1
           && EVP_PKEY_CTX_set_signature_md(context, digest) == 1;
}

bool SetUpPss(EVP_PKEY_CTX* context, const EVP_MD* digest)
{
    return EVP_PKEY_verify_init(context) == 1
           && EVP_PKEY_CTX_set_rsa_padding(context, RSA_PKCS1_PSS_PADDING) == 1
           && EVP_PKEY_CTX_set_signature_md(context, digest) == 1
           && EVP_PKEY_CTX_set_rsa_mgf1_md(context, digest) == 1
           && EVP_PKEY_CTX_set_rsa_pss_saltlen(context, RSA_PSS_SALTLEN_DIGEST) == 1;
}

bool SetUpEcdsa(EVP_PKEY_CTX* context, const EVP_MD* digest)
{
    return EVP_PKEY_verify_init(context) == 1
           && EVP_PKEY_CTX_set_signature_md(context, digest) == 1;
}

} // namespace

CryptoException::~CryptoException() = default;

PublicKeyImpl::PublicKeyImpl(KeyOwner key)
    : _key(std::move(key))
    , _facts(GetKeyFacts(_key.get()))
    , _contexts(_key.get(), _facts.type == KeyType::RSA ? &SetUpRsa : &SetUpEcdsa)
    , _pssContexts(_key.get(), &SetUpPss)
{}

bool PublicKeyImpl::VerifyDigest(
    HashAlgorithm algorithm,
    const unsigned char* digest,
    const unsigned char* signature,
    std::size_t signatureLength) const
{
    const ErrorQueueScope errors;
    std::vector<unsigned char> der;
    if (_facts.type == KeyType::EC) {
        der = ToDerEcdsa(_key.get(), signature, signatureLength);
        signature = der.data();
        signatureLength = der.size();
        if (der.empty()) {
            return false;
        }
    }
    return Verify(_contexts, algorithm, digest, signature, signatureLength);
}

bool PublicKeyImpl::VerifyPssDigest(
    HashAlgorithm algorithm,
    const unsigned char* digest,
    const unsigned char* signature,
    std::size_t signatureLength) const
{
    if (_facts.type != KeyType::RSA) {
        return false;
    }
    const ErrorQueueScope errors;
    return Verify(_pssContexts, algorithm, digest, signature, signatureLength);
}

bool PublicKeyImpl::Verify(
    const PreparedContexts& contexts,
    HashAlgorithm algorithm,
    const unsigned char* digest,
    const unsigned char* signature,
    std::size_t signatureLength) const
{
    const KeyContextOwner context = contexts.Get(algorithm);
    if (!context) {
        throw CryptoException("Cannot verify with a key of type " + GetDescription());
    }
    return EVP_PKEY_verify(
               context.get(), signature, signatureLength, digest, GetDigestLength(algorithm))
           == 1;
}

std::vector<unsigned char> PublicKeyImpl::GetEncoded() const
{
    const ErrorQueueScope errors;
    const int size = i2d_PUBKEY(_key.get(), nullptr);
    if (size <= 0) {
        throw CryptoException("Cannot encode a key of type " + GetDescription());
    }
    std::vector<unsigned char> der(static_cast<std::size_t>(size));
    unsigned char* out = der.data();
    if (i2d_PUBKEY(_key.get(), &out) != size) {
        throw std::bad_alloc(); // it was possible a moment ago
    }
    return der;
}

} // namespace Quillon::Crypto
