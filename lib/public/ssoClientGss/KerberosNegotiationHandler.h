#pragma once

#include "ssoClient/NegotiationHandler.h"
#include "ssoClientGss/Export.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <string>

namespace SsoClient::Gss {

/**
 * With whom to negotiate, and as whom. Credentials are those of the process's default cache, of
 * the given cache, or of the given keytab and principal. Names may be paths or have a type in
 * front, like `FILE:/path` or `KEYRING:name`.
 */
struct KerberosOptions
{
    /**
     * The token service. Its host gives the service name `HTTP@host`, as if that were given as
     * `service`; else it is not read.
     */
    std::string url;

    /**
     * The Kerberos service, if it is not `HTTP@host`: `service@host`, whose host may be changed
     * by the DNS settings of the Kerberos configuration, or the principal name `service/host` or
     * `service/host@REALM`, which is taken as it is.
     */
    std::string service;

    /** The credential cache. With a name, no other cache and no keytab is looked at. */
    std::string ccache;

    /** The keytab with the long-term key of `principal`. Its ticket stays in the handler. */
    std::string keytab;

    /** The client principal: `name` or `name@REALM`. Needed with a keytab, and only then. */
    std::string principal;
};

/**
 * Makes a handler that negotiates Kerberos within SPNEGO [RFC 4178], with mutual authentication
 * and without delegation. It neither reads nor contacts anything yet: its first `Negotiate` takes
 * the credentials and talks to the KDC, for as long as the Kerberos configuration lets it wait.
 *
 * `Negotiate` throws a `NegotiationException`. It refuses what would keep a negotiation from
 * ending: an empty leg or a leg above 64 KiB of the service, a leg after the negotiation is
 * complete (but one bare "accept-completed" may come), and more than 16 legs. When the negotiation
 * completes without a leg of its own to send, it returns an "accept-completed" [RFC 4178 4.2.2]. A
 * service that sends no last leg has not authenticated itself through Kerberos.
 *
 * @throws Quillon::InvalidArgumentException  the options contradict each other, are incomplete,
 *                                            or are no names.
 *
 * Thread safety: handlers are independent of each other; the environment is not changed.
 */
SSOCLIENT_GSS_API boost::shared_ptr<NegotiationHandler> CreateKerberosNegotiationHandler(
    const KerberosOptions& options);

} // namespace SsoClient::Gss
