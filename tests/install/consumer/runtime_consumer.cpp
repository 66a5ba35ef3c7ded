// Uses the installed token sources: prints why one has no token.

#include "ssoClientRuntime/TokenSource.h"

#include <iostream>

int main()
{
    const auto source =
        SsoClient::CreateTokenSource([]() -> boost::shared_ptr<const SsoClient::SamlToken> {
            throw SsoClient::SsoException("nobody gives any");
        });
    try {
        source->GetToken();
    } catch (const SsoClient::NoTokenException& error) {
        const Quillon::Exception& reason = *error.GetOutage().reason;
        std::cout << Quillon::GetClassName(error) << "\n"
                  << Quillon::GetClassName(reason) << ": " << reason.what() << "\n";
    }
}
