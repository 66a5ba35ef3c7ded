#include "xml/security/Algorithms.h"

#include "core/quote.h"
#include "crypto/acceptedKeys.h"

#include "quillon/xml/security/Exceptions.h"
#include "quillon/xml/security/Identifiers.h"

#include <algorithm>
#include <array>
#include <string>

namespace Quillon::Xml::Security {

namespace {

using Crypto::HashAlgorithm;
using Crypto::KeyType;

// No HMAC: its "key" would be a public text. No SHA-1 and no MD5: collisions are affordable.
constexpr std::array<SignatureAlgorithm, 6> SignatureAlgorithms{{
    {RsaSha256, KeyType::RSA, HashAlgorithm::SHA256, false},
    {RsaSha384, KeyType::RSA, HashAlgorithm::SHA384, false},
    {RsaSha512, KeyType::RSA, HashAlgorithm::SHA512, false},
    {EcdsaSha256, KeyType::EC, HashAlgorithm::SHA256, false},
    {EcdsaSha384, KeyType::EC, HashAlgorithm::SHA384, false},
    {EcdsaSha512, KeyType::EC, HashAlgorithm::SHA512, false},
}};

constexpr std::array<SignatureAlgorithm, 3> PssAlgorithms{{
    {RsaPssSha256, KeyType::RSA, HashAlgorithm::SHA256, true},
    {RsaPssSha384, KeyType::RSA, HashAlgorithm::SHA384, true},
    {RsaPssSha512, KeyType::RSA, HashAlgorithm::SHA512, true},
}};

template <class Algorithms>
const SignatureAlgorithm* Find(const Algorithms& algorithms, std::string_view identifier) noexcept
{
    const auto* found = std::find_if(
        algorithms.begin(), algorithms.end(), [identifier](const SignatureAlgorithm& algorithm) {
            return identifier == algorithm.identifier;
        });
    return found == algorithms.end() ? nullptr : found;
}

} // namespace

const SignatureAlgorithm& GetSignatureAlgorithm(
    std::string_view identifier, SignatureProfile profile)
{
    const SignatureAlgorithm* found = Find(SignatureAlgorithms, identifier);
    if (found == nullptr && profile == SignatureProfile::WITH_RSA_PSS) {
        found = Find(PssAlgorithms, identifier);
    }
    if (found == nullptr) {
        throw XmlSecurityException("Signature algorithm " + Quote(identifier) + " is not accepted");
    }
    return *found;
}

Crypto::HashAlgorithm GetDigestAlgorithm(std::string_view identifier)
{
    if (identifier == DigestSha256) {
        return HashAlgorithm::SHA256;
    }
    if (identifier == DigestSha384) {
        return HashAlgorithm::SHA384;
    }
    if (identifier == DigestSha512) {
        return HashAlgorithm::SHA512;
    }
    throw XmlSecurityException("Digest algorithm " + Quote(identifier) + " is not accepted");
}

bool IsAcceptedKey(const SignatureAlgorithm& algorithm, Crypto::KeyType type, int bits) noexcept
{
    return type == algorithm.keyType && Crypto::IsStrongEnough(type, bits);
}

} // namespace Quillon::Xml::Security
