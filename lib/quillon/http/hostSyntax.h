#pragma once

#include <string>
#include <string_view>

namespace Quillon::Http {

/** Whether `text` is an IPv4 or IPv6 address in its usual text form, without brackets. */
bool IsIpAddress(const std::string& text) noexcept;

/**
 * Whether `text` is an IP address or a DNS name: labels of letters, digits, `-` and `_`, the
 * last one not a number. A leading dot, a wildcard or a trailing dot is not accepted: certificate
 * checks would read more into them than a name.
 */
bool IsHost(const std::string& text) noexcept;

/** Whether `text` is a request target: `/`, then characters of a path or query [RFC 3986 3.3]. */
bool IsRequestTarget(std::string_view text) noexcept;

/** @throws InvalidArgumentException  `host` is not a host. */
void RequireHost(const std::string& host);

/** @throws InvalidArgumentException  `port` lies outside 1 to 65535. */
void RequirePort(int port);

} // namespace Quillon::Http
