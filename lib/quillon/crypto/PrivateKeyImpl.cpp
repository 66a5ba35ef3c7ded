#include "quillon/crypto/PrivateKey.h"

#include "crypto/PreparedContexts.h"
#include "crypto/handles.h"
#include "crypto/keyFacts.h"
#include "quillon/Wiped.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <exception>

namespace Quillon::Crypto {

namespace {

/**
 * OpenSSL blinds what it does with an RSA key by two numbers, and makes new ones for each 32nd
 * signature. When that fails, for lack of memory, they do not fit each other, and its signatures
 * are wrong until the next time. It has one pair for one thread and one for all others.
 */
constexpr int SignaturesInDoubt = 64;

bool SetUpRsa(EVP_PKEY_CTX* context, const EVP_MD* digest)
{
    return EVP_PKEY_sign_init(context) == 1
           && EVP_PKEY_CTX_set_rsa_padding(context, RSA_PKCS1_PADDING) == 1
           && EVP_PKEY_CTX_set_signature_md(context, digest) == 1;
}

bool SetUpEcdsa(EVP_PKEY_CTX* context, const EVP_MD* digest)
{
    return EVP_PKEY_sign_init(context) == 1 && EVP_PKEY_CTX_set_signature_md(context, digest) == 1;
}

class PrivateKeyImpl final : public PrivateKey
{
public:
    explicit PrivateKeyImpl(KeyOwner key)
        : _key(std::move(key))
        , _facts(GetKeyFacts(_key.get()))
        , _contexts(_key.get(), _facts.type == KeyType::RSA ? &SetUpRsa : &SetUpEcdsa)
    {}

    KeyType GetKeyType() const noexcept override { return _facts.type; }
    int GetBits() const noexcept override { return _facts.bits; }
    std::string GetDescription() const override { return DescribeKey(_key.get()); }

    std::vector<unsigned char> SignDigest(
        HashAlgorithm algorithm, const unsigned char* digest) const override
    {
        const ErrorQueueScope errors;
        std::vector<unsigned char> signature = Sign(algorithm, digest);
        while (_doubtful > 0) {
            --_doubtful;
            if (IsGenuine(signature, algorithm, digest)) {
                break;
            }
            signature = Sign(algorithm, digest);
        }
        return _facts.type == KeyType::EC ? ToPlainEcdsa(signature) : signature;
    }

    EVP_PKEY* GetHandle() const noexcept { return _key.get(); }

private:
    std::vector<unsigned char> Sign(HashAlgorithm algorithm, const unsigned char* digest) const
    {
        const KeyContextOwner context = _contexts.Get(algorithm);
        std::size_t length = static_cast<std::size_t>(EVP_PKEY_get_size(_key.get()));
        std::vector<unsigned char> signature(length);
        if (!context
            || EVP_PKEY_sign(
                   context.get(), signature.data(), &length, digest, GetDigestLength(algorithm))
                   != 1) {
            _doubtful = SignaturesInDoubt;
            throw CryptoException(
                "A key of type " + GetDescription() + " fails to sign: " + GetOpenSslError());
        }
        signature.resize(length);
        return signature;
    }

    /** Whether a signature with the padding of `SetUpRsa` is one; also if that cannot be said. */
    bool IsGenuine(
        const std::vector<unsigned char>& signature,
        HashAlgorithm algorithm,
        const unsigned char* digest) const
    {
        const KeyContextOwner context(EVP_PKEY_CTX_new_from_pkey(nullptr, _key.get(), nullptr));
        if (_facts.type != KeyType::RSA || !context || EVP_PKEY_verify_init(context.get()) != 1
            || EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_PADDING) != 1
            || EVP_PKEY_CTX_set_signature_md(context.get(), GetDigest(algorithm)) != 1) {
            return true;
        }
        return EVP_PKEY_verify(
                   context.get(),
                   signature.data(),
                   signature.size(),
                   digest,
                   GetDigestLength(algorithm))
               == 1;
    }

    /** r || s of a signature in DER form [XMLDSIG11 6.4.3]. */
    std::vector<unsigned char> ToPlainEcdsa(const std::vector<unsigned char>& der) const
    {
        const unsigned char* in = der.data();
        const EcdsaSigOwner value(d2i_ECDSA_SIG(nullptr, &in, static_cast<long>(der.size())));
        const std::size_t half = GetEcdsaIntegerLength(_key.get());
        std::vector<unsigned char> plain(2 * half);
        const int size = static_cast<int>(half);
        if (!value || BN_bn2binpad(ECDSA_SIG_get0_r(value.get()), plain.data(), size) != size
            || BN_bn2binpad(ECDSA_SIG_get0_s(value.get()), plain.data() + half, size) != size) {
            throw CryptoException("Malformed ECDSA signature: " + GetOpenSslError());
        }
        return plain;
    }

    KeyOwner _key;
    KeyFacts _facts;
    mutable std::atomic<int> _doubtful{0}; // how many of the next signatures are looked at
    PreparedContexts _contexts;
};

/** Carries a passphrase callback through OpenSSL, which knows no exceptions. */
class PassphraseSource
{
public:
    explicit PassphraseSource(const PassphraseCallback& callback)
        : _callback(callback)
    {}

    /** OpenSSL's callback. Without one of ours nobody is asked; OpenSSL itself would prompt. */
    static int OnPassphrase(char* buffer, int size, int /*isWriting*/, void* data)
    {
        auto& self = *static_cast<PassphraseSource*>(data);
        self._wasAsked = true;
        if (self._callback.empty()) {
            return -1;
        }
        try {
            return self.Copy(Wiped(self._callback()), buffer, size);
        } catch (...) {
            self._failure = std::current_exception();
            return -1;
        }
    }

    /** Raises what the callback threw, or the reason why there is no key. */
    [[noreturn]] void Fail(const std::string& what) const
    {
        if (_failure) {
            std::rethrow_exception(_failure);
        }
        if (_wasAsked) {
            throw CryptoException(
                what + ": "
                + (_callback.empty() ? "it is encrypted and there is no passphrase"
                                     : "the passphrase is wrong"));
        }
        throw CryptoException(what + ": " + GetOpenSslError());
    }

private:
    static int Copy(const Wiped& passphrase, char* buffer, int size)
    {
        const std::string& text = passphrase.Get();
        if (text.size() > static_cast<std::size_t>(size)) {
            return -1;
        }
        std::copy(text.begin(), text.end(), buffer);
        return static_cast<int>(text.size());
    }

    const PassphraseCallback& _callback;
    bool _wasAsked = false;
    std::exception_ptr _failure;
};

KeyOwner DecodePem(std::string_view pem, PassphraseSource& passphrase)
{
    const BioOwner in = OpenForReading(pem);
    return KeyOwner(
        in == nullptr ? nullptr
                      : PEM_read_bio_PrivateKey(
                          in.get(), nullptr, &PassphraseSource::OnPassphrase, &passphrase));
}

KeyOwner DecodeDer(std::string_view der)
{
    const auto* bytes = reinterpret_cast<const unsigned char*>(der.data());
    return KeyOwner(d2i_AutoPrivateKey(nullptr, &bytes, static_cast<long>(der.size())));
}

/** The first private key that the store hands out. */
KeyOwner FindKey(OSSL_STORE_CTX* store)
{
    while (OSSL_STORE_eof(store) == 0) {
        const StoreInfoOwner info(OSSL_STORE_load(store));
        if (info && OSSL_STORE_INFO_get_type(info.get()) == OSSL_STORE_INFO_PKEY) {
            return KeyOwner(OSSL_STORE_INFO_get1_PKEY(info.get()));
        }
        if (!info && OSSL_STORE_error(store) == 1) {
            break;
        }
    }
    return nullptr;
}

} // namespace

EVP_PKEY* GetKey(const PrivateKey& key) noexcept
{
    return static_cast<const PrivateKeyImpl&>(key).GetHandle();
}

Ref<const PrivateKey> CreatePrivateKey(
    std::string_view pemOrDer, const PassphraseCallback& passphrase)
{
    if (pemOrDer.size() > MaxReadableBytes) {
        throw CryptoException("Not a private key: " + std::to_string(pemOrDer.size()) + " bytes");
    }
    const ErrorQueueScope errors;
    PassphraseSource source(passphrase);
    const bool isPem = pemOrDer.find("-----BEGIN ") != std::string_view::npos;
    KeyOwner key = isPem ? DecodePem(pemOrDer, source) : DecodeDer(pemOrDer);
    if (!key) {
        source.Fail("Cannot read the private key");
    }
    return Ref<const PrivateKey>(new PrivateKeyImpl(std::move(key)));
}

Ref<const PrivateKey> LoadPrivateKey(const std::string& uri, const PassphraseCallback& passphrase)
{
    const ErrorQueueScope errors;
    PassphraseSource source(passphrase);
    const UiMethodOwner ui(UI_UTIL_wrap_read_pem_callback(&PassphraseSource::OnPassphrase, 0));
    const StoreContextOwner store(
        OSSL_STORE_open(uri.c_str(), ui.get(), &source, nullptr, nullptr));
    if (!store) {
        source.Fail("Cannot open '" + uri + "'");
    }
    OSSL_STORE_expect(store.get(), OSSL_STORE_INFO_PKEY);
    KeyOwner key = FindKey(store.get());
    if (!key) {
        source.Fail("There is no private key at '" + uri + "'");
    }
    return Ref<const PrivateKey>(new PrivateKeyImpl(std::move(key)));
}

} // namespace Quillon::Crypto
