#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace Quillon::Xml {

/** @return the position of the first octet that does not continue UTF-8 [RFC 3629 4], or npos. */
std::size_t FindNotUtf8(std::string_view text) noexcept;

/**
 * Looks for what no XML document can hold, not even in escaped form: octets that are not UTF-8,
 * control characters except tab, line feed and carriage return, U+FFFE and U+FFFF [XML 2.2].
 *
 * @return what is wrong and at which octet, from 0. Never a part of the text, which may be a
 *         secret.
 *
 * Cost: eight octets at once, as long as they are plain.
 */
std::optional<std::string> FindCharacterFault(std::string_view text);

} // namespace Quillon::Xml
