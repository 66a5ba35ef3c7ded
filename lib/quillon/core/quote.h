#pragma once

#include <string>
#include <string_view>

namespace Quillon {

/** `text` in quotes for a message; cut where it is long, as it may be an attacker's. */
inline std::string Quote(std::string_view text)
{
    constexpr std::size_t MaxLength = 200;
    return text.size() <= MaxLength ? "'" + std::string(text) + "'"
                                    : "'" + std::string(text.substr(0, MaxLength)) + "...'";
}

} // namespace Quillon
