#pragma once

#include "crypto/Digest.h"
#include "xml/security/Canonicalization.h"

namespace Quillon::Xml::Security {

/** The digest of what `Canonicalize` writes, without the text in between. */
Crypto::DigestValue DigestElement(
    Crypto::HashAlgorithm hash,
    const CanonicalizationMethod& method,
    const ElementNode& apex,
    const Node* excluded);

/** The digest of what `CanonicalizeDocument` writes. */
Crypto::DigestValue DigestDocument(
    Crypto::HashAlgorithm hash,
    const CanonicalizationMethod& method,
    const Node* first,
    const Node* excluded);

} // namespace Quillon::Xml::Security
