#pragma once

// What the other parts of Quillon may see of the objects behind the interfaces.

#include "crypto/OpenSsl.h"

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"

namespace Quillon::Crypto {

/** The handle inside a certificate; owned by it, not to be changed. */
X509* GetX509(const Certificate& certificate) noexcept;

/** The handle inside a private key; owned by it, not to be changed. */
EVP_PKEY* GetKey(const PrivateKey& key) noexcept;

/** The digest implementation, fetched once and kept for the life of the process. */
const EVP_MD* GetDigest(HashAlgorithm algorithm);

} // namespace Quillon::Crypto
