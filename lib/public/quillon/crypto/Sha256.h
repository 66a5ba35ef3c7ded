#pragma once

#include "quillon/Export.h"

#include <array>
#include <string_view>

namespace Quillon::Crypto {

using Sha256Value = std::array<unsigned char, 32>;

/**
 * The SHA-256 digest [FIPS 180-4] of bytes.
 *
 * @throws CryptoException  OpenSSL cannot compute it.
 */
QUILLON_API Sha256Value Sha256(std::string_view bytes);

} // namespace Quillon::Crypto
