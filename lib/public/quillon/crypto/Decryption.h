#pragma once

#include "quillon/Wiped.h"
#include "quillon/crypto/PrivateKey.h"

#include <boost/optional.hpp>

#include <string_view>
#include <vector>

/** What opens a text that was encrypted for a key: RSA-OAEP for its key, AES-GCM for the text. */
namespace Quillon::Crypto {

/** The hashes of RSA-OAEP. It does not rest on collisions being hard to find: SHA-1 is sound. */
enum class OaepHash
{
    SHA1,
    SHA256,
    SHA384,
    SHA512
};

struct OaepHashes
{
    OaepHash digest;
    OaepHash mask; ///< of MGF1
};

/**
 * Decrypts with RSA-OAEP [RFC 8017 7.1] and an empty label.
 *
 * @return nothing if the text was not encrypted for this key, or is no such text: who could tell
 *         one from the other would learn something of what others have encrypted.
 * @throws CryptoException  OpenSSL does not offer these hashes.
 */
QUILLON_API boost::optional<Wiped> DecryptOaep(
    const PrivateKey& key, const OaepHashes& hashes, const std::vector<unsigned char>& text);

/**
 * Decrypts with AES in Galois/Counter Mode [SP 800-38D].
 *
 * @param key   16, 24 or 32 octets.
 * @param text  an initialization vector of 12 octets, the encrypted octets, a tag of 16
 *              [XMLENC11 5.2.4].
 *
 * @return nothing if the tag does not verify, or the lengths are not these.
 * @throws CryptoException  OpenSSL does not offer the cipher.
 */
QUILLON_API boost::optional<Wiped> DecryptAesGcm(
    std::string_view key, const std::vector<unsigned char>& text);

} // namespace Quillon::Crypto
