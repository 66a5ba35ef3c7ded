#include "devsts/wire/Base64.h"

#include <memory>
#include <new>

#include <openssl/evp.h>

namespace DevSts {

std::string EncodeBase64(const std::string& bytes)
{
    std::string text(4 * ((bytes.size() + 2) / 3) + 1, '\0');
    const int size = EVP_EncodeBlock(
        reinterpret_cast<unsigned char*>(text.data()),
        reinterpret_cast<const unsigned char*>(bytes.data()),
        static_cast<int>(bytes.size()));
    text.resize(static_cast<std::size_t>(size));
    return text;
}

std::string DecodeBase64(const std::string& text)
{
    const std::unique_ptr<EVP_ENCODE_CTX, decltype(&EVP_ENCODE_CTX_free)> context(
        EVP_ENCODE_CTX_new(), EVP_ENCODE_CTX_free);
    if (!context) {
        throw std::bad_alloc();
    }
    EVP_DecodeInit(context.get());
    std::string bytes(text.size() + 3, '\0');
    auto* out = reinterpret_cast<unsigned char*>(bytes.data());
    int size = 0;
    int rest = 0;
    const bool decoded = EVP_DecodeUpdate(
                             context.get(),
                             out,
                             &size,
                             reinterpret_cast<const unsigned char*>(text.data()),
                             static_cast<int>(text.size()))
                             >= 0
                         && EVP_DecodeFinal(context.get(), out + size, &rest) == 1;
    bytes.resize(decoded ? static_cast<std::size_t>(size + rest) : 0);
    return bytes;
}

} // namespace DevSts
