#pragma once

#include "ssoClient/assertion/reading.h"

namespace SsoClient::GeneralReader {

/** The conditions of an assertion; one that is not known is refused [SAML-CORE 2.5.1]. */
AssertionConditions ReadConditions(const ReaderContext& context, const ElementNode& element);

} // namespace SsoClient::GeneralReader
