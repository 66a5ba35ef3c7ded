#include "crypto/OpenSsl.h"

#include "crypto/handles.h"

#include <atomic>
#include <system_error>

namespace Quillon::Crypto {

namespace {

/**
 * A fetch walks the providers, so what it finds is kept, for as long as the process lives:
 * verifying never depends on the order of static destruction. What fails for lack of memory is
 * tried again.
 */
const EVP_MD* Fetch(const char* name, std::atomic<const EVP_MD*>& kept)
{
    const EVP_MD* digest = kept.load(std::memory_order_acquire);
    if (digest != nullptr) {
        return digest;
    }
    DigestOwner fetched(EVP_MD_fetch(nullptr, name, nullptr));
    if (kept.compare_exchange_strong(digest, fetched.get(), std::memory_order_acq_rel)) {
        return fetched.release();
    }
    return digest; // another thread was first
}

} // namespace

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
    static std::atomic<const EVP_MD*> sha256{nullptr};
    static std::atomic<const EVP_MD*> sha384{nullptr};
    static std::atomic<const EVP_MD*> sha512{nullptr};
    const EVP_MD* const digest = algorithm == HashAlgorithm::SHA256   ? Fetch("SHA256", sha256)
                                 : algorithm == HashAlgorithm::SHA384 ? Fetch("SHA384", sha384)
                                                                      : Fetch("SHA512", sha512);
    if (digest == nullptr) {
        throw CryptoException("OpenSSL offers no SHA-2 digest: " + GetOpenSslError());
    }
    return digest;
}

} // namespace Quillon::Crypto
