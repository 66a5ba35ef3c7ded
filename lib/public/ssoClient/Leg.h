#pragma once

#include <vector>

namespace SsoClient {

/** One token of a GSS negotiation, as the mechanism made it: opaque bytes [RFC 2743 1.1.2]. */
using Leg = std::vector<unsigned char>;

} // namespace SsoClient
