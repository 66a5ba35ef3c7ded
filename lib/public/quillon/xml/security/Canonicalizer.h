#pragma once

#include "quillon/Reader.h"
#include "quillon/xml/Node.h"
#include "quillon/xml/security/Exceptions.h"

#include <string>
#include <vector>

namespace Quillon::Xml::Security {

/**
 * Canonical XML 1.0 [C14N] and Exclusive XML Canonicalization 1.0 [EXC-C14N], both without
 * comments, of an element in the context of its ancestors.
 *
 * Thread safety: const; any number of threads. Cost: one pass, linear in the size of the element
 * and of its ancestors' declarations.
 */
class QUILLON_API Canonicalizer : public RefCounted
{
public:
    /**
     * @throws XmlSecurityException  the element uses a prefix that nothing declares, or declares
     *                               a relative namespace URI [C14N 1.3].
     */
    virtual void Canonicalize(const ElementNode* element, Writer* writer) const = 0;

    /** The same for a whole document, with the processing instructions around its root. */
    virtual void Canonicalize(const Document* document, Writer* writer) const = 0;
};

/**
 * @param identifier         the algorithm's URI; the one of Canonical XML may end in `#`.
 * @param inclusivePrefixes  for the exclusive form: the `InclusiveNamespaces` prefix list, with
 *                           `#default` for the default namespace.
 * @throws XmlSecurityException  another algorithm.
 */
QUILLON_API Ref<Canonicalizer> CreateCanonicalizer(
    const std::string& identifier, const std::vector<std::string>& inclusivePrefixes = {});

} // namespace Quillon::Xml::Security
