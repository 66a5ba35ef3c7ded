#pragma once

#include "quillon/xml/Node.h"
#include "ssoClient/ServiceDialect.h"
#include "ssoClient/SoapFault.h"

namespace SsoClient {

/** Reads a fault of either version of SOAP as far as it goes. */
SoapFault ReadFault(const Quillon::Xml::ElementNode& fault);

/**
 * Throws what a fault means. Those of SOAP 1.2 are understood if the dialect speaks it; then those
 * of SOAP 1.1 are, too, for with them a service says that it does not [SOAP12-1 A].
 *
 * @throws InvalidCredentialsException  the fault says so.
 * @throws ParseException               the prefix of its code is not declared.
 * @throws SsoException                 any other fault.
 */
[[noreturn]] void ThrowFault(const Quillon::Xml::ElementNode& fault, const ServiceDialect& dialect);

} // namespace SsoClient
