#pragma once

#include <string_view>

namespace Quillon::Xml {

/**
 * Looks at the octets of a document before the parser does, for what the parser would not refuse
 * or would only refuse slowly: its size, octets that are not UTF-8 [RFC 3629], NUL, an encoding
 * other than UTF-8, and tags with more attributes than the limit (the parser compares every
 * attribute of a tag with every other).
 *
 * @throws XMLParseException
 *
 * Cost: a small part of a parse, linear.
 */
void CheckSource(std::string_view source);

} // namespace Quillon::Xml
