#pragma once

#include <string>

namespace DevSts {

std::string EncodeBase64(const std::string& bytes);

/** Blanks in the text do not matter; what is not Base64 gives "". */
std::string DecodeBase64(const std::string& text);

} // namespace DevSts
