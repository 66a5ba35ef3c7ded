#include "quillon/StringUtil.h"

#include "quillon/Exceptions.h"

#include <sys/random.h>

#include <array>
#include <cerrno>

namespace Quillon::StringUtil {

namespace {

/** Fills `bytes` from the kernel's generator; a system call each time, so forks never repeat. */
template <std::size_t Size>
void FillRandom(std::array<unsigned char, Size>& bytes)
{
    static_assert(Size <= 256, "a larger request may be answered in part");
    while (getrandom(bytes.data(), Size, 0) != static_cast<ssize_t>(Size)) {
        if (errno != EINTR) {
            throw InvalidStateException("The system gives no random numbers");
        }
    }
}

} // namespace

std::string GenerateUuid()
{
    std::array<unsigned char, 16> bytes{};
    FillRandom(bytes);
    bytes[6] = static_cast<unsigned char>((bytes[6] & 0x0FU) | 0x40U);
    bytes[8] = static_cast<unsigned char>((bytes[8] & 0x3FU) | 0x80U);

    constexpr char HexDigits[] = "0123456789abcdef";
    std::string text;
    text.reserve(36);
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        if (i == 4 || i == 6 || i == 8 || i == 10) {
            text += '-';
        }
        text += HexDigits[bytes[i] >> 4];
        text += HexDigits[bytes[i] & 0x0FU];
    }
    return text;
}

} // namespace Quillon::StringUtil
