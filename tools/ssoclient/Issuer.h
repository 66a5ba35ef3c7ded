#pragma once

#include "ssoClient/SamlToken.h"

#include <string>

/** The issuer that a verified token names [SAML-CORE 2.2.5]; empty if it names none. */
std::string FindIssuer(const SsoClient::SamlToken& token);
