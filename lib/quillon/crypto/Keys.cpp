#include "crypto/Keys.h"

#include "crypto/Handles.h"

#include <array>
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
    if (size > 0) {
        i2d_ECDSA_SIG(value.get(), &out);
    }
    return der;
}

/** The name of an elliptic curve; empty for any other key. */
std::string GetGroupName(const EVP_PKEY* key)
{
    const ErrorQueueScope errors;
    std::array<char, 80> name{};
    const bool isCurve = EVP_PKEY_is_a(key, "EC") == 1
                         && EVP_PKEY_get_group_name(key, name.data(), name.size(), nullptr) == 1;
    return isCurve ? name.data() : "";
}

} // namespace

CryptoException::~CryptoException() = default;

KeyType GetKeyType(const EVP_PKEY* key)
{
    // By name, not by number: a key behind a provider has no number.
    if (EVP_PKEY_is_a(key, "RSA") == 1) {
        return KeyType::RSA;
    }
    const std::string group = GetGroupName(key);
    const bool isAccepted = group == SN_X9_62_prime256v1 || group == "P-256"
                            || group == SN_secp384r1 || group == "P-384" || group == SN_secp521r1
                            || group == "P-521";
    return isAccepted ? KeyType::EC : KeyType::OTHER;
}

std::string DescribeKey(const EVP_PKEY* key)
{
    if (EVP_PKEY_is_a(key, "RSA") == 1) {
        return "RSA-" + std::to_string(EVP_PKEY_get_bits(key));
    }
    const std::string group = GetGroupName(key);
    if (!group.empty()) {
        return "EC " + group;
    }
    const char* typeName = EVP_PKEY_get0_type_name(key);
    return typeName != nullptr ? typeName : "unknown";
}

std::size_t GetEcdsaIntegerLength(const EVP_PKEY* key) noexcept
{
    return (static_cast<std::size_t>(EVP_PKEY_get_bits(key)) + 7) / 8;
}

PublicKeyImpl::PublicKeyImpl(KeyOwner key)
    : _key(std::move(key))
    , _type(Crypto::GetKeyType(_key.get()))
    , _bits(EVP_PKEY_get_bits(_key.get()))
{}

bool PublicKeyImpl::VerifyDigest(
    HashAlgorithm algorithm,
    const unsigned char* digest,
    const unsigned char* signature,
    std::size_t signatureLength) const
{
    const ErrorQueueScope errors;
    std::vector<unsigned char> der;
    if (_type == KeyType::EC) {
        der = ToDerEcdsa(_key.get(), signature, signatureLength);
        signature = der.data();
        signatureLength = der.size();
        if (der.empty()) {
            return false;
        }
    }
    const KeyContextOwner context(EVP_PKEY_CTX_new_from_pkey(nullptr, _key.get(), nullptr));
    if (!context || EVP_PKEY_verify_init(context.get()) != 1
        || (_type == KeyType::RSA
            && EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_PADDING) != 1)
        || EVP_PKEY_CTX_set_signature_md(context.get(), GetDigest(algorithm)) != 1) {
        throw CryptoException("Cannot verify with a key of type " + GetDescription());
    }
    return EVP_PKEY_verify(
               context.get(), signature, signatureLength, digest, GetDigestLength(algorithm))
           == 1;
}

} // namespace Quillon::Crypto
