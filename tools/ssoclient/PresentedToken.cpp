#include "PresentedToken.h"

#include "Arguments.h"
#include "Files.h"

#include "ssoClient/CreateSamlToken.h"

void AddTokenTo(const Command& command, std::string& tokenFile)
{
    command.AddOption("--token", tokenFile, "The token to present, - for standard input")
        .Required()
        .Check(CheckNotEmpty)
        .ValueName("FILE");
}

boost::shared_ptr<const SsoClient::SamlToken> ReadToken(
    const std::string& tokenFile, const CertificateList& trusted, const DialectOptions& dialect)
{
    const auto spoken = dialect.Make();
    if (!spoken || !spoken->reading) {
        return SsoClient::CreateSamlToken(ReadFile(tokenFile), trusted);
    }
    const SsoClient::TokenReading& reading = *spoken->reading;
    return SsoClient::CreateSamlToken(
        SsoClient::VerifyAssertion(ReadFile(tokenFile), trusted, reading.rules), reading.mapping);
}
