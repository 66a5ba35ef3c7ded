#pragma once

#include "CommandLine.h"

#include "quillon/crypto/PrivateKey.h"

#include <optional>
#include <string>
#include <vector>

/** The private keys that encrypted assertions are decrypted with. */
class DecryptionKeys
{
public:
    using Keys = std::vector<Quillon::Ref<const Quillon::Crypto::PrivateKey>>;

    void AddTo(const Command& command);

    bool IsGiven() const { return !_names.empty(); }

    /** Whether one is not in a file but in a store, for which others may do the work. */
    bool AreInStores() const;

    /**
     * The keys, which are read once, so that a passphrase is asked for once.
     *
     * @throws UsageError  one cannot be read, or is no RSA key.
     */
    const Keys& Get() const;

private:
    std::vector<std::string> _names;
    std::string _passphraseFile;
    mutable std::optional<Keys> _keys;
};
