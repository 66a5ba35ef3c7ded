#include "PresentedToken.h"

#include "Arguments.h"
#include "Files.h"
#include "GeneralReading.h"

#include "ssoClient/CreateSamlToken.h"

namespace {

boost::shared_ptr<const SsoClient::SamlToken> ReadDefaultToken(
    const std::string& text, const CertificateList& trusted, bool verbose)
{
    try {
        return SsoClient::CreateSamlToken(text, trusted);
    } catch (const Quillon::Exception&) {
        if (verbose) {
            NoteGeneralReading(text, trusted, SsoClient::DefaultClockToleranceSec);
        }
        throw;
    }
}

} // namespace

void AddTokenTo(const Command& command, std::string& tokenFile)
{
    command.AddOption("--token", tokenFile, "The token to present, - for standard input")
        .Required()
        .Check(CheckNotEmpty)
        .ValueName("FILE");
}

boost::shared_ptr<const SsoClient::SamlToken> ReadToken(
    const std::string& tokenFile, const CertificateList& trusted, const ServiceOptions& service)
{
    const auto spoken = service.dialect.Make();
    const std::string text = ReadFile(tokenFile);
    if (!spoken || !spoken->reading) {
        return ReadDefaultToken(text, trusted, service.verbose);
    }
    const SsoClient::TokenReading& reading = *spoken->reading;
    return SsoClient::CreateSamlToken(
        SsoClient::VerifyAssertion(text, trusted, reading.rules), reading.mapping);
}
