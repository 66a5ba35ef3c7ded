#pragma once

#include "quillon/Export.h"

#include <string>
#include <string_view>
#include <vector>

namespace Quillon::StringUtil {

/**
 * Upper-cases UTF-8 text, letter by letter and independent of the locale, by the simple mapping of
 * Unicode [UNICODE 4.2] in these ranges: ASCII, Latin-1 (U+0080 to U+00FF), Latin Extended-A
 * (U+0100 to U+017F), Greek (U+0370 to U+03FF) and Cyrillic (U+0400 to U+052F). Everything else
 * stays as it is, malformed bytes included. So do, on purpose, the letters outside ASCII whose
 * partner is an ASCII letter (U+0130, U+0131, U+017F): a look-alike never equals a plain name.
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
