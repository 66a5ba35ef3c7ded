#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"

namespace SsoClient {

/** The caller's own identity, for holder-of-key tokens and signed requests. */
struct HolderOfKeyConfig
{
    Quillon::Ref<const Quillon::Crypto::PrivateKey> privateKey;   ///< signs requests
    Quillon::Ref<const Quillon::Crypto::Certificate> certificate; ///< of that key
};

} // namespace SsoClient
