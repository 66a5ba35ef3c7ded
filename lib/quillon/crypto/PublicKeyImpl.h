#pragma once

#include "crypto/OpenSsl.h"
#include "crypto/PreparedContexts.h"
#include "crypto/keyFacts.h"

#include "quillon/crypto/PublicKey.h"

namespace Quillon::Crypto {

/** A public key over a handle that it owns. */
class PublicKeyImpl final : public PublicKey
{
public:
    explicit PublicKeyImpl(KeyOwner key);

    KeyType GetKeyType() const noexcept override { return _facts.type; }
    int GetBits() const noexcept override { return _facts.bits; }
    std::string GetDescription() const override { return DescribeKey(_key.get()); }
    bool VerifyDigest(
        HashAlgorithm algorithm,
        const unsigned char* digest,
        const unsigned char* signature,
        std::size_t signatureLength) const override;
    bool VerifyPssDigest(
        HashAlgorithm algorithm,
        const unsigned char* digest,
        const unsigned char* signature,
        std::size_t signatureLength) const override;
    std::vector<unsigned char> GetEncoded() const override;

private:
    bool Verify(
        const PreparedContexts& contexts,
        HashAlgorithm algorithm,
        const unsigned char* digest,
        const unsigned char* signature,
        std::size_t signatureLength) const;

    KeyOwner _key;
    KeyFacts _facts;
    PreparedContexts _contexts;
    PreparedContexts _pssContexts;
};

} // namespace Quillon::Crypto
