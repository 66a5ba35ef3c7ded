#pragma once

#include "ssoClient/assertion/reading.h"

namespace SsoClient::GeneralReader {

/**
 * The signature of an assertion, which must be there, be well built and refer to the assertion;
 * not verified yet. @throws ParseException
 */
Quillon::Ref<Quillon::Xml::Security::Signature> FindSignature(ElementNode& assertion);

/** Everything that a verified assertion says. */
AssertionFacts ReadAssertion(
    const ElementNode& assertion, const Quillon::Xml::Security::Signature& signature);

} // namespace SsoClient::GeneralReader
