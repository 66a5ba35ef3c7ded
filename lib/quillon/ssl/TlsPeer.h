#pragma once

#include "ssl/SSLContextImpl.h"

#include <list>
#include <string>
#include <vector>

namespace Quillon::Ssl {

/** What became known of the peer of one connection. Used on the I/O thread. */
struct PeerRecord final : public RefCounted
{
    int alert = 0;         ///< with which the peer ended the connection, if not in order
    bool isClosed = false; ///< whether the peer ended it in order [RFC 8446 6.1]

    bool isObserved = false; ///< whether the rest is collected
    std::string version;     ///< of TLS
    std::string cipher;
    bool isResumed = false; ///< whether an earlier session was taken up
    std::list<Ref<const Crypto::Certificate>> certificates; ///< as shown, the peer's own first
};

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

    /**
     * Sets up `connection`, which must not outlive this object.
     *
     * @param record  learns of the peer.
     * @return success.
     */
    bool Prepare(SSL_CTX* connection, const Ref<PeerRecord>& record) noexcept;

    /** Whether the client has a certificate to show. */
    bool HasIdentity() const noexcept { return _context->HasIdentity(); }

    const std::string& GetName() const noexcept { return _name; }

private:
    using SessionOwner = std::unique_ptr<SSL_SESSION, Crypto::OpenSslDeleter<SSL_SESSION_free>>;

    static void OnEvent(const SSL* ssl, int where, int result);
    static void OfferSession(const SSL* ssl);
    static int OnNewSession(SSL* ssl, SSL_SESSION* session);

    bool RequireName(SSL_CTX* connection) const noexcept;
    void Keep(SessionOwner session) noexcept;
    SessionOwner Take() noexcept;

    Ref<const SSLContextImpl> _context;
    std::string _name;
    bool _nameIsAddress;
    std::vector<SessionOwner> _sessions; // newest last
};

/** That of a connection that was prepared here. */
Ref<PeerRecord> GetRecord(const SSL* connection);

/** OpenSSL's words for an alert. */
std::string DescribeAlert(int code);

/** Whether an alert is about the certificate of the one who receives it [RFC 8446 6.2]. */
bool IsAboutCertificate(int code) noexcept;

/** OpenSSL's words for the outcome of a certificate verification. */
std::string DescribeVerifyResult(long result);

} // namespace Quillon::Ssl
