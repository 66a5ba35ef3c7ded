#pragma once

#include "CommandLine.h"

#include "ssoClient/HolderOfKeyConfig.h"

#include <boost/optional.hpp>

#include <optional>
#include <string>

/** The options that name the caller's own key and certificate. */
struct IdentityOptions
{
    std::optional<std::string> key; ///< a file, or the URI of a key in an OpenSSL store
    std::string keyPassphraseFile;
    std::string certificateFile;

    /** Adds them as options that may both be left out. */
    void AddTo(const Command& command);
    void AddRequiredTo(const Command& command);

    /**
     * Reads the key and the certificate, and asks for the key's passphrase if it has one.
     *
     * @return nothing if the options were left out.
     * @throws UsageError  one cannot be read, requests cannot be signed with the key, or it is not
     *                     that of the certificate.
     */
    boost::optional<SsoClient::HolderOfKeyConfig> Read() const;
};
