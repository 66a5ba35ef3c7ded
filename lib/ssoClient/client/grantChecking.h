#pragma once

#include "ssoClient/HolderOfKeyConfig.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/ServiceDialect.h"
#include "ssoClient/TokenSpec.h"

#include <boost/optional.hpp>

#include <string>

namespace SsoClient {

/** What was asked for, as far as a token can be compared with it. Not to outlive what it names. */
struct GrantRequest
{
    enum class Way
    {
        PASSWORD,
        NEGOTIATION,
        CERTIFICATE,
        TOKEN,
        RENEWAL
    };

    Way way = Way::NEGOTIATION;
    const TokenSpec* spec = nullptr; ///< null for a renewal
    long long lifetimeSec = 0;
    const std::string* userName = nullptr;
    const SamlToken* presented = nullptr; ///< the token that was presented, or is to be renewed

    static GrantRequest ByPassword(const std::string& userName, const TokenSpec& spec);
    static GrantRequest ByNegotiation(const TokenSpec& spec);
    static GrantRequest ByCertificate(const TokenSpec& spec);
    static GrantRequest ByToken(const SamlToken& presented, const TokenSpec& spec);
    static GrantRequest ByRenewal(const SamlToken& renewed, long long lifetimeSec);
};

/**
 * Compares an issued token with what was asked for, in the parts that the dialect's check has.
 *
 * @throws SsoException  it is another one; the text says what differs.
 */
void CheckGrant(
    const SamlToken& token,
    const GrantRequest& asked,
    const ServiceDialect& dialect,
    const boost::optional<HolderOfKeyConfig>& identity);

} // namespace SsoClient
