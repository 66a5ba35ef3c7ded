#include "crypto/Digest.h"

#include "crypto/handles.h"

namespace Quillon::Crypto {

struct Digest::State
{
    DigestContextOwner context;
};

Digest::Digest(HashAlgorithm algorithm)
    : _state(std::make_unique<State>())
{
    const ErrorQueueScope errors;
    _state->context.reset(EVP_MD_CTX_new());
    if (!_state->context
        || EVP_DigestInit_ex2(_state->context.get(), GetDigest(algorithm), nullptr) != 1) {
        throw CryptoException("Cannot start a digest: " + GetOpenSslError());
    }
}

Digest::~Digest() = default;

void Digest::Update(const void* bytes, std::size_t length)
{
    if (EVP_DigestUpdate(_state->context.get(), bytes, length) != 1) {
        throw CryptoException("Cannot compute a digest: " + GetOpenSslError());
    }
}

DigestValue Digest::Finish()
{
    DigestValue value{};
    unsigned length = 0;
    if (EVP_DigestFinal_ex(_state->context.get(), value.bytes.data(), &length) != 1) {
        throw CryptoException("Cannot finish a digest: " + GetOpenSslError());
    }
    value.length = length;
    return value;
}

} // namespace Quillon::Crypto
