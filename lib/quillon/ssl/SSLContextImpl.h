#pragma once

#include "crypto/OpenSsl.h"

#include "quillon/ssl/SSLContext.h"

namespace Quillon::Ssl {

/** The trusted authorities and the client identity, decoded once. */
class SSLContextImpl final : public SSLContext
{
public:
    explicit SSLContextImpl(const SSLContextOptions& options);

    /** Gives `context`, of one connection, this trust and identity. @return success. */
    bool Apply(SSL_CTX* context) const noexcept;

    bool HasIdentity() const noexcept { return _clientKey != nullptr; }

private:
    Crypto::X509StoreOwner _authorities;
    std::list<Ref<const Crypto::Certificate>> _clientCertificates;
    Ref<const Crypto::PrivateKey> _clientKey;
};

} // namespace Quillon::Ssl
