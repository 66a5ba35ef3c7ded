#pragma once

#include "devsts/wire/Clock.h"
#include "devsts/wire/Request.h"

#include <optional>
#include <set>
#include <string>
#include <vector>

namespace DevSts {

struct Delegate
{
    std::string name;
    TimePoint instant;
};

/** What a token says. */
struct Assertion
{
    std::string id;
    TimePoint issueInstant;
    std::string subject;
    std::optional<std::string> confirmationCertificateDer; ///< none: a bearer token
    TimePoint notBefore;
    TimePoint notOnOrAfter;
    std::optional<unsigned> renewCount;
    std::optional<unsigned> proxyCount;
    std::vector<Delegate> delegates; ///< from the first to the one that may use the token
    std::set<std::string> audience;
    std::vector<Advice> advice;
    TimePoint authnInstant;
    std::string authnContext;
    std::vector<std::string> groups;
    std::string givenName;
    std::string surname;
    bool isSolution = false;
};

} // namespace DevSts
