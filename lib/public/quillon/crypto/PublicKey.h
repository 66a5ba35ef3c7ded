#pragma once

#include "quillon/Exceptions.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Quillon::Crypto {

/** Something that the cryptographic library refuses; the text carries its reason. */
class QUILLON_API CryptoException : public ExceptionOf<CryptoException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~CryptoException() override;
};

enum class KeyType
{
    RSA,
    EC,   ///< on one of the curves P-256, P-384 and P-521 [FIPS 186-4 D.1.2]
    OTHER ///< any other algorithm or curve
};

enum class HashAlgorithm
{
    SHA256,
    SHA384,
    SHA512
};

/** Length of a digest in bytes. */
constexpr std::size_t GetDigestLength(HashAlgorithm algorithm) noexcept
{
    return algorithm == HashAlgorithm::SHA256 ? 32 : algorithm == HashAlgorithm::SHA384 ? 48 : 64;
}

inline constexpr std::size_t MaxDigestLength = 64;

/**
 * A public key. Thread safety: immutable.
 */
class QUILLON_API PublicKey
{
public:
    virtual KeyType GetKeyType() const noexcept = 0;

    /** Bits of an RSA modulus or of an elliptic curve's order. */
    virtual int GetBits() const noexcept = 0;

    /** For messages, for example `RSA-2048` or `EC prime256v1`. */
    virtual std::string GetDescription() const = 0;

    /**
     * Verifies a signature over `digest`, which has the length of `algorithm`: PKCS #1 v1.5
     * [RFC 8017 8.2] for RSA; for EC the plain concatenation of r and s that XML Signature uses
     * [XMLDSIG11 6.4.3].
     *
     * @return whether it verifies; false also for a value of the wrong form.
     */
    virtual bool VerifyDigest(
        HashAlgorithm algorithm,
        const unsigned char* digest,
        const unsigned char* signature,
        std::size_t signatureLength) const = 0;

    /**
     * The same for RSASSA-PSS [RFC 8017 8.1] with MGF1 on `algorithm` and a salt as long as the
     * digest; false for a key that is not RSA.
     */
    virtual bool VerifyPssDigest(
        HashAlgorithm algorithm,
        const unsigned char* digest,
        const unsigned char* signature,
        std::size_t signatureLength) const = 0;

    /** The DER form of SubjectPublicKeyInfo [RFC 5280 4.1]. @throws CryptoException */
    virtual std::vector<unsigned char> GetEncoded() const = 0;

protected:
    ~PublicKey() = default;
};

} // namespace Quillon::Crypto
