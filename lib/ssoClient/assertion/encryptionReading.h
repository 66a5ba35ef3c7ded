#pragma once

#include "quillon/crypto/Decryption.h"
#include "ssoClient/assertion/reading.h"

#include <cstddef>
#include <vector>

namespace SsoClient::GeneralReader {

/** An `xenc:EncryptedKey`: the key of the content, encrypted for somebody. */
struct EncryptedKey
{
    Quillon::Crypto::OaepHashes hashes;
    std::vector<unsigned char> text;
};

/** An encrypted element that is read and not yet decrypted. */
struct EncryptedElement
{
    std::size_t keyLength; ///< of the content's key, in octets
    std::vector<unsigned char> text;
    std::vector<EncryptedKey> keys; ///< the same key, for everyone who may have it
};

/** Whether the element is an `EncryptedAssertion` [SAML-CORE 2.3.4] or an `xenc:EncryptedData`. */
bool IsEncrypted(const ElementNode& element);

/**
 * Reads one of these. Nothing of it is trusted: nobody has signed it.
 *
 * @throws ParseException  it is not built as [XMLENC11] says, or uses something that is refused.
 */
EncryptedElement ReadEncryptedAssertion(const ElementNode& element);

} // namespace SsoClient::GeneralReader
