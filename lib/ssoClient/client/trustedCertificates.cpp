#include "ssoClient/client/trustedCertificates.h"

#include "quillon/Exceptions.h"

#include <algorithm>

namespace SsoClient {

void RefuseNullCertificate(
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates)
{
    if (std::find(trustedCertificates.begin(), trustedCertificates.end(), nullptr)
        != trustedCertificates.end()) {
        throw Quillon::InvalidArgumentException("A trusted certificate is null");
    }
}

} // namespace SsoClient
