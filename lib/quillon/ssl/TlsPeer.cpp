#include "ssl/TlsPeer.h"

#include <algorithm>
#include <memory>
#include <new>
#include <utility>

namespace Quillon::Ssl {

namespace {

/** Enough for a burst of connections; a server hands out two with each full handshake. */
constexpr std::size_t MaxSessions = 16;

/**
 * A slot of every `SSL_CTX`, made when there is a first need of it. If there is no memory for it,
 * the next look makes it. On the I/O thread.
 */
int GetSlot(int& slot, CRYPTO_EX_free* release) noexcept
{
    if (slot < 0) {
        slot = SSL_CTX_get_ex_new_index(0, nullptr, nullptr, nullptr, release);
    }
    return slot;
}

/** The slot of an `SSL_CTX` that points to its `TlsPeer`. */
int GetPeerSlot() noexcept
{
    static int slot = -1;
    return GetSlot(slot, nullptr);
}

void ReleaseRecord(
    void* /*owner*/, void* record, CRYPTO_EX_DATA* /*data*/, int /*slot*/, long, void*)
{
    delete static_cast<Ref<PeerRecord>*>(record);
}

/** The slot of an `SSL_CTX` that owns a reference to its `PeerRecord`. */
int GetRecordSlot() noexcept
{
    static int slot = -1;
    return GetSlot(slot, &ReleaseRecord);
}

bool AttachRecord(SSL_CTX* connection, const Ref<PeerRecord>& record) noexcept
{
    std::unique_ptr<Ref<PeerRecord>> owned(new (std::nothrow) Ref<PeerRecord>(record));
    if (owned == nullptr || SSL_CTX_set_ex_data(connection, GetRecordSlot(), owned.get()) != 1) {
        return false;
    }
    static_cast<void>(owned.release()); // goes with the connection
    return true;
}

/**
 * Up to TLS 1.2 an alert may be a warning, after which the connection goes on: what it says must
 * not stand for why we refuse the server. In TLS 1.3 every error is fatal [RFC 8446 6.2].
 */
void NoteAlert(const SSL* ssl, int alert)
{
    const bool isFatal = alert >> 8 == SSL3_AL_FATAL;
    const int code = alert & 0xFF;
    const Ref<PeerRecord> noted = GetRecord(ssl);
    if (code == SSL_AD_CLOSE_NOTIFY) {
        noted->isClosed = true;
    } else if (isFatal) {
        noted->alert = code;
    }
}

/** What cannot be decoded is left out: it is for people to look at. */
void NoteCertificates(const STACK_OF(X509) * shown, PeerRecord& record)
{
    for (int i = 0; i < sk_X509_num(shown); ++i) {
        unsigned char* bytes = nullptr;
        const int length = i2d_X509(sk_X509_value(shown, i), &bytes);
        const Crypto::OpenSslMemory<unsigned char> owner(bytes);
        try {
            record.certificates.push_back(
                Crypto::CreateCertificate(bytes, static_cast<std::size_t>(std::max(length, 0))));
        } catch (const std::exception&) { // NOLINT(bugprone-empty-catch): see above
        }
    }
}

void NoteParameters(const SSL* ssl, PeerRecord& record) noexcept
{
    record.isResumed = SSL_session_reused(ssl) == 1;
    try {
        record.version = SSL_get_version(ssl);
        record.cipher = SSL_get_cipher_name(ssl);
    } catch (const std::bad_alloc&) { // NOLINT(bugprone-empty-catch): for people to look at
    }
}

/** Looks on while OpenSSL verifies, and changes nothing: a chain that is refused is gone later. */
int OnVerify(int isAccepted, X509_STORE_CTX* verification)
{
    const auto* const ssl = static_cast<const SSL*>(
        X509_STORE_CTX_get_ex_data(verification, SSL_get_ex_data_X509_STORE_CTX_idx()));
    const Ref<PeerRecord> record = GetRecord(ssl);
    if (record->certificates.empty()) {
        NoteParameters(ssl, *record);
        NoteCertificates(X509_STORE_CTX_get0_untrusted(verification), *record);
    }
    return isAccepted;
}

/**
 * What OpenSSL's configuration, which the environment can name, says about security counts only
 * where it is stricter.
 */
void RequireSecurityLevel(SSL_CTX* connection) noexcept
{
    constexpr int Level = 2; // 112 bits: no RSA below 2048 bits, no SHA-1 in signatures
    SSL_CTX_set_security_level(connection, std::max(SSL_CTX_get_security_level(connection), Level));
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
{
    _sessions.reserve(MaxSessions); // no exception must pass through OpenSSL
}

bool TlsPeer::Prepare(SSL_CTX* connection, const Ref<PeerRecord>& record) noexcept
{
    // libcurl set most of this already; it stands here so that the safety of a connection does
    // not hang on options of another layer.
    SSL_CTX_set_verify(connection, SSL_VERIFY_PEER, record->isObserved ? &OnVerify : nullptr);
    RequireSecurityLevel(connection);
    // libcurl writes the keys of all connections to the file that SSLKEYLOGFILE names.
    SSL_CTX_set_keylog_callback(connection, nullptr);
    SSL_CTX_set_session_cache_mode(connection, SSL_SESS_CACHE_CLIENT | SSL_SESS_CACHE_NO_INTERNAL);
    SSL_CTX_clear_options(connection, SSL_OP_NO_TICKET);
    SSL_CTX_set_options(connection, SSL_OP_NO_RENEGOTIATION);
    SSL_CTX_sess_set_new_cb(connection, &TlsPeer::OnNewSession);
    SSL_CTX_set_info_callback(connection, &TlsPeer::OnEvent);
    return SSL_CTX_set_min_proto_version(connection, TLS1_2_VERSION) == 1
           && SSL_CTX_set_ex_data(connection, GetPeerSlot(), this) == 1
           && AttachRecord(connection, record) && RequireName(connection)
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

void TlsPeer::OnEvent(const SSL* ssl, int where, int result)
{
    if ((where & SSL_CB_READ_ALERT) == SSL_CB_READ_ALERT) {
        NoteAlert(ssl, result);
    }
    if ((where & SSL_CB_HANDSHAKE_DONE) != 0 && GetRecord(ssl)->isObserved) {
        NoteParameters(ssl, *GetRecord(ssl));
    }
    if ((where & SSL_CB_HANDSHAKE_START) != 0 && SSL_get_session(ssl) == nullptr) {
        OfferSession(ssl);
    }
}

void TlsPeer::OfferSession(const SSL* ssl)
{
    // The start of the handshake is the last moment at which a session can be offered, and the
    // only one at which libcurl lets us at the connection. The callback's const is historical.
    const SessionOwner session = GetPeer(ssl)->Take();
    if (session != nullptr) {
        SSL_set_session(const_cast<SSL*>(ssl), session.get());
    }
}

int TlsPeer::OnNewSession(SSL* ssl, SSL_SESSION* session)
{
    GetPeer(ssl)->Keep(SessionOwner(session));
    return 1; // the reference is ours
}

void TlsPeer::Keep(SessionOwner session) noexcept
{
    if (_sessions.size() == MaxSessions) {
        _sessions.erase(_sessions.begin());
    }
    _sessions.push_back(std::move(session));
}

TlsPeer::SessionOwner TlsPeer::Take() noexcept
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

Ref<PeerRecord> GetRecord(const SSL* connection)
{
    const void* const slot = SSL_CTX_get_ex_data(SSL_get_SSL_CTX(connection), GetRecordSlot());
    return *static_cast<const Ref<PeerRecord>*>(slot);
}

std::string DescribeAlert(int code)
{
    switch (code) { // those that OpenSSL has no words for
    case SSL_AD_INAPPROPRIATE_FALLBACK:
        return "inappropriate fallback";
    case SSL_AD_MISSING_EXTENSION:
        return "missing extension";
    case SSL_AD_CERTIFICATE_REQUIRED:
        return "certificate required";
    default:
        return SSL_alert_desc_string_long(code);
    }
}

bool IsAboutCertificate(int code) noexcept
{
    switch (code) {
    case SSL_AD_NO_CERTIFICATE:
    case SSL_AD_BAD_CERTIFICATE:
    case SSL_AD_UNSUPPORTED_CERTIFICATE:
    case SSL_AD_CERTIFICATE_REVOKED:
    case SSL_AD_CERTIFICATE_EXPIRED:
    case SSL_AD_CERTIFICATE_UNKNOWN:
    case SSL_AD_UNKNOWN_CA:
    case SSL_AD_CERTIFICATE_REQUIRED:
        return true;
    default:
        return false;
    }
}

std::string DescribeVerifyResult(long result)
{
    return X509_verify_cert_error_string(result);
}

} // namespace Quillon::Ssl
