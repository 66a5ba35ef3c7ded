#pragma once

#include "Trust.h"

#include "ssoClient/SamlToken.h"

#include <string>

/**
 * Lines for a person about a verified token: how long it is valid, who signed and issued it, what
 * it is bound to, for whom it is, and who may act for its subject.
 *
 * @param signer  the certificate that signed it; may be null if that is not known.
 */
std::string Explain(const SsoClient::SamlToken& token, const Quillon::Crypto::Certificate* signer);
