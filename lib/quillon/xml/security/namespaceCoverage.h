#pragma once

#include "xml/security/Canonicalization.h"

#include <string_view>

namespace Quillon::Xml::Security {

/**
 * Whether the canonical form of `apex` fixes what `prefix` is bound to at `element`: never if that
 * stands outside `apex`.
 */
bool Covers(
    const CanonicalizationMethod& method,
    const ElementNode& apex,
    const ElementNode& element,
    std::string_view prefix) noexcept;

} // namespace Quillon::Xml::Security
