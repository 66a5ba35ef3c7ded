#pragma once

#include "ssl/TlsPeer.h"

#include "quillon/http/ConnectionSpec.h"

#include <memory>
#include <string>

namespace Quillon::Http {

/** What a user agent needs to know to connect. Immutable but for the sessions of `tls`. */
class ConnectionSpecImpl final : public ConnectionSpec
{
public:
    std::string connectHost; ///< where the TCP connection goes
    int port = 0;
    bool keepAlive = false;

    std::string host;                  ///< what is asked for; the same unless TLS says otherwise
    std::unique_ptr<Ssl::TlsPeer> tls; ///< null for plain TCP
    std::string pin;                   ///< `sha256//` and a digest in Base64, or empty

    /** The host and port that messages name. */
    std::string DescribeServer() const { return host + " port " + std::to_string(port); }
};

/** `host` as it stands in a URL: an IPv6 address in brackets [RFC 3986 3.2.2]. */
std::string ToUrlHost(const std::string& host);

} // namespace Quillon::Http
