#pragma once

#include "ssoClient/assertion/reading.h"

namespace SsoClient::GeneralReader {

/**
 * A `ds:KeyInfo` that describes one public key [XMLDSIG 4.4]. Several descriptions must agree. Of
 * several certificates the key is in the one that a key value or an issuer and serial number
 * picks, or else in the one that has issued none of the others: their order means nothing.
 */
AssertionKey ReadKeyInfo(const ElementNode& element);

} // namespace SsoClient::GeneralReader
