#pragma once

#include "ssoClient/assertion/reading.h"

/** The statements of an assertion [SAML-CORE 2.7]. */
namespace SsoClient::GeneralReader {

AssertionAuthentication ReadAuthnStatement(
    const ReaderContext& context, const ElementNode& element);

/** Appends to `attributes`. */
void ReadAttributeStatement(
    const ReaderContext& context,
    const ElementNode& element,
    std::vector<AssertionAttribute>& attributes);

} // namespace SsoClient::GeneralReader
