#pragma once

#include "quillon/xml/Node.h"
#include "xml/Escape.h"

#include <string>
#include <string_view>
#include <vector>

namespace Quillon::Xml::Security {

/** A canonicalization method with its parameter. */
struct CanonicalizationMethod
{
    bool isExclusive = false;
    /** [EXC-C14N 2.1]: the prefixes handled as in the inclusive form; empty for the default. */
    std::vector<std::string> inclusivePrefixes;
};

/** Each listed prefix costs a look-up at every element that declares a namespace. */
inline constexpr std::size_t MaxListedPrefixes = 64;

/**
 * Reads an `InclusiveNamespaces` prefix list: blanks between, `#default` for the default.
 *
 * @throws XmlSecurityException  more than `MaxListedPrefixes` different ones.
 */
std::vector<std::string> ParsePrefixList(std::string_view list);

/**
 * Writes the canonical form of `apex`, in the context of its ancestors, without comments and
 * without the subtree `excluded` (null for none).
 *
 * @throws XmlSecurityException  a prefix that nothing declares, or a relative namespace URI.
 */
void Canonicalize(
    const CanonicalizationMethod& method,
    const ElementNode& apex,
    const Node* excluded,
    OutputBuffer& out);

/** The same for all nodes of a document, the first of which is given [C14N 2.1]. */
void CanonicalizeDocument(
    const CanonicalizationMethod& method,
    const Node* first,
    const Node* excluded,
    OutputBuffer& out);

} // namespace Quillon::Xml::Security
