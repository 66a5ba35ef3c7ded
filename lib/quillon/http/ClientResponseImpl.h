#pragma once

#include "quillon/http/ClientResponse.h"

#include <string>

namespace Quillon::Http {

/** A response whose whole body is at hand. */
Ref<ClientResponse> MakeClientResponse(HttpStatus status, std::string body);

} // namespace Quillon::Http
