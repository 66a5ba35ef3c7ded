#pragma once

#include "devsts/wire/Xml.h"

#include <string>
#include <vector>

namespace DevSts {

/** How each reference of a signature has to be transformed. */
enum class SignatureKind
{
    MESSAGE,  ///< exclusive canonicalization
    ASSERTION ///< enveloped signature, then exclusive canonicalization, which may list prefixes
};

struct SignedReference
{
    std::string uri;
    std::string digest; ///< Base64 without blanks
};

/** A ds:Signature as it was read; nothing in it is verified yet. */
struct SignatureParts
{
    std::string id;    ///< empty if it has none
    std::string value; ///< Base64 without blanks
    std::vector<SignedReference> references;
    xmlNode* keyInfo = nullptr;
};

/**
 * Admits exclusive canonicalization, RSA-SHA256, SHA-256 and the transforms of `kind`, and
 * nothing else: xmlsec1 would follow whatever a signature tells it to.
 *
 * @throws ShapeError
 */
SignatureParts ReadSignature(const xmlNode* signature, SignatureKind kind);

} // namespace DevSts
