#pragma once

#include "crypto/OpenSsl.h"

#include "quillon/crypto/PublicKey.h"

/** What is known of a key by its handle, public or private. */
namespace Quillon::Crypto {

struct KeyFacts
{
    KeyType type = KeyType::OTHER;
    int bits = 0;
};

KeyFacts GetKeyFacts(const EVP_PKEY* key);

/** For messages, for example `RSA-2048` or `EC prime256v1`. */
std::string DescribeKey(const EVP_PKEY* key);

/** Length of r and of s in an ECDSA signature by `key` [XMLDSIG11 6.4.3]. */
std::size_t GetEcdsaIntegerLength(const EVP_PKEY* key) noexcept;

} // namespace Quillon::Crypto
