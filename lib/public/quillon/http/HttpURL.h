#pragma once

#include "quillon/Exceptions.h"

#include <string>

namespace Quillon::Http {

/**
 * Takes an absolute `http` or `https` URL [RFC 9110 4.2] apart.
 *
 * @param host  receives the host as written; an IPv6 address without its brackets.
 * @param port  receives the port, 80 or 443 if the URL has none.
 * @param path  receives the request target [RFC 9112 3.2.1]: path and query as written, at least
 *              `/`.
 *
 * @throws InvalidArgumentException  anything else: another scheme, a user name or password, a
 *                                   fragment, a port outside 1 to 65535, or a character that a URL
 *                                   may not have. The out arguments are untouched then.
 */
QUILLON_API void ParseHttpURL(
    const std::string& url, bool& isHttps, std::string& host, int& port, std::string& path);

} // namespace Quillon::Http
