#pragma once

#include <string>

namespace DevSts {

/** 128 random bits in 32 hexadecimal digits. @throws std::runtime_error */
std::string RandomHex();

} // namespace DevSts
