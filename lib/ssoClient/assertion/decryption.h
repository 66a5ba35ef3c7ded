#pragma once

#include "quillon/Wiped.h"
#include "quillon/crypto/PrivateKey.h"
#include "quillon/xml/Node.h"

#include <vector>

namespace SsoClient::GeneralReader {

using DecryptionKeys = std::vector<Quillon::Ref<const Quillon::Crypto::PrivateKey>>;

/** @throws Quillon::InvalidArgumentException  a key is null, or no RSA key. */
void RequireDecryptionKeys(const DecryptionKeys& keys);

/**
 * The text of the assertion in an `EncryptedAssertion`.
 *
 * @throws ParseException  it is not built as it should be; or, always in the same words, none of
 *                         the keys decrypts it.
 */
Quillon::Wiped DecryptAssertion(
    const Quillon::Xml::ElementNode& element, const DecryptionKeys& keys);

} // namespace SsoClient::GeneralReader
