#include "devsts/security/Random.h"

#include <openssl/rand.h>
#include <stdexcept>

namespace DevSts {

std::string RandomHex()
{
    unsigned char bytes[16];
    if (RAND_bytes(bytes, sizeof bytes) != 1) {
        throw std::runtime_error("RAND_bytes failed");
    }
    static constexpr const char* Digits = "0123456789abcdef";
    std::string text;
    for (const unsigned char byte : bytes) {
        text += Digits[byte >> 4U];
        text += Digits[byte & 15U];
    }
    return text;
}

} // namespace DevSts
