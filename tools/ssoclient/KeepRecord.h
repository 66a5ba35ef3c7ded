#pragma once

#include "quillon/system/DateTime.h"
#include "ssoClient/SamlToken.h"

#include <map>
#include <optional>
#include <string>

/** What `ssoclient keep` knows of its token and of its attempts. It holds nothing secret. */
struct KeepRecord
{
    struct Token
    {
        std::string id;
        std::string subjectName;
        std::string subjectDomain;
        Quillon::System::DateTime validUntil;
    };

    struct Failure
    {
        std::string className;
        std::string message;
        Quillon::System::DateTime since; ///< of the first in a row
    };

    std::optional<Token> token;     ///< the one in the file
    std::optional<Failure> failure; ///< of the last attempt
    std::optional<Quillon::System::DateTime> nextAttempt;
    std::optional<Quillon::System::DateTime> lastSuccess;
    unsigned long long refreshes = 0;
    std::map<std::string, unsigned long long> failuresByClass;

    /** A token was written to the file. */
    void NoteToken(const SsoClient::SamlToken& kept);

    /** @param since  when the first failure in a row was. */
    void NoteFailure(const std::exception& error, const Quillon::System::DateTime& since);

    /** As an object of JSON in ASCII, on one line or, with `indent`, on several. */
    std::string ToJson(int indent = -1) const;

    /** In Prometheus's text format. */
    std::string ToMetrics() const;
};
