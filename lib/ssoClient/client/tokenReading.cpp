#include "ssoClient/client/tokenReading.h"

#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/protocol/exchangeLog.h"

namespace SsoClient {

namespace {

using Certificates = std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>;

/** Verifies once more, and only where somebody reads what comes of it. */
void LogGeneralReading(const std::string& tokenXml, const Certificates& trustedCertificates)
{
    if (!LogsExchanges()) {
        return;
    }
    try {
        const auto assertion = VerifyAssertion(tokenXml, trustedCertificates);
        const auto& subject = assertion->GetFacts().subject;
        LogGeneralToken(subject ? subject->format.value_or("") : "");
    } catch (const Quillon::Exception&) {
        return; // It is refused in either way.
    }
}

boost::shared_ptr<const SamlToken> ReadDefaultToken(
    const std::string& tokenXml, const Certificates& trustedCertificates)
{
    try {
        return CreateSamlToken(tokenXml, trustedCertificates);
    } catch (const Quillon::Exception&) {
        LogGeneralReading(tokenXml, trustedCertificates);
        throw;
    }
}

} // namespace

boost::shared_ptr<const SamlToken> ReadToken(
    const std::string& tokenXml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
    const boost::optional<TokenReading>& reading)
{
    return reading ? CreateSamlToken(
               VerifyAssertion(tokenXml, trustedCertificates, reading->rules), reading->mapping)
                   : ReadDefaultToken(tokenXml, trustedCertificates);
}

} // namespace SsoClient
