#pragma once

#include "quillon/Ref.h"
#include "quillon/crypto/PublicKey.h"

#include <boost/function.hpp>

#include <string>
#include <string_view>
#include <vector>

namespace Quillon::Crypto {

/**
 * A private key, in memory or in a device behind an OpenSSL provider.
 *
 * Thread safety: any number of threads may sign at once.
 */
class QUILLON_API PrivateKey : public RefCounted
{
public:
    virtual KeyType GetKeyType() const noexcept = 0;
    virtual int GetBits() const noexcept = 0;

    /** For messages, for example `RSA-2048`; never key material. */
    virtual std::string GetDescription() const = 0;

    /**
     * Signs `digest`, which has the length of `algorithm`, in the forms that
     * `PublicKey::VerifyDigest` reads.
     *
     * @throws CryptoException  the key cannot sign so.
     */
    virtual std::vector<unsigned char> SignDigest(
        HashAlgorithm algorithm, const unsigned char* digest) const = 0;
};

/** Asked for the passphrase of an encrypted key; called only if the key is encrypted. May throw. */
using PassphraseCallback = boost::function<std::string()>;

/**
 * Reads a private key from PEM (PKCS #8, plain or encrypted, or the traditional forms) or DER.
 *
 * @throws CryptoException  not a private key, the passphrase is wrong or missing, or the text has
 *                          2 GiB or more.
 */
QUILLON_API Ref<const PrivateKey> CreatePrivateKey(
    std::string_view pemOrDer, const PassphraseCallback& passphrase = PassphraseCallback());

/**
 * Loads the private key that a URI names, through OpenSSL's store: `file:/path`, or what a
 * provider that the process has loaded offers, for example `pkcs11:token=t;object=key`. The key
 * may stay inside a device.
 *
 * @param passphrase  is asked for the passphrase or PIN, if one is needed.
 * @throws CryptoException  nothing can be loaded from there, or no private key is among it.
 */
QUILLON_API Ref<const PrivateKey> LoadPrivateKey(
    const std::string& uri, const PassphraseCallback& passphrase = PassphraseCallback());

} // namespace Quillon::Crypto
