#pragma once

#include <memory>
#include <openssl/evp.h>
#include <openssl/x509.h>
#include <string>

// Keys and certificates of a development installation, made with OpenSSL. Every function throws
// std::runtime_error with OpenSSL's own reason.

namespace DevSts {

struct OpenSslDeleter
{
    void operator()(EVP_PKEY* key) const { EVP_PKEY_free(key); }
    void operator()(X509* certificate) const { X509_free(certificate); }
    void operator()(X509_EXTENSION* extension) const { X509_EXTENSION_free(extension); }
    void operator()(BIO* bio) const { BIO_free(bio); }
};
using PrivateKey = std::unique_ptr<EVP_PKEY, OpenSslDeleter>;
using Certificate = std::unique_ptr<X509, OpenSslDeleter>;

PrivateKey GenerateRsaKey();
PrivateKey GenerateEcKey();

struct CertificateSpec
{
    std::string commonName;
    bool isAuthority = false;
    std::string alternativeNames = {}; ///< in the syntax of openssl.cnf; may be empty

    // What follows is for certificates that somebody shall refuse. Extensions are in the syntax of
    // openssl.cnf, too; where they are empty, they are those of an honest certificate.
    std::string notBefore = "20000101000000Z"; ///< these outlive every clock that a test may set:
    std::string notAfter = "20491231235959Z";  ///< its subject are the times of tokens
    std::string basicConstraints = {};
    std::string keyUsage = {};
    std::string extendedKeyUsage = {};
    std::string nameConstraints = {};
    std::string unknownExtension = {}; ///< a critical one; its value
    const EVP_MD* digest = EVP_sha256();
};

/** A certificate for `key` that signs itself. */
Certificate MakeSelfSigned(const CertificateSpec& spec, EVP_PKEY* key);

Certificate MakeSigned(
    const CertificateSpec& spec, EVP_PKEY* key, X509* authority, EVP_PKEY* authorityKey);

std::string ToPem(X509* certificate);
std::string ToPem(EVP_PKEY* key);
PrivateKey PrivateKeyFromPem(const std::string& pem);
Certificate CertificateFromPem(const std::string& pem);

/** The bytes inside the PEM armour of a certificate, which are not decoded. */
std::string DerFromPem(const std::string& pem);

} // namespace DevSts
