#include "quillon/crypto/Certificate.h"

#include "crypto/Digest.h"
#include "crypto/PublicKeyImpl.h"
#include "crypto/handles.h"

#include <array>
#include <cstdio>
#include <cstring>
#include <ctime>

namespace Quillon::Crypto {

namespace {

std::string FormatName(const X509_NAME* name)
{
    const ErrorQueueScope errors;
    const BioOwner out(BIO_new(BIO_s_mem()));
    if (!out || X509_NAME_print_ex(out.get(), name, 0, XN_FLAG_RFC2253) < 0) {
        throw CryptoException("Cannot format a name: " + GetOpenSslError());
    }
    char* text = nullptr;
    const long length = BIO_get_mem_data(out.get(), &text);
    return std::string(text, static_cast<std::size_t>(length));
}

System::DateTime ToDateTime(const ASN1_TIME* time)
{
    std::tm fields{};
    if (ASN1_TIME_to_tm(time, &fields) != 1) {
        throw CryptoException("The certificate has a malformed date");
    }
    std::array<char, 80> text{};
    std::snprintf(
        text.data(),
        text.size(),
        "%04d-%02d-%02dT%02d:%02d:%02dZ",
        fields.tm_year + 1900,
        fields.tm_mon + 1,
        fields.tm_mday,
        fields.tm_hour,
        fields.tm_min,
        fields.tm_sec);
    try {
        return System::DateTime(text.data());
    } catch (const System::DateTimeFormatException& error) {
        // GeneralizedTime has the year 0 [RFC 5280 4.1.2.5.2], a DateTime has not.
        throw CryptoException(std::string("The certificate has an unusable date: ") + error.what());
    }
}

class CertificateImpl final : public Certificate
{
public:
    CertificateImpl(X509Owner certificate, std::vector<unsigned char> encoded, KeyOwner key)
        : _certificate(std::move(certificate))
        , _encoded(std::move(encoded))
        , _publicKey(std::move(key))
    {}

    const std::vector<unsigned char>& GetEncoded() const noexcept override { return _encoded; }
    const PublicKey& GetPublicKey() const noexcept override { return _publicKey; }

    std::string GetSubjectName() const override
    {
        return FormatName(X509_get_subject_name(_certificate.get()));
    }
    std::string GetIssuerName() const override
    {
        return FormatName(X509_get_issuer_name(_certificate.get()));
    }

    std::string GetFingerprint() const override
    {
        Digest digest(HashAlgorithm::SHA256);
        digest.Update(_encoded.data(), _encoded.size());
        std::string text;
        const DigestValue value = digest.Finish();
        for (const unsigned char byte : value.AsView()) {
            constexpr char Digits[] = "0123456789abcdef";
            text += Digits[byte >> 4U];
            text += Digits[byte & 15U];
        }
        return text;
    }

    System::DateTime GetNotBefore() const override
    {
        return ToDateTime(X509_get0_notBefore(_certificate.get()));
    }
    System::DateTime GetNotAfter() const override
    {
        return ToDateTime(X509_get0_notAfter(_certificate.get()));
    }

    X509* GetHandle() const noexcept { return _certificate.get(); }

private:
    X509Owner _certificate;
    std::vector<unsigned char> _encoded;
    PublicKeyImpl _publicKey;
};

} // namespace

X509* GetX509(const Certificate& certificate) noexcept
{
    return static_cast<const CertificateImpl&>(certificate).GetHandle();
}

Ref<const Certificate> CreateCertificate(const void* bytes, std::size_t length)
{
    const auto* begin = static_cast<const unsigned char*>(bytes);
    const unsigned char* next = begin;
    if (length > MaxReadableBytes) {
        throw CryptoException("Not a certificate: " + std::to_string(length) + " bytes");
    }
    const ErrorQueueScope errors;
    X509Owner certificate(d2i_X509(nullptr, &next, static_cast<long>(length)));
    if (!certificate) {
        throw CryptoException("Not a certificate in DER form: " + GetOpenSslError());
    }
    if (next != begin + length) {
        throw CryptoException(
            "Not a certificate in DER form: " + std::to_string(begin + length - next)
            + " bytes follow it");
    }
    KeyOwner key(X509_get_pubkey(certificate.get()));
    if (!key) {
        throw CryptoException(
            "The certificate's public key is not understood: " + GetOpenSslError());
    }
    return Ref<const Certificate>(new CertificateImpl(
        std::move(certificate), std::vector<unsigned char>(begin, begin + length), std::move(key)));
}

std::string GetSerialNumber(const Certificate& certificate)
{
    const ErrorQueueScope errors;
    const BignumOwner number(
        ASN1_INTEGER_to_BN(X509_get0_serialNumber(GetX509(certificate)), nullptr));
    const OpenSslMemory<char> text(number ? BN_bn2dec(number.get()) : nullptr);
    if (!text) {
        throw CryptoException("Cannot read a serial number: " + GetOpenSslError());
    }
    return text.get();
}

std::list<Ref<const Certificate>> ParsePemCertificates(std::string_view pem)
{
    const ErrorQueueScope errors;
    const BioOwner in = OpenForReading(pem);
    std::list<Ref<const Certificate>> certificates;
    char* name = nullptr;
    char* header = nullptr;
    unsigned char* data = nullptr;
    long length = 0;
    while (in && PEM_read_bio(in.get(), &name, &header, &data, &length) == 1) {
        const OpenSslMemory<char> nameOwner(name);
        const OpenSslMemory<char> headerOwner(header);
        const OpenSslMemory<unsigned char> dataOwner(data);
        if (std::strcmp(name, PEM_STRING_X509) == 0
            || std::strcmp(name, PEM_STRING_X509_OLD) == 0) {
            certificates.push_back(CreateCertificate(data, static_cast<std::size_t>(length)));
        }
    }
    if (ERR_GET_REASON(ERR_peek_last_error()) != PEM_R_NO_START_LINE) {
        throw CryptoException("Malformed PEM text: " + GetOpenSslError());
    }
    if (certificates.empty()) {
        throw CryptoException("The PEM text holds no certificate");
    }
    return certificates;
}

} // namespace Quillon::Crypto
