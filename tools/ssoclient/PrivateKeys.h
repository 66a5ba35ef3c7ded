#pragma once

#include "Secret.h"

#include "quillon/crypto/PrivateKey.h"

#include <string>

/** Whether `key` begins with a scheme [RFC 3986 3.1], and so is not the name of a file. */
bool IsUri(const std::string& key);

/**
 * Reads the private key that an option names: a PEM or DER file, or the URI of a key in an OpenSSL
 * store. Asks for its passphrase at most once, and only if it has one.
 *
 * @param kind            what the passphrase is called.
 * @param passphraseFile  a file with it; empty to ask at the terminal.
 *
 * @throws UsageError                        the file or the passphrase cannot be read.
 * @throws Quillon::Crypto::CryptoException  there is no such key; see `ThrowKeyError`.
 */
Quillon::Ref<const Quillon::Crypto::PrivateKey> ReadPrivateKey(
    const std::string& key, const SecretKind& kind, const std::string& passphraseFile);

/** Raises a `UsageError` that names the key, without the PIN that its URI may have. */
[[noreturn]] void ThrowKeyError(const std::string& key, const std::string& reason);
