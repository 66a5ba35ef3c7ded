#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"

namespace SsoClient {

/**
 * The caller's own identity, for holder-of-key tokens and signed requests. If either half is null,
 * the service works as if there were no identity: it asks for bearer tokens, and what needs the
 * identity fails.
 */
struct HolderOfKeyConfig
{
    Quillon::Ref<const Quillon::Crypto::PrivateKey> privateKey;   ///< signs requests
    Quillon::Ref<const Quillon::Crypto::Certificate> certificate; ///< of that key
};

} // namespace SsoClient
