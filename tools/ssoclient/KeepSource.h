#pragma once

#include "IdentityOptions.h"
#include "PasswordOptions.h"
#include "ServiceOptions.h"
#include "TokenSpecOptions.h"

#include "ssoClientGss/KerberosNegotiationHandler.h"
#include "ssoClientRuntime/TokenSource.h"

#include <string>

/** The options that say which tokens are kept, and how they are got. */
struct KeepSourceOptions
{
    std::string method;
    ServiceOptions service;
    IdentityOptions identity;
    TokenSpecOptions token;
    PasswordOptions password;
    std::string presentedFile; ///< of the token that is exchanged
    SsoClient::Gss::KerberosOptions kerberos;

    void AddTo(const Command& command, ExchangeRecord& record);

    /**
     * Makes the source. Reads the files that are read once, and asks for what nobody can be asked
     * later: passphrase and password.
     *
     * @param source       what is said of the source beside this.
     * @throws UsageError  the options do not fit the method, or a file cannot be used.
     */
    boost::shared_ptr<SsoClient::TokenSource> Make(SsoClient::TokenSourceOptions source) const;

private:
    void RequireFitting() const;
};
