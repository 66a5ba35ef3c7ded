#pragma once

#include "CommandLine.h"
#include "DialectOptions.h"
#include "Trust.h"

#include "ssoClient/SamlToken.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>

/** Adds the required `--token FILE`. */
void AddTokenTo(const Command& command, std::string& tokenFile);

/**
 * Reads a token that is to be presented to the service, and verifies it; `-` is standard input.
 *
 * @param dialect  says how tokens are read.
 */
boost::shared_ptr<const SsoClient::SamlToken> ReadToken(
    const std::string& tokenFile, const CertificateList& trusted, const DialectOptions& dialect);
