#include "devsts/security/Certificates.h"

#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/rsa.h>
#include <openssl/x509v3.h>
#include <stdexcept>

namespace DevSts {

namespace {

using Bio = std::unique_ptr<BIO, OpenSslDeleter>;

[[noreturn]] void ThrowOpenSslError(const std::string& what)
{
    const char* reason = ERR_reason_error_string(ERR_get_error());
    ERR_clear_error();
    throw std::runtime_error(what + " failed: " + (reason == nullptr ? "unknown" : reason));
}

void Require(bool success, const char* what)
{
    if (!success) {
        ThrowOpenSslError(what);
    }
}

void SetRandomSerial(X509* certificate)
{
    unsigned char bytes[8];
    Require(RAND_bytes(bytes, sizeof bytes) == 1, "RAND_bytes");
    std::uint64_t serial = 0;
    for (const unsigned char byte : bytes) {
        serial = serial << 8U | byte;
    }
    // A serial number is positive. [RFC5280 4.1.2.2]
    serial &= 0x7fffffffffffffffU;
    Require(
        ASN1_INTEGER_set_uint64(X509_get_serialNumber(certificate), serial) == 1,
        "ASN1_INTEGER_set_uint64");
}

void SetSubject(X509* certificate, const std::string& commonName)
{
    Require(
        X509_NAME_add_entry_by_txt(
            X509_get_subject_name(certificate),
            "CN",
            MBSTRING_UTF8,
            reinterpret_cast<const unsigned char*>(commonName.data()),
            static_cast<int>(commonName.size()),
            -1,
            0)
            == 1,
        "X509_NAME_add_entry_by_txt");
}

void AddExtension(X509* certificate, X509* authority, int nid, const std::string& value)
{
    X509V3_CTX context;
    X509V3_set_ctx(&context, authority, certificate, nullptr, nullptr, 0);
    const std::unique_ptr<X509_EXTENSION, OpenSslDeleter> extension(
        X509V3_EXT_conf_nid(nullptr, &context, nid, value.c_str()));
    Require(extension != nullptr, "X509V3_EXT_conf_nid");
    Require(X509_add_ext(certificate, extension.get(), -1) == 1, "X509_add_ext");
}

/** Not registered, so that no verifier knows it. */
int GetUnknownExtension()
{
    static const int nid = OBJ_create("1.3.6.1.4.1.55555.1", "unknown", "unknown extension");
    return nid;
}

const std::string& Either(const std::string& chosen, const std::string& usual)
{
    return chosen.empty() ? usual : chosen;
}

void AddExtensions(X509* certificate, X509* authority, const CertificateSpec& spec)
{
    AddExtension(
        certificate,
        authority,
        NID_basic_constraints,
        Either(spec.basicConstraints, spec.isAuthority ? "critical,CA:TRUE" : "critical,CA:FALSE"));
    AddExtension(
        certificate,
        authority,
        NID_key_usage,
        Either(
            spec.keyUsage,
            spec.isAuthority ? "critical,keyCertSign,cRLSign" : "critical,digitalSignature"));
    AddExtension(certificate, authority, NID_subject_key_identifier, "hash");
    if (authority != certificate) {
        AddExtension(certificate, authority, NID_authority_key_identifier, "keyid");
    }
    if (!spec.alternativeNames.empty()) {
        AddExtension(
            certificate, authority, NID_ext_key_usage, Either(spec.extendedKeyUsage, "serverAuth"));
        AddExtension(certificate, authority, NID_subject_alt_name, spec.alternativeNames);
    }
    if (!spec.nameConstraints.empty()) {
        AddExtension(certificate, authority, NID_name_constraints, spec.nameConstraints);
    }
    if (!spec.unknownExtension.empty()) {
        AddExtension(certificate, authority, GetUnknownExtension(), spec.unknownExtension);
    }
}

Bio MemoryBio(const std::string& text)
{
    Bio bio(BIO_new_mem_buf(text.data(), static_cast<int>(text.size())));
    Require(bio != nullptr, "BIO_new_mem_buf");
    return bio;
}

template <typename Write>
std::string WritePem(Write write)
{
    const Bio bio(BIO_new(BIO_s_mem()));
    Require(bio != nullptr && write(bio.get()) == 1, "Writing PEM");
    char* data = nullptr;
    const long size = BIO_get_mem_data(bio.get(), &data);
    return std::string(data, static_cast<std::size_t>(size));
}

} // namespace

PrivateKey GenerateRsaKey()
{
    PrivateKey key(EVP_RSA_gen(2048));
    Require(key != nullptr, "EVP_RSA_gen");
    return key;
}

PrivateKey GenerateEcKey()
{
    PrivateKey key(EVP_EC_gen("P-256"));
    Require(key != nullptr, "EVP_EC_gen");
    return key;
}

Certificate MakeSelfSigned(const CertificateSpec& spec, EVP_PKEY* key)
{
    return MakeSigned(spec, key, nullptr, key);
}

Certificate MakeSigned(
    const CertificateSpec& spec, EVP_PKEY* key, X509* authority, EVP_PKEY* authorityKey)
{
    Certificate certificate(X509_new());
    Require(certificate != nullptr, "X509_new");
    X509* issuer = authority == nullptr ? certificate.get() : authority;
    Require(X509_set_version(certificate.get(), X509_VERSION_3) == 1, "X509_set_version");
    SetRandomSerial(certificate.get());
    SetSubject(certificate.get(), spec.commonName);
    Require(
        X509_set_issuer_name(certificate.get(), X509_get_subject_name(issuer)) == 1
            && ASN1_TIME_set_string_X509(
                   X509_getm_notBefore(certificate.get()), spec.notBefore.c_str())
                   == 1
            && ASN1_TIME_set_string_X509(
                   X509_getm_notAfter(certificate.get()), spec.notAfter.c_str())
                   == 1
            && X509_set_pubkey(certificate.get(), key) == 1,
        "Filling a certificate");
    AddExtensions(certificate.get(), issuer, spec);
    Require(X509_sign(certificate.get(), authorityKey, spec.digest) > 0, "X509_sign");
    return certificate;
}

std::string ToPem(X509* certificate)
{
    return WritePem([certificate](BIO* bio) { return PEM_write_bio_X509(bio, certificate); });
}

std::string ToPem(EVP_PKEY* key)
{
    return WritePem([key](BIO* bio) {
        return PEM_write_bio_PrivateKey(bio, key, nullptr, nullptr, 0, nullptr, nullptr);
    });
}

PrivateKey PrivateKeyFromPem(const std::string& pem)
{
    const Bio bio = MemoryBio(pem);
    PrivateKey key(PEM_read_bio_PrivateKey(bio.get(), nullptr, nullptr, nullptr));
    Require(key != nullptr, "Reading a private key");
    return key;
}

Certificate CertificateFromPem(const std::string& pem)
{
    const Bio bio = MemoryBio(pem);
    Certificate certificate(PEM_read_bio_X509(bio.get(), nullptr, nullptr, nullptr));
    Require(certificate != nullptr, "Reading a certificate");
    return certificate;
}

std::string DerFromPem(const std::string& pem)
{
    const Bio bio = MemoryBio(pem);
    unsigned char* data = nullptr;
    long size = 0;
    Require(
        PEM_bytes_read_bio(&data, &size, nullptr, PEM_STRING_X509, bio.get(), nullptr, nullptr)
            == 1,
        "Reading a certificate");
    std::string der(reinterpret_cast<const char*>(data), static_cast<std::size_t>(size));
    OPENSSL_free(data);
    return der;
}

} // namespace DevSts
