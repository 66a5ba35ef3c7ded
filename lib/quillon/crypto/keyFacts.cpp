#include "crypto/keyFacts.h"

#include "crypto/acceptedKeys.h"

#include <array>
#include <cstring>
#include <new>

namespace Quillon::Crypto {

namespace {

/** Asks for the name first: looking for others of the same algorithm takes memory. */
bool IsOfType(const EVP_PKEY* key, const char* type)
{
    const char* const name = EVP_PKEY_get0_type_name(key);
    return (name != nullptr && std::strcmp(name, type) == 0) || EVP_PKEY_is_a(key, type) == 1;
}

/** The name of an elliptic curve; empty for any other key, and for a curve without a name. */
std::string GetGroupName(const EVP_PKEY* key)
{
    const ErrorQueueScope errors;
    std::array<char, 80> name{};
    if (!IsOfType(key, "EC")
        || EVP_PKEY_get_group_name(key, name.data(), name.size(), nullptr) == 1) {
        return name.data();
    }
    if (ERR_GET_REASON(ERR_peek_last_error()) == ERR_R_MALLOC_FAILURE) {
        throw std::bad_alloc(); // rather than another curve
    }
    return "";
}

} // namespace

KeyFacts GetKeyFacts(const EVP_PKEY* key)
{
    const ErrorQueueScope errors;
    KeyFacts facts;
    // By name, not by number: a key behind a provider has no number.
    facts.type = GetKeyTypeByName(IsOfType(key, "RSA") ? "RSA" : GetGroupName(key));
    facts.bits = EVP_PKEY_get_bits(key);
    // OpenSSL may read a key without its size, if memory lacks just then.
    if (facts.type != KeyType::OTHER && facts.bits <= 0) {
        throw std::bad_alloc();
    }
    return facts;
}

std::string DescribeKey(const EVP_PKEY* key)
{
    if (IsOfType(key, "RSA")) {
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
