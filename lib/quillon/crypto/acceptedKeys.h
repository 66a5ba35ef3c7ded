#pragma once

#include "quillon/crypto/PublicKey.h"

#include <string_view>

/** Which keys signatures may be made with. */
namespace Quillon::Crypto {

/** @param name  of the algorithm; of an elliptic curve its own name. */
KeyType GetKeyTypeByName(std::string_view name) noexcept;

/** Whether a key of this type and length may sign; `OTHER` never may. */
bool IsStrongEnough(KeyType type, int bits) noexcept;

} // namespace Quillon::Crypto
