#pragma once

// The one place where Quillon sees OpenSSL: its headers, an owner for each of its handles, and
// the translation of its errors.

#include <openssl/bio.h>
#include <openssl/bn.h>
#include <openssl/crypto.h>
#include <openssl/ec.h>
#include <openssl/ecdsa.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/param_build.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>
#include <openssl/ssl.h>
#include <openssl/store.h>
#include <openssl/ui.h>
#include <openssl/x509.h>
#include <openssl/x509_vfy.h>
#include <openssl/x509v3.h>

#include <cstddef>
#include <limits>
#include <memory>
#include <string>
#include <string_view>

namespace Quillon::Crypto {

template <auto Free>
struct OpenSslDeleter
{
    template <class T>
    void operator()(T* handle) const noexcept
    {
        Free(handle);
    }
};

using X509Owner = std::unique_ptr<X509, OpenSslDeleter<X509_free>>;
using X509StoreOwner = std::unique_ptr<X509_STORE, OpenSslDeleter<X509_STORE_free>>;
using KeyOwner = std::unique_ptr<EVP_PKEY, OpenSslDeleter<EVP_PKEY_free>>;
using KeyContextOwner = std::unique_ptr<EVP_PKEY_CTX, OpenSslDeleter<EVP_PKEY_CTX_free>>;
using DigestOwner = std::unique_ptr<EVP_MD, OpenSslDeleter<EVP_MD_free>>;
using DigestContextOwner = std::unique_ptr<EVP_MD_CTX, OpenSslDeleter<EVP_MD_CTX_free>>;
using CipherContextOwner = std::unique_ptr<EVP_CIPHER_CTX, OpenSslDeleter<EVP_CIPHER_CTX_free>>;
/** Frees what OpenSSL allocated as plain memory. */
struct OpenSslMemoryDeleter
{
    void operator()(void* memory) const noexcept { OPENSSL_free(memory); }
};
template <class T>
using OpenSslMemory = std::unique_ptr<T, OpenSslMemoryDeleter>;

using BioOwner = std::unique_ptr<BIO, OpenSslDeleter<BIO_free_all>>;
using BignumOwner = std::unique_ptr<BIGNUM, OpenSslDeleter<BN_free>>;
using EcdsaSigOwner = std::unique_ptr<ECDSA_SIG, OpenSslDeleter<ECDSA_SIG_free>>;
using StoreContextOwner = std::unique_ptr<OSSL_STORE_CTX, OpenSslDeleter<OSSL_STORE_close>>;
using StoreInfoOwner = std::unique_ptr<OSSL_STORE_INFO, OpenSslDeleter<OSSL_STORE_INFO_free>>;
using UiMethodOwner = std::unique_ptr<UI_METHOD, OpenSslDeleter<UI_destroy_method>>;
using SslContextOwner = std::unique_ptr<SSL_CTX, OpenSslDeleter<SSL_CTX_free>>;

/** The longest text that OpenSSL can be given: it counts in `int`. */
inline constexpr std::size_t MaxReadableBytes = std::numeric_limits<int>::max();

/** `text` for OpenSSL to read in place; null if there is no memory. @throws CryptoException */
BioOwner OpenForReading(std::string_view text);

/** The reason of the latest error on OpenSSL's queue of this thread, for a message. */
std::string GetOpenSslError();

/**
 * Leaves OpenSSL's error queue of this thread as it was found: what a failed call puts on it
 * inside the scope is dropped, what the host process had there stays. Every function that calls
 * OpenSSL opens one.
 */
class ErrorQueueScope
{
public:
    ErrorQueueScope() noexcept { ERR_set_mark(); }
    ~ErrorQueueScope() { ERR_pop_to_mark(); }
    ErrorQueueScope(const ErrorQueueScope&) = delete;
    ErrorQueueScope& operator=(const ErrorQueueScope&) = delete;
};

} // namespace Quillon::Crypto
