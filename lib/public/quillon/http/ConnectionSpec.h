#pragma once

#include "quillon/Exceptions.h"
#include "quillon/Ref.h"
#include "quillon/ssl/SSLContext.h"

#include <string>

namespace Quillon::Http {

/**
 * Where connections go and what their peer must prove. TLS sessions are resumed only between
 * connections of one and the same spec, so never across contexts, hosts or peers.
 *
 * Thread safety: any number of threads and connections.
 */
class QUILLON_API ConnectionSpec : public RefCounted
{};

/**
 * Plain TCP.
 *
 * @param host       a DNS name or an IP address (IPv6 without brackets).
 * @param keepAlive  whether the system probes idle connections [RFC 1122 4.2.3.6].
 * @throws InvalidArgumentException  a malformed host, or a port outside 1 to 65535.
 */
QUILLON_API void CreateTCPConnectionSpec(
    const std::string& host, int port, bool keepAlive, Ref<ConnectionSpec>& out);

/**
 * TLS over the connection that `tcp` describes.
 *
 * @param sslContext  kept by reference.
 * @param host        the host that is asked for, in the `Host` header and as TLS server name.
 * @param peer        what the server must prove. Empty: its certificate names `host`. A DNS name
 *                    or an IP address: the certificate names that one instead. `sha256//` and the
 *                    Base64 of a SHA-256 digest: in addition to the first, the digest of the
 *                    server's SubjectPublicKeyInfo is that one.
 *
 * @throws InvalidArgumentException  `tcp` is null or already TLS, `sslContext` is null, or `host`
 *                                   or `peer` is malformed.
 */
QUILLON_API void CreateSSLConnectionSpec(
    ConnectionSpec* tcp,
    Ssl::SSLContext* sslContext,
    const std::string& host,
    const std::string& peer,
    Ref<ConnectionSpec>& out);

/** `sha256//` and the digest that pins the key of `certificate`. @throws Crypto::CryptoException */
QUILLON_API std::string GetPin(const Crypto::Certificate& certificate);

} // namespace Quillon::Http
