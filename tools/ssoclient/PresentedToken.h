#pragma once

#include "CommandLine.h"
#include "ServiceOptions.h"
#include "Trust.h"

#include "ssoClient/SamlToken.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>

/** Adds the required `--token FILE`. */
void AddTokenTo(const Command& command, std::string& tokenFile);

/**
 * Reads a token that is to be presented to the service, and verifies it; `-` is standard input.
 *
 * @param service  says how tokens are read, and whether more is said of one that is refused.
 */
boost::shared_ptr<const SsoClient::SamlToken> ReadToken(
    const std::string& tokenFile, const CertificateList& trusted, const ServiceOptions& service);
