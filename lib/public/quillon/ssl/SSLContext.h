#pragma once

#include "quillon/Ref.h"
#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"

#include <list>
#include <string>

namespace Quillon::Ssl {

/** What a client trusts when it opens a TLS connection, and what it shows. */
struct SSLContextOptions
{
    /** Trust the certificate authorities of the system, in addition to those below. */
    bool useSystemAuthorities = true;

    /** Further trusted certificate authorities. */
    std::list<Ref<const Crypto::Certificate>> authorities;

    /** The client certificate with its chain, own certificate first; empty for none. */
    std::list<Ref<const Crypto::Certificate>> clientCertificates;
    Ref<const Crypto::PrivateKey> clientKey;
};

/**
 * The TLS settings of connections: TLS 1.2 or later, peer certificates always verified. The
 * trusted authorities are loaded once, when the context is made, and shared by all connections.
 *
 * Thread safety: immutable; any number of connections at once.
 */
class QUILLON_API SSLContext : public RefCounted
{};

/**
 * @throws InvalidArgumentException  a client key without a certificate or the reverse, or no
 *                                   trusted authority at all.
 * @throws Crypto::CryptoException   the system's authorities cannot be loaded, or the client key
 *                                   does not belong to the certificate.
 */
QUILLON_API Ref<SSLContext> CreateSSLContext(const SSLContextOptions& options);

/**
 * A context that trusts the authorities in a PEM file and no others, and shows no certificate.
 *
 * @throws Crypto::CryptoException  as `Crypto::LoadPemCertificates`, with the file in the text.
 */
QUILLON_API Ref<SSLContext> LoadSSLContext(const std::string& authoritiesPath);

} // namespace Quillon::Ssl
