#pragma once

#include "ssl/SSLContextImpl.h"

#include <string>
#include <vector>

namespace Quillon::Ssl {

/**
 * The TLS side of one connection spec: what its peer must prove, and the sessions that can be
 * resumed. The sessions live here because they stand for a verification that is already done: one
 * that was made for another context or peer must never be taken for this one.
 *
 * Thread safety: `Prepare` and what it sets in motion run on the HTTP client's I/O thread.
 */
class TlsPeer
{
public:
    /** @param name  the DNS name or IP address that the peer's certificate must have. */
    TlsPeer(Ref<const SSLContextImpl> context, std::string name, bool nameIsAddress);

    /** Sets up `connection`, which must not outlive this object. @return success. */
    bool Prepare(SSL_CTX* connection) noexcept;

    const std::string& GetName() const noexcept { return _name; }

private:
    using SessionOwner = std::unique_ptr<SSL_SESSION, Crypto::OpenSslDeleter<SSL_SESSION_free>>;

    static void OnHandshake(const SSL* ssl, int where, int result);
    static int OnNewSession(SSL* ssl, SSL_SESSION* session);

    bool RequireName(SSL_CTX* connection) const noexcept;
    void Keep(SessionOwner session);
    SessionOwner Take();

    Ref<const SSLContextImpl> _context;
    std::string _name;
    bool _nameIsAddress;
    std::vector<SessionOwner> _sessions; // newest last
};

/** OpenSSL's words for the outcome of a certificate verification. */
std::string DescribeVerifyResult(long result);

} // namespace Quillon::Ssl
