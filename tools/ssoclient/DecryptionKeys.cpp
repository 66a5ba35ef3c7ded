#include "DecryptionKeys.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "PrivateKeys.h"

#include "quillon/MessageFormatter.h"

#include <algorithm>

using Quillon::Crypto::PrivateKey;

namespace {

Quillon::Ref<const PrivateKey> ReadKey(const std::string& name, const std::string& passphraseFile)
{
    try {
        Quillon::Ref<const PrivateKey> key =
            ReadPrivateKey(name, DecryptionKeyPassphrase, passphraseFile);
        if (key->GetKeyType() != Quillon::Crypto::KeyType::RSA) {
            throw UsageError(Quillon::MessageFormatter::ASPrint(
                "assertions are decrypted with an RSA key, not with one of type %1",
                key->GetDescription()));
        }
        return key;
    } catch (const Quillon::Crypto::CryptoException& error) {
        ThrowKeyError(name, error.what());
    }
}

} // namespace

void DecryptionKeys::AddTo(const Command& command)
{
    const Option key = command
                           .AddOption(
                               "--decrypt-key",
                               _names,
                               "The private key that encrypted assertions are for: a PEM or DER "
                               "file, or the URI of a key in an OpenSSL store; may repeat")
                           .Check(CheckNotEmpty)
                           .ValueName("KEY");
    command
        .AddOption(
            "--decrypt-passphrase-file",
            _passphraseFile,
            "File whose first line is the passphrase of that key, - for standard input (default: "
            "ask for it)")
        .Needs(key)
        .Check(CheckNotEmpty)
        .ValueName("FILE");
}

bool DecryptionKeys::AreInStores() const
{
    return std::any_of(_names.begin(), _names.end(), &IsUri);
}

const DecryptionKeys::Keys& DecryptionKeys::Get() const
{
    if (!_keys) {
        Keys keys;
        keys.reserve(_names.size());
        for (const std::string& name : _names) {
            keys.push_back(ReadKey(name, _passphraseFile));
        }
        _keys = std::move(keys);
    }
    return *_keys;
}
