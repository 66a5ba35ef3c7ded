#pragma once

#include "ssoClient/Assertion.h"

#include <string>

/**
 * A page of HTML with every fact of a verified assertion. Like the page of a token it holds
 * everything that it needs, loads nothing and runs no script; all texts are shown as they are, and
 * none is markup.
 *
 * @param signer  the certificate that signed it; may be null if that is not known.
 */
std::string WriteAssertionPage(
    const SsoClient::VerifiedAssertion& assertion, const Quillon::Crypto::Certificate* signer);
