#include "crypto/keyFacts.h"

#include "crypto/acceptedKeys.h"

#include <array>

namespace Quillon::Crypto {

namespace {

/** The name of an elliptic curve; empty for any other key. */
std::string GetGroupName(const EVP_PKEY* key)
{
    const ErrorQueueScope errors;
    std::array<char, 80> name{};
    const bool isCurve = EVP_PKEY_is_a(key, "EC") == 1
                         && EVP_PKEY_get_group_name(key, name.data(), name.size(), nullptr) == 1;
    return isCurve ? name.data() : "";
}

} // namespace

KeyType GetKeyType(const EVP_PKEY* key)
{
    // By name, not by number: a key behind a provider has no number.
    return GetKeyTypeByName(EVP_PKEY_is_a(key, "RSA") == 1 ? "RSA" : GetGroupName(key));
}

std::string DescribeKey(const EVP_PKEY* key)
{
    if (EVP_PKEY_is_a(key, "RSA") == 1) {
        return "RSA-" + std::to_string(EVP_PKEY_get_bits(key));
    }
    const std::string group = GetGroupName(key);
    if (!group.empty()) {
        return "EC " + group;
    }
    const char* typeName = EVP_PKEY_get0_type_name(key);
    return typeName != nullptr ? typeName : "unknown";
}

std::size_t GetEcdsaIntegerLength(const EVP_PKEY* key) noexcept
{
    return (static_cast<std::size_t>(EVP_PKEY_get_bits(key)) + 7) / 8;
}

} // namespace Quillon::Crypto
