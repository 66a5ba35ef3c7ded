#pragma once

#include "devsts/token/Assertion.h"

namespace DevSts {

/**
 * Reads a token of this STS where it stands, after verifying its signature over that very
 * element. The statements are not read but for the AuthnStatement: what is known of the subject
 * may have changed since.
 *
 * @throws ShapeError  not such a token, or the signature does not verify.
 */
Assertion ReadVerifiedAssertion(xmlNode* element, const std::string& signingCertificateDer);

/** @throws ShapeError  the token is not valid at `now`. */
void RequireCurrent(const Assertion& assertion, TimePoint now);

} // namespace DevSts
