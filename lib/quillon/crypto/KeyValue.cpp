#include "quillon/crypto/KeyValue.h"

#include "crypto/OpenSsl.h"
#include "crypto/PublicKeyImpl.h"
#include "crypto/acceptedKeys.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <string>
#include <utility>

namespace Quillon::Crypto {

namespace {

/** A public operation takes time with the square of this: what no one uses is not worth it. */
constexpr std::size_t MaxModulusLength = 16384 / 8;

using ParameterBuilder = std::unique_ptr<OSSL_PARAM_BLD, OpenSslDeleter<OSSL_PARAM_BLD_free>>;
using Parameters = std::unique_ptr<OSSL_PARAM, OpenSslDeleter<OSSL_PARAM_free>>;

BignumOwner ToNumber(const std::vector<unsigned char>& bytes)
{
    return BignumOwner(BN_bin2bn(bytes.data(), static_cast<int>(bytes.size()), nullptr));
}

/** With some numbers, the point at infinity or the exponent 1, anybody can sign [SEC1 3.2.2]. */
void RequireSoundKey(const char* type, EVP_PKEY* key)
{
    const KeyContextOwner context(EVP_PKEY_CTX_new_from_pkey(nullptr, key, nullptr));
    if (!context || EVP_PKEY_public_check(context.get()) != 1) {
        throw CryptoException(
            std::string("Not a public key of type ") + type + ": " + GetOpenSslError());
    }
}

boost::shared_ptr<const PublicKey> Build(const char* type, OSSL_PARAM_BLD* builder)
{
    const Parameters parameters(OSSL_PARAM_BLD_to_param(builder));
    const KeyContextOwner context(EVP_PKEY_CTX_new_from_name(nullptr, type, nullptr));
    EVP_PKEY* key = nullptr;
    if (!parameters || !context || EVP_PKEY_fromdata_init(context.get()) != 1
        || EVP_PKEY_fromdata(context.get(), &key, EVP_PKEY_PUBLIC_KEY, parameters.get()) != 1) {
        throw CryptoException(
            std::string("Not a public key of type ") + type + ": " + GetOpenSslError());
    }
    KeyOwner owned(key);
    RequireSoundKey(type, owned.get());
    return boost::make_shared<PublicKeyImpl>(std::move(owned));
}

} // namespace

boost::shared_ptr<const PublicKey> CreateRsaPublicKey(
    const std::vector<unsigned char>& modulus, const std::vector<unsigned char>& exponent)
{
    if (modulus.empty() || exponent.empty() || modulus.size() > MaxModulusLength
        || exponent.size() > modulus.size()) {
        throw CryptoException(
            "Not a public key of type RSA: a modulus of " + std::to_string(modulus.size())
            + " bytes and an exponent of " + std::to_string(exponent.size()));
    }
    const ErrorQueueScope errors;
    const BignumOwner n = ToNumber(modulus);
    const BignumOwner e = ToNumber(exponent);
    const ParameterBuilder builder(OSSL_PARAM_BLD_new());
    if (!n || !e || !builder || OSSL_PARAM_BLD_push_BN(builder.get(), "n", n.get()) != 1
        || OSSL_PARAM_BLD_push_BN(builder.get(), "e", e.get()) != 1) {
        throw CryptoException("Cannot make a public key: " + GetOpenSslError());
    }
    return Build("RSA", builder.get());
}

boost::shared_ptr<const PublicKey> CreateEcPublicKey(
    std::string_view curve, const std::vector<unsigned char>& point)
{
    if (GetKeyTypeByName(curve) != KeyType::EC) {
        throw CryptoException("Elliptic curve '" + std::string(curve) + "' is not accepted");
    }
    const ErrorQueueScope errors;
    const std::string group(curve);
    const ParameterBuilder builder(OSSL_PARAM_BLD_new());
    if (!builder || OSSL_PARAM_BLD_push_utf8_string(builder.get(), "group", group.c_str(), 0) != 1
        || OSSL_PARAM_BLD_push_octet_string(builder.get(), "pub", point.data(), point.size())
               != 1) {
        throw CryptoException("Cannot make a public key: " + GetOpenSslError());
    }
    return Build("EC", builder.get());
}

} // namespace Quillon::Crypto
