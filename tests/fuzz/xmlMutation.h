#pragma once

#include <string>

namespace Fuzzing {

/**
 * Changes the structure of a document in a few places, as somebody would who wraps a signed part:
 * it moves, copies, renames and removes elements, exchanges texts and attributes, gives an ID
 * twice, cuts values by comments, declares prefixes anew, and hides the document in a copy of
 * itself.
 *
 * @return the same for the same seed; empty if the document is not well-formed.
 */
std::string MutateXml(const std::string& xml, unsigned seed);

} // namespace Fuzzing
