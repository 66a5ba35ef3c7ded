#pragma once

#include "support/TestServer.h"

#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <memory>
#include <string>
#include <vector>

namespace Testing {

template <auto Free>
struct HandleDeleter
{
    template <class T>
    void operator()(T* handle) const noexcept
    {
        Free(handle);
    }
};
using X509Handle = std::unique_ptr<X509, HandleDeleter<X509_free>>;
using KeyHandle = std::unique_ptr<EVP_PKEY, HandleDeleter<EVP_PKEY_free>>;
using SslContextHandle = std::unique_ptr<SSL_CTX, HandleDeleter<SSL_CTX_free>>;
using SslHandle = std::unique_ptr<SSL, HandleDeleter<SSL_free>>;

/** A certificate with its key. */
struct Identity
{
    KeyHandle key;
    X509Handle certificate;

    std::vector<unsigned char> GetDer() const
    {
        unsigned char* bytes = nullptr;
        const int length = i2d_X509(certificate.get(), &bytes);
        std::vector<unsigned char> result(bytes, bytes + length);
        OPENSSL_free(bytes);
        return result;
    }

    std::string GetKeyPem() const
    {
        const std::unique_ptr<BIO, HandleDeleter<BIO_free_all>> bio(BIO_new(BIO_s_mem()));
        PEM_write_bio_PrivateKey(bio.get(), key.get(), nullptr, nullptr, 0, nullptr, nullptr);
        char* text = nullptr;
        const long length = BIO_get_mem_data(bio.get(), &text);
        return {text, static_cast<std::size_t>(length)};
    }

    /** `sha256//` and the Base64 of the digest of the SubjectPublicKeyInfo. */
    std::string GetPin() const
    {
        unsigned char* bytes = nullptr;
        const int length = i2d_PUBKEY(key.get(), &bytes);
        unsigned char digest[EVP_MAX_MD_SIZE];
        unsigned digestLength = 0;
        EVP_Digest(
            bytes, static_cast<std::size_t>(length), digest, &digestLength, EVP_sha256(), nullptr);
        OPENSSL_free(bytes);
        unsigned char text[64];
        EVP_EncodeBlock(text, digest, static_cast<int>(digestLength));
        return "sha256//" + std::string(reinterpret_cast<char*>(text));
    }
};

/** What the maker of a certificate may choose. */
struct CertificateOptions
{
    std::string commonName = "test";
    std::string alternativeNames; ///< for example `DNS:localhost,IP:127.0.0.1`
    bool isAuthority = false;
    long notBeforeSec = -3600; ///< from now
    long notAfterSec = 3600;
    unsigned rsaBits = 0; ///< 0 makes a P-256 key
    const EVP_MD* digest = EVP_sha256();
};

/** Makes a key and a certificate for it; self-signed without an issuer. */
inline Identity MakeIdentity(const CertificateOptions& options, const Identity* issuer = nullptr)
{
    static std::atomic<long> nextSerial{1};
    Identity made{
        KeyHandle(options.rsaBits != 0 ? EVP_RSA_gen(options.rsaBits) : EVP_EC_gen("P-256")),
        X509Handle(X509_new())};
    X509* const certificate = made.certificate.get();
    X509_set_version(certificate, 2);
    ASN1_INTEGER_set(X509_get_serialNumber(certificate), nextSerial++);
    X509_gmtime_adj(X509_getm_notBefore(certificate), options.notBeforeSec);
    X509_gmtime_adj(X509_getm_notAfter(certificate), options.notAfterSec);
    X509_set_pubkey(certificate, made.key.get());
    X509_NAME_add_entry_by_txt(
        X509_get_subject_name(certificate),
        "CN",
        MBSTRING_UTF8,
        reinterpret_cast<const unsigned char*>(options.commonName.c_str()),
        -1,
        -1,
        0);
    const X509* const issuerCertificate =
        issuer != nullptr ? issuer->certificate.get() : certificate;
    X509_set_issuer_name(certificate, X509_get_subject_name(issuerCertificate));
    const auto addExtension = [&](int id, const std::string& value) {
        const std::unique_ptr<X509_EXTENSION, HandleDeleter<X509_EXTENSION_free>> extension(
            X509V3_EXT_conf_nid(nullptr, nullptr, id, value.c_str()));
        X509_add_ext(certificate, extension.get(), -1);
    };
    addExtension(NID_basic_constraints, options.isAuthority ? "critical,CA:TRUE" : "CA:FALSE");
    if (!options.alternativeNames.empty()) {
        addExtension(NID_subject_alt_name, options.alternativeNames);
    }
    X509_sign(certificate, issuer != nullptr ? issuer->key.get() : made.key.get(), options.digest);
    return made;
}

/** What a TLS server saw of its latest handshake. */
struct SeenHandshake
{
    bool resumed = false;
    std::string serverName;
    std::string clientCommonName;
};

/** The TLS side of a `TestServer`. */
class TlsServer
{
public:
    /** @param securityLevel  0 lets it show what nobody should accept. */
    explicit TlsServer(const Identity& identity, int securityLevel = 2)
        : _context(SSL_CTX_new(TLS_server_method()))
    {
        SSL_CTX_set_security_level(_context.get(), securityLevel);
        SSL_CTX_use_certificate(_context.get(), identity.certificate.get());
        SSL_CTX_use_PrivateKey(_context.get(), identity.key.get());
        SSL_CTX_set_session_id_context(
            _context.get(), reinterpret_cast<const unsigned char*>("test"), 4);
    }

    SSL_CTX* GetContext() const { return _context.get(); }

    /** The handshakes that succeeded, in order of their completion. */
    std::vector<SeenHandshake> GetHandshakes() const
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return _handshakes;
    }

    TestServer::StreamFactory GetStreams()
    {
        return [this](int descriptor) -> std::unique_ptr<ByteStream> {
            SslHandle ssl(SSL_new(_context.get()));
            SSL_set_fd(ssl.get(), descriptor);
            if (SSL_accept(ssl.get()) != 1) {
                ERR_clear_error();
                WaitForClose(descriptor);
                return nullptr;
            }
            Note(ssl.get());
            return std::make_unique<TlsStream>(descriptor, std::move(ssl));
        };
    }

private:
    /** A connection that is closed with unread data takes the alert back that was just sent. */
    static void WaitForClose(int descriptor)
    {
        shutdown(descriptor, SHUT_WR);
        char buffer[1024];
        while (recv(descriptor, buffer, sizeof buffer, 0) > 0) {
        }
    }

    class TlsStream : public ByteStream
    {
    public:
        TlsStream(int descriptor, SslHandle ssl)
            : ByteStream(descriptor)
            , _ssl(std::move(ssl))
        {}
        ~TlsStream() override
        {
            if (!_isSilent) {
                SSL_shutdown(_ssl.get());
            }
        }

        void EndWithoutNotice() override { _isSilent = true; }
        void AskForANewHandshake() override
        {
            SSL_renegotiate(_ssl.get());
            SSL_do_handshake(_ssl.get());
            ERR_clear_error();
        }

        long Read(char* buffer, std::size_t size) override
        {
            return SSL_read(_ssl.get(), buffer, static_cast<int>(size));
        }
        bool Write(const std::string& text) override
        {
            return SSL_write(_ssl.get(), text.data(), static_cast<int>(text.size())) > 0;
        }

    private:
        SslHandle _ssl;
        bool _isSilent = false;
    };

    void Note(SSL* ssl)
    {
        SeenHandshake seen;
        seen.resumed = SSL_session_reused(ssl) == 1;
        const char* const name = SSL_get_servername(ssl, TLSEXT_NAMETYPE_host_name);
        seen.serverName = name != nullptr ? name : "";
        if (const X509* const client = SSL_get0_peer_certificate(ssl)) {
            char text[256] = "";
            X509_NAME_get_text_by_NID(
                X509_get_subject_name(client), NID_commonName, text, sizeof text);
            seen.clientCommonName = text;
        }
        const std::lock_guard<std::mutex> lock(_mutex);
        _handshakes.push_back(seen);
    }

    const SslContextHandle _context;
    mutable std::mutex _mutex;
    std::vector<SeenHandshake> _handshakes;
};

} // namespace Testing
