#include "quillon/crypto/Decryption.h"

#include "crypto/handles.h"
#include "crypto/keyFacts.h"

#include <string>
#include <utility>

namespace Quillon::Crypto {

namespace {

constexpr std::size_t VectorLength = 12;
constexpr int TagLength = 16;

const char* GetName(OaepHash hash) noexcept
{
    switch (hash) {
    case OaepHash::SHA1:
        return "SHA1";
    case OaepHash::SHA256:
        return "SHA256";
    case OaepHash::SHA384:
        return "SHA384";
    default:
        return "SHA512";
    }
}

KeyContextOwner StartOaep(EVP_PKEY* key, const OaepHashes& hashes)
{
    KeyContextOwner context(EVP_PKEY_CTX_new_from_pkey(nullptr, key, nullptr));
    if (!context || EVP_PKEY_decrypt_init(context.get()) != 1
        || EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_OAEP_PADDING) != 1
        || EVP_PKEY_CTX_set_rsa_oaep_md_name(context.get(), GetName(hashes.digest), nullptr) != 1
        || EVP_PKEY_CTX_set_rsa_mgf1_md_name(context.get(), GetName(hashes.mask), nullptr) != 1) {
        throw CryptoException(
            "A key of type " + DescribeKey(key) + " cannot decrypt: " + GetOpenSslError());
    }
    return context;
}

/** Null for a length that AES does not have. */
const EVP_CIPHER* GetGcm(std::size_t keyLength) noexcept
{
    return keyLength == 16   ? EVP_aes_128_gcm()
           : keyLength == 24 ? EVP_aes_192_gcm()
           : keyLength == 32 ? EVP_aes_256_gcm()
                             : nullptr;
}

CipherContextOwner StartGcm(
    const EVP_CIPHER* cipher, std::string_view key, const unsigned char* vector)
{
    CipherContextOwner context(EVP_CIPHER_CTX_new());
    if (!context
        || EVP_DecryptInit_ex2(
               context.get(),
               cipher,
               reinterpret_cast<const unsigned char*>(key.data()),
               vector,
               nullptr)
               != 1) {
        throw CryptoException("OpenSSL offers no AES-GCM: " + GetOpenSslError());
    }
    return context;
}

/** Decrypts `plain.size()` octets, and says whether the tag behind them is theirs. */
bool Finish(EVP_CIPHER_CTX* context, const unsigned char* encrypted, std::string& plain)
{
    auto* out = reinterpret_cast<unsigned char*>(plain.data());
    const int length = static_cast<int>(plain.size());
    std::vector<unsigned char> tag(encrypted + length, encrypted + length + TagLength);
    int written = 0;
    int last = 0;
    return EVP_DecryptUpdate(context, out, &written, encrypted, length) == 1
           && EVP_CIPHER_CTX_ctrl(context, EVP_CTRL_GCM_SET_TAG, TagLength, tag.data()) == 1
           && EVP_DecryptFinal_ex(context, out + written, &last) == 1;
}

} // namespace

boost::optional<Wiped> DecryptOaep(
    const PrivateKey& key, const OaepHashes& hashes, const std::vector<unsigned char>& text)
{
    if (key.GetKeyType() != KeyType::RSA) {
        return boost::none;
    }
    const ErrorQueueScope errors;
    EVP_PKEY* const handle = GetKey(key);
    const KeyContextOwner context = StartOaep(handle, hashes);
    std::size_t length = static_cast<std::size_t>(EVP_PKEY_get_size(handle));
    std::string buffer(length, '\0');
    const bool isDecrypted = EVP_PKEY_decrypt(
                                 context.get(),
                                 reinterpret_cast<unsigned char*>(buffer.data()),
                                 &length,
                                 text.data(),
                                 text.size())
                             == 1;
    buffer.resize(isDecrypted ? length : 0);
    Wiped plain(std::move(buffer));
    return boost::make_optional(isDecrypted, std::move(plain));
}

boost::optional<Wiped> DecryptAesGcm(std::string_view key, const std::vector<unsigned char>& text)
{
    const EVP_CIPHER* const cipher = GetGcm(key.size());
    if (cipher == nullptr || text.size() < VectorLength + TagLength
        || text.size() > MaxReadableBytes) {
        return boost::none;
    }
    const ErrorQueueScope errors;
    const CipherContextOwner context = StartGcm(cipher, key, text.data());
    std::string buffer(text.size() - VectorLength - TagLength, '\0');
    const bool isGenuine = Finish(context.get(), text.data() + VectorLength, buffer);
    Wiped plain(std::move(buffer));
    return boost::make_optional(isGenuine, std::move(plain));
}

} // namespace Quillon::Crypto
