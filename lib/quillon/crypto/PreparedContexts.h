#pragma once

#include "crypto/OpenSsl.h"

#include "quillon/crypto/PublicKey.h"

#include <array>
#include <atomic>

namespace Quillon::Crypto {

/**
 * Contexts for one kind of operation with one key. Finding the implementation and setting it up
 * costs a sixth of an RSA verification, so it is done once for each digest, and what is handed out
 * are copies.
 *
 * Thread safety: any number of threads.
 */
class PreparedContexts
{
public:
    /** Makes a new context ready for signing or verifying digests; false if it cannot be. */
    using Setup = bool (*)(EVP_PKEY_CTX* context, const EVP_MD* digest);

    /** @param key  outlives this. */
    PreparedContexts(EVP_PKEY* key, Setup setup) noexcept
        : _key(key)
        , _setup(setup)
    {}
    ~PreparedContexts();
    PreparedContexts(const PreparedContexts&) = delete;
    PreparedContexts& operator=(const PreparedContexts&) = delete;

    /** A context for one operation; null if there can be none. */
    KeyContextOwner Get(HashAlgorithm algorithm) const;

private:
    KeyContextOwner Make(HashAlgorithm algorithm) const;
    EVP_PKEY_CTX* Prepare(HashAlgorithm algorithm) const;

    EVP_PKEY* _key;
    Setup _setup;
    mutable std::array<std::atomic<EVP_PKEY_CTX*>, 3> _prepared{}; // owned; null until used
};

} // namespace Quillon::Crypto
