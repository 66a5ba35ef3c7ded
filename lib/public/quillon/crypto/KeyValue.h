#pragma once

#include "quillon/crypto/PublicKey.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <string_view>
#include <vector>

/** Public keys that are given by their numbers, as a `ds:KeyValue` has them. */
namespace Quillon::Crypto {

/**
 * @param modulus, exponent  big-endian octets.
 * @throws CryptoException  these are no RSA key, or it is longer than 16384 bits.
 */
QUILLON_API boost::shared_ptr<const PublicKey> CreateRsaPublicKey(
    const std::vector<unsigned char>& modulus, const std::vector<unsigned char>& exponent);

/**
 * @param curve  `P-256`, `P-384` or `P-521`.
 * @param point  the octet form of the public point [SEC1 2.3.3].
 * @throws CryptoException  another curve, or the point does not lie on it.
 */
QUILLON_API boost::shared_ptr<const PublicKey> CreateEcPublicKey(
    std::string_view curve, const std::vector<unsigned char>& point);

} // namespace Quillon::Crypto
