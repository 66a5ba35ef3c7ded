#pragma once

#include "quillon/xml/security/Signature.h"

#include <string>
#include <string_view>
#include <vector>

namespace Quillon::Xml::Security {

/** An `Algorithm` attribute and what may stand in the element that carries it. */
struct AlgorithmUse
{
    std::string_view identifier;
    /** `PrefixList` of an `InclusiveNamespaces` child [EXC-C14N 4]; null if there is none. */
    const Attribute* prefixList = nullptr;
    /** The name of another child element, which no accepted algorithm has; empty for none. */
    std::string_view foreignChild;
};

struct ReferenceModel
{
    std::string uri;
    std::vector<AlgorithmUse> transforms;
    AlgorithmUse digestMethod;
    std::vector<unsigned char> digestValue;
};

/** What a `ds:Signature` element says, not yet judged. Its views point into the tree. */
struct SignatureModel
{
    const ElementNode* signedInfo = nullptr;
    AlgorithmUse canonicalization;
    AlgorithmUse signatureMethod;
    std::vector<ReferenceModel> references;
    std::vector<unsigned char> signatureValue;
    KeyInfo keyInfo;
};

/** @throws SignatureSyntaxException  the element is not built as [XMLDSIG 4] says. */
SignatureModel ReadSignature(const ElementNode& signature);

} // namespace Quillon::Xml::Security
