#pragma once

#include "devsts/wire/Request.h"

#include <optional>
#include <string>

namespace DevSts {

/**
 * Reads a SOAP request strictly: every element and attribute at its place and nothing else.
 *
 * @param soapAction  the HTTP header as it came, quotes included.
 * @throws Fault  says precisely what is wrong.
 */
Request ReadRequest(const std::string& envelope, const std::optional<std::string>& soapAction);

} // namespace DevSts
