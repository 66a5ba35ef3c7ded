// Uses the installed Kerberos handler: prints what it says about a keytab without a principal.

#include "ssoClientGss/Exceptions.h"
#include "ssoClientGss/KerberosNegotiationHandler.h"

#include <iostream>

int main()
{
    SsoClient::Gss::KerberosOptions options;
    options.service = "HTTP@sts.example.com";
    options.keytab = "/no/keytab";
    try {
        SsoClient::Gss::CreateKerberosNegotiationHandler(options);
    } catch (const Quillon::InvalidArgumentException& error) {
        std::cout << error.what() << "\n";
    }
    options.principal = "nobody@EXAMPLE.TEST";
    try {
        SsoClient::Gss::CreateKerberosNegotiationHandler(options)->Negotiate(SsoClient::Leg());
    } catch (const SsoClient::Gss::NegotiationException& error) {
        std::cout << error.what() << "\n";
    }
}
