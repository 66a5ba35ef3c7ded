// Uses the installed library as another project would: prints what it says about a text that is
// not a token, and about a service without TLS settings.

#include "quillon/xml/Parser.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/SecurityTokenService.h"

#include <iostream>
#include <list>

int main()
{
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> nobody;
    try {
        SsoClient::CreateSamlToken("this is no XML", nobody);
    } catch (const Quillon::Xml::XMLParseException& error) {
        std::cout << Quillon::GetClassName(error) << "\n";
    }
    try {
        SsoClient::SecurityTokenServiceConfig config;
        config.url = "https://sts.example.com/sts";
        SsoClient::CreateSecurityTokenService(config);
    } catch (const Quillon::InvalidArgumentException& error) {
        std::cout << error.what() << "\n";
    }
}
