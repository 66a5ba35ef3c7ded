#pragma once

#include "ssoClientGss/Gssapi.h"
#include "ssoClientGss/KerberosNegotiationHandler.h"

#include <optional>
#include <string>

namespace SsoClient::Gss {

/** A log-on with a key out of a keytab; its ticket lies in memory and goes with the object. */
class KeytabLogOn
{
public:
    /** @throws NegotiationException  the keytab has no such key, or the KDC gives no ticket. */
    KeytabLogOn(const std::string& principal, const std::string& keytab);

    const std::string& GetCacheName() const { return _cacheName; }

private:
    KerberosContext _context;
    TemporaryCache _cache;
    std::string _cacheName;
};

/** What one negotiation authenticates with. */
class Credentials
{
public:
    /** @throws NegotiationException  there are none of that kind. */
    explicit Credentials(const KerberosOptions& options);

    gss_cred_id_t Get() const { return _credential.get(); }

private:
    std::optional<KeytabLogOn> _logOn;
    GssCredential _credential;
};

/** The credentials that the options stand for, for a message. */
std::string DescribeCredentials(const KerberosOptions& options);

} // namespace SsoClient::Gss
