#pragma once

#include "quillon/crypto/PublicKey.h"
#include "quillon/xml/security/Signature.h"

#include <string_view>

// Which algorithms the profile accepts: a change here changes what is trusted.
namespace Quillon::Xml::Security {

/** A signature algorithm of the accepted profile. */
struct SignatureAlgorithm
{
    const char* identifier;
    Crypto::KeyType keyType;
    Crypto::HashAlgorithm hash;
    bool isPss;
};

/** @throws XmlSecurityException  not in the profile. */
const SignatureAlgorithm& GetSignatureAlgorithm(
    std::string_view identifier, SignatureProfile profile);

/** @throws XmlSecurityException  not in the profile. */
Crypto::HashAlgorithm GetDigestAlgorithm(std::string_view identifier);

/** Whether a key fits the algorithm and is strong enough to be used at all. */
bool IsAcceptedKey(const SignatureAlgorithm& algorithm, Crypto::KeyType type, int bits) noexcept;

} // namespace Quillon::Xml::Security
