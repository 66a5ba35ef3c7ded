#pragma once

#include "ssoClient/xmlCommonBuilders.h"

namespace SsoClient {

/** An unsigned SOAP 1.1 envelope. A null header or body leaves its element empty. */
XMLBuilderPtr SoapBuilder(XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder);

} // namespace SsoClient
