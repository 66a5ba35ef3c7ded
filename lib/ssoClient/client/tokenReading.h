#pragma once

#include "ssoClient/SamlToken.h"
#include "ssoClient/ServiceDialect.h"

#include <boost/optional.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include <list>
#include <string>

namespace SsoClient {

/**
 * The token of a reply, verified.
 *
 * @param reading  how it is read; absent for the narrow way.
 * @throws what `CreateSamlToken` and `VerifyAssertion` throw.
 */
boost::shared_ptr<const SamlToken> ReadToken(
    const std::string& tokenXml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
    const boost::optional<TokenReading>& reading);

} // namespace SsoClient
