#pragma once

#include "CommandLine.h"
#include "DecryptionKeys.h"

#include "ssoClient/ServiceDialect.h"
#include "ssoClient/TokenSpec.h"

#include <boost/optional.hpp>

#include <optional>
#include <string>
#include <vector>

/** How tokens of any producer are read, and who their subjects are. */
struct ReadingOptions
{
    bool general = false;
    std::vector<std::string> subjects;
    std::optional<std::string> domain;
    std::vector<std::string> groupAttributes;
    DecryptionKeys decryptionKeys;

    void AddTo(const Command& command);

    /** Whether one of the options is given. */
    bool IsGiven() const;

    /** What is given, in the place of what `reading` has. */
    void ApplyTo(SsoClient::TokenReading& reading) const;
};

/** How the service is spoken to. */
struct DialectOptions
{
    std::optional<std::string> name;
    ReadingOptions reading;
    bool appliesTo = false;
    std::vector<std::string> claims;
    std::string onBehalfOfFile;
    std::string actAsFile;

    void AddTo(const Command& command);

    /** Adds what only issue requests have. @param spec  gets the audience. */
    void AddIssueTo(const Command& command, SsoClient::TokenSpec& spec);

    /** Adds the tokens of whom somebody else acts for. */
    void AddDelegatingTo(const Command& command);

    /** The token in the body of the request, and what for; empty for none. */
    const std::string& GetPresentedFile() const;

    /** None if no option asks for one. */
    boost::optional<SsoClient::ServiceDialect> Make() const;
};
