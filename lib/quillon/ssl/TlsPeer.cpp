#include "ssl/TlsPeer.h"

#include <utility>

namespace Quillon::Ssl {

namespace {

/** Enough for a burst of connections; a server hands out two with each full handshake. */
constexpr std::size_t MaxSessions = 16;

/** The slot of an `SSL_CTX` that points to its `TlsPeer`. */
int GetPeerSlot()
{
    static const int slot = SSL_CTX_get_ex_new_index(0, nullptr, nullptr, nullptr, nullptr);
    return slot;
}

TlsPeer* GetPeer(const SSL* ssl)
{
    return static_cast<TlsPeer*>(SSL_CTX_get_ex_data(SSL_get_SSL_CTX(ssl), GetPeerSlot()));
}

} // namespace

TlsPeer::TlsPeer(Ref<const SSLContextImpl> context, std::string name, bool nameIsAddress)
    : _context(std::move(context))
    , _name(std::move(name))
    , _nameIsAddress(nameIsAddress)
{}

bool TlsPeer::Prepare(SSL_CTX* connection) noexcept
{
    // libcurl set most of this already; it stands here so that the safety of a connection does
    // not hang on options of another layer.
    SSL_CTX_set_verify(connection, SSL_VERIFY_PEER, nullptr);
    // libcurl writes the keys of all connections to the file that SSLKEYLOGFILE names.
    SSL_CTX_set_keylog_callback(connection, nullptr);
    SSL_CTX_set_session_cache_mode(connection, SSL_SESS_CACHE_CLIENT | SSL_SESS_CACHE_NO_INTERNAL);
    SSL_CTX_clear_options(connection, SSL_OP_NO_TICKET);
    SSL_CTX_set_options(connection, SSL_OP_NO_RENEGOTIATION);
    SSL_CTX_sess_set_new_cb(connection, &TlsPeer::OnNewSession);
    SSL_CTX_set_info_callback(connection, &TlsPeer::OnHandshake);
    return SSL_CTX_set_min_proto_version(connection, TLS1_2_VERSION) == 1
           && SSL_CTX_set_ex_data(connection, GetPeerSlot(), this) == 1 && RequireName(connection)
           && _context->Apply(connection);
}

bool TlsPeer::RequireName(SSL_CTX* connection) const noexcept
{
    X509_VERIFY_PARAM* const rules = SSL_CTX_get0_param(connection);
    // A certificate that the host trusts is an anchor, self-signed or not.
    X509_VERIFY_PARAM_set_flags(rules, X509_V_FLAG_PARTIAL_CHAIN);
    // [RFC 9525 2]: the subject's common name is no name of a server.
    X509_VERIFY_PARAM_set_hostflags(
        rules, X509_CHECK_FLAG_NO_PARTIAL_WILDCARDS | X509_CHECK_FLAG_NEVER_CHECK_SUBJECT);
    return (_nameIsAddress ? X509_VERIFY_PARAM_set1_ip_asc(rules, _name.c_str())
                           : X509_VERIFY_PARAM_set1_host(rules, _name.data(), _name.size()))
           == 1;
}

void TlsPeer::OnHandshake(const SSL* ssl, int where, int /*result*/)
{
    if ((where & SSL_CB_HANDSHAKE_START) == 0 || SSL_get_session(ssl) != nullptr) {
        return;
    }
    // The start of the handshake is the last moment at which a session can be offered, and the
    // only one at which libcurl lets us at the connection. The callback's const is historical.
    const SessionOwner session = GetPeer(ssl)->Take();
    if (session != nullptr) {
        SSL_set_session(const_cast<SSL*>(ssl), session.get());
    }
}

int TlsPeer::OnNewSession(SSL* ssl, SSL_SESSION* session)
{
    try {
        GetPeer(ssl)->Keep(SessionOwner(session));
    } catch (const std::bad_alloc&) {
        // The owner has freed it; the next connection makes a full handshake.
    }
    return 1; // the reference is ours
}

void TlsPeer::Keep(SessionOwner session)
{
    if (_sessions.size() == MaxSessions) {
        _sessions.erase(_sessions.begin());
    }
    _sessions.push_back(std::move(session));
}

TlsPeer::SessionOwner TlsPeer::Take()
{
    if (_sessions.empty()) {
        return nullptr;
    }
    SessionOwner session = std::move(_sessions.back());
    _sessions.pop_back();
    // A ticket that is used twice would let an observer link connections [RFC 8446 C.4], and
    // every TLS 1.3 handshake brings new ones. TLS 1.2 makes one for many.
    if (SSL_SESSION_get_protocol_version(session.get()) < TLS1_3_VERSION) {
        SSL_SESSION_up_ref(session.get());
        _sessions.emplace_back(session.get());
    }
    return session;
}

std::string DescribeVerifyResult(long result)
{
    return X509_verify_cert_error_string(result);
}

} // namespace Quillon::Ssl
