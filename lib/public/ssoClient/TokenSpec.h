#pragma once

#include "ssoClient/Advice.h"
#include "ssoClient/Export.h"

#include <boost/optional.hpp>

#include <set>
#include <string>
#include <vector>

namespace SsoClient {

/** What a caller asks of the token to be issued. */
struct TokenSpec
{
    enum Confirmation : int
    {
        /** Holder-of-key if the service has a holder-of-key identity, bearer otherwise. */
        CONFIRMATION_DEFAULT = 0,
        /** Bearer, even if there is a holder-of-key identity. */
        CONFIRMATION_BEARER = 1
    };

    long long tokenLifetimeSec = 300;          ///< must be positive
    std::set<std::string> audienceRestriction; ///< empty: none requested
    std::vector<Advice> advice;
    bool delegable = false;
    boost::optional<std::string> delegateTo; ///< the principal to delegate to, if any
    bool renewable = false;
    Confirmation confirmation = CONFIRMATION_DEFAULT;

    TokenSpec() = default;
    SSOCLIENT_API TokenSpec(const TokenSpec& other);
    TokenSpec& operator=(const TokenSpec& other) = default;
    SSOCLIENT_API ~TokenSpec();
};

} // namespace SsoClient
