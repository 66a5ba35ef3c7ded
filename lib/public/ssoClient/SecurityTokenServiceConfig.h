#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/ssl/SSLContext.h"
#include "ssoClient/HolderOfKeyConfig.h"
#include "ssoClient/PasswordCredentials.h"
#include "ssoClient/ServiceDialect.h"
#include "ssoClient/SoapFault.h"

#include <boost/optional.hpp>

#include <list>
#include <string>

namespace SsoClient {

/** The token service to talk to. Read only while the service object is created. */
struct SecurityTokenServiceConfig
{
    /** `https://host[:port]/path`, or `http://...` for tests. */
    std::string url;

    /** The certificates that sign the tokens of the service. */
    std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> trustedCertificates;

    /**
     * What the TLS peer must prove. Empty: its certificate names the host of `url`. A name: the
     * certificate names that one instead. `sha256//BASE64`: in addition to the first, the SHA-256
     * digest of the server's public key (SubjectPublicKeyInfo) is that one.
     */
    std::string sslPeerParameter;

    /** The caller's own identity; absent, or without key or certificate, for a bearer-only client.
     */
    boost::optional<HolderOfKeyConfig> holderOfKeyConfig;

    /**
     * Not owned here, kept by reference by the service; null only for an `http:` URL.
     */
    Quillon::Ssl::SSLContext* sslContext = nullptr;

    /** How the service wants to be spoken to; absent for the one that the library was made for. */
    boost::optional<ServiceDialect> dialect;

    /**
     * Who asks, where the operation does not say and the dialect wants to know: in renewals,
     * validations, and requests that present a token in their body.
     */
    boost::optional<PasswordCredentials> credentials;

    /** Shown every fault of the service; empty for none. Called by any number of threads. */
    FaultObserver faultObserver;
};

} // namespace SsoClient
