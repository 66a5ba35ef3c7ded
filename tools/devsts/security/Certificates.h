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
