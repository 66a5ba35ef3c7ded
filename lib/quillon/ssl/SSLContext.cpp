#include "ssl/SSLContextImpl.h"

#include "crypto/handles.h"

#include <utility>

namespace Quillon::Ssl {

namespace {

void RequireConsistency(const SSLContextOptions& options)
{
    if (options.clientCertificates.empty() != (options.clientKey == nullptr)) {
        throw InvalidArgumentException(
            options.clientKey != nullptr ? "There is a client key, but no client certificate."
                                         : "There is a client certificate, but no client key.");
    }
    if (!options.useSystemAuthorities && options.authorities.empty()) {
        throw InvalidArgumentException("There is no trusted certificate authority.");
    }
}

/**
 * OpenSSL's own look-up of these paths would let environment variables have a say in whom the
 * process trusts.
 */
void AddSystemAuthorities(X509_STORE* store)
{
    const char* const file = X509_get_default_cert_file();
    if (X509_STORE_load_file(store, file) != 1) {
        throw Crypto::CryptoException(
            "The system's certificate authorities cannot be loaded from " + std::string(file) + ": "
            + Crypto::GetOpenSslError());
    }
}

Crypto::X509StoreOwner LoadAuthorities(const SSLContextOptions& options)
{
    Crypto::X509StoreOwner store(X509_STORE_new());
    if (store == nullptr) {
        throw std::bad_alloc();
    }
    if (options.useSystemAuthorities) {
        AddSystemAuthorities(store.get());
    }
    for (const Ref<const Crypto::Certificate>& authority : options.authorities) {
        if (X509_STORE_add_cert(store.get(), Crypto::GetX509(*authority)) != 1) {
            throw Crypto::CryptoException(
                "A certificate authority cannot be trusted: " + Crypto::GetOpenSslError());
        }
    }
    return store;
}

void RequireMatchingKey(const SSLContextOptions& options)
{
    if (options.clientKey == nullptr) {
        return;
    }
    const Crypto::Certificate& own = *options.clientCertificates.front();
    if (X509_check_private_key(Crypto::GetX509(own), Crypto::GetKey(*options.clientKey)) != 1) {
        throw Crypto::CryptoException(
            "The client key does not belong to the client certificate of " + own.GetSubjectName()
            + ": " + Crypto::GetOpenSslError());
    }
}

} // namespace

SSLContextImpl::SSLContextImpl(const SSLContextOptions& options)
    : _clientCertificates(options.clientCertificates)
    , _clientKey(options.clientKey)
{
    const Crypto::ErrorQueueScope errors;
    RequireConsistency(options);
    RequireMatchingKey(options);
    _authorities = LoadAuthorities(options);
}

bool SSLContextImpl::Apply(SSL_CTX* context) const noexcept
{
    // The store for verification takes precedence over the context's general one, which libcurl
    // sets up behind our back, once the handshake is under way, with a store that it may have
    // kept from another connection.
    if (SSL_CTX_set1_verify_cert_store(context, _authorities.get()) != 1) {
        return false;
    }
    if (_clientKey == nullptr) {
        return true;
    }
    auto certificate = _clientCertificates.begin();
    if (SSL_CTX_use_certificate(context, Crypto::GetX509(**certificate)) != 1
        || SSL_CTX_use_PrivateKey(context, Crypto::GetKey(*_clientKey)) != 1) {
        return false;
    }
    while (++certificate != _clientCertificates.end()) {
        if (SSL_CTX_add1_chain_cert(context, Crypto::GetX509(**certificate)) != 1) {
            return false;
        }
    }
    return true;
}

Ref<SSLContext> CreateSSLContext(const SSLContextOptions& options)
{
    return Ref<SSLContext>(new SSLContextImpl(options));
}

Ref<SSLContext> LoadSSLContext(const std::string& authoritiesPath)
{
    SSLContextOptions options;
    options.useSystemAuthorities = false;
    options.authorities = Crypto::LoadPemCertificates(authoritiesPath);
    return CreateSSLContext(options);
}

} // namespace Quillon::Ssl
