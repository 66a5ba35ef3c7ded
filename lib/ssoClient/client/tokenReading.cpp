#include "ssoClient/client/tokenReading.h"

#include "ssoClient/CreateSamlToken.h"

namespace SsoClient {

boost::shared_ptr<const SamlToken> ReadToken(
    const std::string& tokenXml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
    const boost::optional<TokenReading>& reading)
{
    return reading ? CreateSamlToken(
               VerifyAssertion(tokenXml, trustedCertificates, reading->rules), reading->mapping)
                   : CreateSamlToken(tokenXml, trustedCertificates);
}

} // namespace SsoClient
