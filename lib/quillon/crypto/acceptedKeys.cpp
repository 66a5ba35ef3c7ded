#include "crypto/acceptedKeys.h"

#include <algorithm>
#include <array>

namespace Quillon::Crypto {

namespace {

struct AcceptedKey
{
    KeyType type;
    std::string_view name;      ///< in OpenSSL's built-in provider
    std::string_view otherName; ///< in other providers
    int minBits;
};

// A change here changes what is trusted. Shorter RSA moduli may be factored [NIST SP 800-57 part 1,
// 5.6.1]; the curves are those of [FIPS 186-4 D.1.2] that offer at least as much.
constexpr std::array<AcceptedKey, 4> AcceptedKeys{{
    {KeyType::RSA, "RSA", "RSA", 2048},
    {KeyType::EC, "prime256v1", "P-256", 256},
    {KeyType::EC, "secp384r1", "P-384", 384},
    {KeyType::EC, "secp521r1", "P-521", 521},
}};

} // namespace

KeyType GetKeyTypeByName(std::string_view name) noexcept
{
    const auto* found =
        std::find_if(AcceptedKeys.begin(), AcceptedKeys.end(), [name](const AcceptedKey& accepted) {
            return name == accepted.name || name == accepted.otherName;
        });
    return found == AcceptedKeys.end() ? KeyType::OTHER : found->type;
}

bool IsStrongEnough(KeyType type, int bits) noexcept
{
    return std::any_of(
        AcceptedKeys.begin(), AcceptedKeys.end(), [type, bits](const AcceptedKey& accepted) {
            return type == accepted.type && bits >= accepted.minBits;
        });
}

} // namespace Quillon::Crypto
