#include "http/ConnectionSpecImpl.h"

#include "crypto/Digest.h"
#include "http/hostSyntax.h"

#include "quillon/StringUtil.h"

#include <string_view>

namespace Quillon::Http {

namespace {

constexpr std::string_view PinPrefix = "sha256//";
constexpr std::size_t PinBytes = 32;

bool IsPin(const std::string& peer)
{
    return peer.compare(0, PinPrefix.size(), PinPrefix) == 0;
}

void RequirePin(const std::string& peer)
{
    std::vector<unsigned char> digest;
    try {
        StringUtil::Base64Decode(std::string_view(peer).substr(PinPrefix.size()), digest);
    } catch (const Base64FormatException& error) {
        throw InvalidArgumentException(
            "The pinned key \"" + peer + "\" is not Base64: " + error.what());
    }
    // Only the one spelling: the pin is compared as text.
    if (digest.size() != PinBytes
        || StringUtil::Base64Encode(digest) != peer.substr(PinPrefix.size())) {
        throw InvalidArgumentException(
            "The pinned key \"" + peer + "\" is not the Base64 of a SHA-256 digest.");
    }
}

void RequirePeer(const std::string& peer)
{
    if (IsPin(peer)) {
        RequirePin(peer);
    } else if (!peer.empty()) {
        RequireHost(peer);
    }
}

const ConnectionSpecImpl& RequirePlain(const ConnectionSpec* spec)
{
    if (spec == nullptr) {
        throw InvalidArgumentException("There is no TCP connection spec.");
    }
    const auto& plain = static_cast<const ConnectionSpecImpl&>(*spec);
    if (plain.tls != nullptr) {
        throw InvalidArgumentException("The connection spec for TCP is one for TLS.");
    }
    return plain;
}

} // namespace

std::string ToUrlHost(const std::string& host)
{
    return host.find(':') == std::string::npos ? host : "[" + host + "]";
}

void CreateTCPConnectionSpec(
    const std::string& host, int port, bool keepAlive, Ref<ConnectionSpec>& out)
{
    RequireHost(host);
    RequirePort(port);
    const Ref<ConnectionSpecImpl> spec(new ConnectionSpecImpl);
    spec->connectHost = host;
    spec->port = port;
    spec->keepAlive = keepAlive;
    spec->host = host;
    out = spec;
}

void CreateSSLConnectionSpec(
    ConnectionSpec* tcp,
    Ssl::SSLContext* sslContext,
    const std::string& host,
    const std::string& peer,
    Ref<ConnectionSpec>& out)
{
    const ConnectionSpecImpl& plain = RequirePlain(tcp);
    if (sslContext == nullptr) {
        throw InvalidArgumentException("There is no SSL context.");
    }
    RequireHost(host);
    RequirePeer(peer);
    const bool isPin = IsPin(peer);
    const std::string& name = peer.empty() || isPin ? host : peer;

    const Ref<ConnectionSpecImpl> spec(new ConnectionSpecImpl);
    spec->connectHost = plain.connectHost;
    spec->port = plain.port;
    spec->keepAlive = plain.keepAlive;
    spec->host = host;
    spec->tls = std::make_unique<Ssl::TlsPeer>(
        Ref<const Ssl::SSLContextImpl>(static_cast<Ssl::SSLContextImpl*>(sslContext)),
        name,
        IsIpAddress(name));
    spec->pin = isPin ? peer : "";
    out = spec;
}

std::string GetPin(const Crypto::Certificate& certificate)
{
    const std::vector<unsigned char> key = certificate.GetPublicKey().GetEncoded();
    Crypto::Digest digest(Crypto::HashAlgorithm::SHA256);
    digest.Update(key.data(), key.size());
    const Crypto::DigestValue value = digest.Finish();
    return std::string(PinPrefix) + StringUtil::Base64Encode(value.bytes.data(), value.length);
}

} // namespace Quillon::Http
