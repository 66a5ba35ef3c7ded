#include "ssoClient/assertion/decryption.h"

#include "quillon/Exceptions.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/encryptionReading.h"

#include <boost/optional.hpp>

#include <utility>

namespace SsoClient::GeneralReader {

using Quillon::Wiped;
using Quillon::Crypto::PrivateKey;

namespace {

/** Nothing if the key is of another's, or of another length than the content's cipher has. */
boost::optional<Wiped> DecryptContentKey(
    const EncryptedKey& encrypted, const PrivateKey& key, std::size_t length)
{
    boost::optional<Wiped> contentKey =
        Quillon::Crypto::DecryptOaep(key, encrypted.hashes, encrypted.text);
    if (contentKey && contentKey->Get().size() != length) {
        contentKey = boost::none;
    }
    return contentKey;
}

/** The tag tells whether the keys are the right ones; what is said of them elsewhere is not. */
boost::optional<Wiped> Decrypt(
    const EncryptedElement& encrypted, const EncryptedKey& encryptedKey, const DecryptionKeys& keys)
{
    for (const auto& key : keys) {
        const auto contentKey = DecryptContentKey(encryptedKey, *key, encrypted.keyLength);
        boost::optional<Wiped> text;
        if (contentKey) {
            text = Quillon::Crypto::DecryptAesGcm(contentKey->Get(), encrypted.text);
        }
        if (text) {
            return text;
        }
    }
    return boost::none;
}

} // namespace

void RequireDecryptionKeys(const DecryptionKeys& keys)
{
    for (const auto& key : keys) {
        if (key == nullptr) {
            throw Quillon::InvalidArgumentException("A decryption key is null");
        }
        if (key->GetKeyType() != Quillon::Crypto::KeyType::RSA) {
            throw Quillon::InvalidArgumentException(
                "A decryption key is of type " + key->GetDescription() + ", expected RSA");
        }
    }
}

Wiped DecryptAssertion(const Quillon::Xml::ElementNode& element, const DecryptionKeys& keys)
{
    if (keys.empty()) {
        throw ParseException("The assertion is encrypted, and the rules have no key to decrypt it");
    }
    const EncryptedElement encrypted = ReadEncryptedAssertion(element);
    for (const EncryptedKey& encryptedKey : encrypted.keys) {
        if (boost::optional<Wiped> text = Decrypt(encrypted, encryptedKey, keys)) {
            return std::move(*text);
        }
    }
    // Which step has failed is not told: who may ask often could decrypt by what is told.
    throw ParseException("The assertion cannot be decrypted with the keys of the rules");
}

} // namespace SsoClient::GeneralReader
