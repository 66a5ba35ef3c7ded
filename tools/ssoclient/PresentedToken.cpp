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
    const std::string& tokenFile, const CertificateList& trusted)
{
    return SsoClient::CreateSamlToken(ReadFile(tokenFile), trusted);
}
