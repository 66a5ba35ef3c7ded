#pragma once

#include "Explanation.h"

#include <string>

/**
 * A page of HTML about a verified token: what the lines for a terminal say, and the rest of its
 * facts. It holds everything that it needs and loads nothing, runs no script, and has nothing in it
 * that the token could be used with. All texts of the token are shown as they are, and none is
 * markup.
 *
 * @param signer  the certificate that signed it; may be null if that is not known.
 */
std::string WriteTokenPage(
    const SsoClient::SamlToken& token, const Quillon::Crypto::Certificate* signer);
