#pragma once

#include "CommandLine.h"
#include "Trust.h"

#include "quillon/ssl/SSLContext.h"
#include "ssoClient/SecurityTokenService.h"

#include <string>
#include <vector>

/** The options of every command that talks to a token service. */
struct ServiceOptions
{
    std::string url;
    std::vector<std::string> trustFiles;
    std::vector<std::string> authorityFiles;
    std::string peer;
    bool verbose = false;

    void AddTo(const Command& command);

    /**
     * Creates the service, and turns its trace lines on if that is asked for.
     *
     * @param trusted   what `trustFiles` hold.
     * @param identity  of the caller, if there is one.
     */
    boost::shared_ptr<SsoClient::SecurityTokenService> CreateService(
        const CertificateList& trusted,
        const boost::optional<SsoClient::HolderOfKeyConfig>& identity = boost::none) const;
};
