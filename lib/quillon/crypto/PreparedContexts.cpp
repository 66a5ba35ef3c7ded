#include "crypto/PreparedContexts.h"

#include "crypto/handles.h"

namespace Quillon::Crypto {

PreparedContexts::~PreparedContexts()
{
    for (const auto& prepared : _prepared) {
        EVP_PKEY_CTX_free(prepared);
    }
}

KeyContextOwner PreparedContexts::Get(HashAlgorithm algorithm) const
{
    EVP_PKEY_CTX* prepared = Prepare(algorithm);
    KeyContextOwner context(prepared == nullptr ? nullptr : EVP_PKEY_CTX_dup(prepared));
    // A provider, such as one for a smart card, need not be able to copy.
    return context ? std::move(context) : Make(algorithm);
}

EVP_PKEY_CTX* PreparedContexts::Prepare(HashAlgorithm algorithm) const
{
    std::atomic<EVP_PKEY_CTX*>& slot = _prepared[static_cast<std::size_t>(algorithm)];
    EVP_PKEY_CTX* prepared = slot.load(std::memory_order_acquire);
    if (prepared != nullptr) {
        return prepared;
    }
    KeyContextOwner made = Make(algorithm);
    // Another thread may have been faster; then its context is taken and this one goes.
    return slot.compare_exchange_strong(prepared, made.get()) ? made.release() : prepared;
}

KeyContextOwner PreparedContexts::Make(HashAlgorithm algorithm) const
{
    KeyContextOwner context(EVP_PKEY_CTX_new_from_pkey(nullptr, _key, nullptr));
    return context && _setup(context.get(), GetDigest(algorithm)) ? std::move(context) : nullptr;
}

} // namespace Quillon::Crypto
