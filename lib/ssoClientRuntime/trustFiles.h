#pragma once

#include "ssoClientRuntime/TrustStore.h"

#include <string>

namespace SsoClient {

/**
 * The certificates of a file, or of the files of a folder in the order of their names; each one
 * once.
 *
 * @throws Quillon::Crypto::CryptoException  a file cannot be used, or there is no certificate.
 */
TrustStore::Certificates ReadTrustFiles(const std::string& path);

} // namespace SsoClient
