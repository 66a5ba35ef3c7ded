#pragma once

#include "quillon/crypto/PublicKey.h"

#include <array>
#include <cstddef>
#include <memory>
#include <string_view>

namespace Quillon::Crypto {

/** The value of a digest. */
struct DigestValue
{
    std::array<unsigned char, MaxDigestLength> bytes;
    std::size_t length;

    std::string_view AsView() const noexcept
    {
        return {reinterpret_cast<const char*>(bytes.data()), length};
    }
};

/** One running digest computation, for one thread. */
class Digest
{
public:
    explicit Digest(HashAlgorithm algorithm);
    ~Digest();
    Digest(const Digest&) = delete;
    Digest& operator=(const Digest&) = delete;

    void Update(const void* bytes, std::size_t length);

    /** Ends the computation; the object is not used afterwards. */
    DigestValue Finish();

private:
    struct State;
    std::unique_ptr<State> _state;
};

} // namespace Quillon::Crypto
