#include "crypto/OpenSsl.h"

#include "crypto/handles.h"

#include <system_error>

namespace Quillon::Crypto {

std::string GetOpenSslError()
{
    const unsigned long code = ERR_peek_last_error();
    if (code == 0) {
        return "unknown error";
    }
    // OpenSSL has no texts for what the system refuses.
    if (ERR_SYSTEM_ERROR(code)) {
        return std::system_category().message(ERR_GET_REASON(code));
    }
    const char* reason = ERR_reason_error_string(code);
    return reason != nullptr ? reason : "error " + std::to_string(code);
}

BioOwner OpenForReading(std::string_view text)
{
    if (text.size() > MaxReadableBytes) {
        throw CryptoException(
            "A text of " + std::to_string(text.size()) + " bytes is too long to be read");
    }
    return BioOwner(BIO_new_mem_buf(text.data(), static_cast<int>(text.size())));
}

const EVP_MD* GetDigest(HashAlgorithm algorithm)
{
    // A fetch walks the providers; the first one is kept, and its result lives as long as the
    // process, so that verifying never depends on the order of static destruction.
    static const EVP_MD* const sha256 = EVP_MD_fetch(nullptr, "SHA256", nullptr);
    static const EVP_MD* const sha384 = EVP_MD_fetch(nullptr, "SHA384", nullptr);
    static const EVP_MD* const sha512 = EVP_MD_fetch(nullptr, "SHA512", nullptr);
    const EVP_MD* digest = algorithm == HashAlgorithm::SHA256   ? sha256
                           : algorithm == HashAlgorithm::SHA384 ? sha384
                                                                : sha512;
    if (digest == nullptr) {
        throw CryptoException("OpenSSL offers no SHA-2 digest: " + GetOpenSslError());
    }
    return digest;
}

} // namespace Quillon::Crypto
