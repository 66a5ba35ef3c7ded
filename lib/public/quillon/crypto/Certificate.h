#pragma once

#include "quillon/Exceptions.h"
#include "quillon/Ref.h"
#include "quillon/crypto/PublicKey.h"
#include "quillon/system/DateTime.h"

#include <cstddef>
#include <list>
#include <string>
#include <string_view>
#include <vector>

namespace Quillon::Crypto {

/**
 * An X.509 certificate [RFC 5280], decoded once when it is made.
 *
 * Thread safety: immutable.
 */
class QUILLON_API Certificate : public RefCounted
{
public:
    /** The DER encoding, exactly as it was given. Two certificates are equal if these are. */
    virtual const std::vector<unsigned char>& GetEncoded() const noexcept = 0;

    virtual const PublicKey& GetPublicKey() const noexcept = 0;

    /** Subject and issuer as one-line RFC 2253 names, for messages. */
    virtual std::string GetSubjectName() const = 0;
    virtual std::string GetIssuerName() const = 0;

    /** The SHA-256 digest of the DER encoding in lower-case hexadecimal. */
    virtual std::string GetFingerprint() const = 0;

    /** @throws CryptoException  the date is malformed, or of the year 0. */
    virtual System::DateTime GetNotBefore() const = 0;
    virtual System::DateTime GetNotAfter() const = 0;
};

/**
 * @param bytes  the DER encoding of one certificate, and nothing after it.
 * @throws CryptoException  the bytes are not a certificate, or its key is not understood.
 *
 * Cost: about a hundred microseconds with OpenSSL 3.0. Make a certificate once and keep it.
 */
QUILLON_API Ref<const Certificate> CreateCertificate(const void* bytes, std::size_t length);

/** The serial number [RFC 5280 4.1.2.2] in decimal digits. @throws CryptoException */
QUILLON_API std::string GetSerialNumber(const Certificate& certificate);

/**
 * Reads all certificates of a PEM text [RFC 7468], in order; other PEM blocks are passed over.
 *
 * @throws CryptoException  the text holds no certificate, or one that cannot be decoded, or has
 *                          2 GiB or more.
 */
QUILLON_API std::list<Ref<const Certificate>> ParsePemCertificates(std::string_view pem);

/** The largest file that `LoadPemCertificates` reads; a system's whole store has a 30th of it. */
inline constexpr std::size_t MaxCertificateFileBytes = std::size_t{8} * 1024 * 1024;

/**
 * The same for a file; a pipe is read to its end.
 *
 * @throws CryptoException  as above, or the file cannot be read or is larger than
 *                          `MaxCertificateFileBytes`. The text names the file.
 */
QUILLON_API std::list<Ref<const Certificate>> LoadPemCertificates(const std::string& path);

} // namespace Quillon::Crypto
