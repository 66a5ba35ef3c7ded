#include "PresentedToken.h"

#include "Arguments.h"
#include "Files.h"

#include "ssoClient/CreateSamlToken.h"

void AddTokenTo(CLI::App& command, std::string& tokenFile)
{
    command.add_option("--token", tokenFile, "The token to present, - for standard input")
        ->required()
        ->check(CheckNotEmpty)
        ->type_name("FILE");
}

boost::shared_ptr<const SsoClient::SamlToken> ReadToken(
    const std::string& tokenFile, const CertificateList& trusted)
{
    return SsoClient::CreateSamlToken(ReadFile(tokenFile), trusted);
}
