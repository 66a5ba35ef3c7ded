#pragma once

#include <cstring>
#include <string>

namespace Quillon::System {

/** The system's words for an `errno`, in English whatever the host's locale is. */
inline std::string DescribeSystemError(int error)
{
    const char* const words = strerrordesc_np(error);
    return words != nullptr ? words : "system error " + std::to_string(error);
}

} // namespace Quillon::System
