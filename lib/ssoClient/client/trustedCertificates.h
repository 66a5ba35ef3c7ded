#pragma once

#include "quillon/crypto/Certificate.h"

#include <list>

namespace SsoClient {

/**
 * With a null one no token can be verified. That is to be known before credentials go out for one.
 *
 * @throws Quillon::InvalidArgumentException  a certificate is null.
 */
void RefuseNullCertificate(
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates);

} // namespace SsoClient
