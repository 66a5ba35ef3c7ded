#pragma once

#include "quillon/http/ClientResponse.h"

#include <string>

namespace Quillon::Http {

Ref<ClientResponse> MakeClientResponse(HttpStatus status, std::string body);

} // namespace Quillon::Http
