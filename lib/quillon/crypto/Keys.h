#pragma once

// What public and private keys share.

#include "crypto/OpenSsl.h"

#include "quillon/crypto/PublicKey.h"

namespace Quillon::Crypto {

KeyType GetKeyType(const EVP_PKEY* key);

/** For messages, for example `RSA-2048` or `EC prime256v1`. */
std::string DescribeKey(const EVP_PKEY* key);

/** Length of r and of s in an ECDSA signature by `key` [XMLDSIG 6.4.3]. */
std::size_t GetEcdsaIntegerLength(const EVP_PKEY* key) noexcept;

/** A public key over a handle that it owns. */
class PublicKeyImpl final : public PublicKey
{
public:
    explicit PublicKeyImpl(KeyOwner key);

    KeyType GetKeyType() const noexcept override { return _type; }
    int GetBits() const noexcept override { return _bits; }
    std::string GetDescription() const override { return DescribeKey(_key.get()); }
    bool VerifyDigest(
        HashAlgorithm algorithm,
        const unsigned char* digest,
        const unsigned char* signature,
        std::size_t signatureLength) const override;

private:
    KeyOwner _key;
    KeyType _type;
    int _bits;
};

} // namespace Quillon::Crypto
