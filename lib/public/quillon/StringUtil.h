#pragma once

#include "quillon/Export.h"

#include <string>
#include <string_view>
#include <vector>

namespace Quillon::StringUtil {

/**
 * Upper-cases UTF-8 text by the simple, locale-independent mapping of the C library's "C.UTF-8"
 * rules: ASCII, Latin, Greek and Cyrillic letters. Malformed bytes stay as they are.
 */
QUILLON_API std::string ToUpper(std::string_view text);

/** Lower-cases UTF-8 text; the counterpart of `ToUpper`. */
QUILLON_API std::string ToLower(std::string_view text);

/** A random (version 4) UUID [RFC 4122 4.4] in its 36-character lower-case text form. */
QUILLON_API std::string GenerateUuid();

/** Base64 [RFC 4648 4] with padding and without line breaks. */
QUILLON_API std::string Base64Encode(const std::vector<unsigned char>& bytes);
QUILLON_API std::string Base64Encode(const void* bytes, std::size_t length);

/**
 * Decodes Base64. XML white space anywhere is skipped, as xsd:base64Binary allows.
 *
 * @param bytes  is replaced.
 * @throws Base64FormatException  another character, misplaced or missing padding, or bits that
 *                                the last digit should not carry. The text says where.
 */
QUILLON_API void Base64Decode(std::string_view text, std::vector<unsigned char>& bytes);

} // namespace Quillon::StringUtil
