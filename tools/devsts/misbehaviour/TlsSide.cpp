#include "devsts/misbehaviour/TlsSide.h"

#include "devsts/misbehaviour/Identities.h"
#include "devsts/misbehaviour/Script.h"

#include <map>
#include <new>
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <stdexcept>

namespace DevSts {

namespace {

void Require(bool isTaken, const char* what)
{
    ERR_clear_error();
    if (!isTaken) {
        throw std::runtime_error(std::string("OpenSSL does not take the ") + what);
    }
}

int GetVersion(const std::string& name)
{
    static const std::map<std::string, int> versions = {
        {"1.0", TLS1_VERSION},
        {"1.1", TLS1_1_VERSION},
        {"1.2", TLS1_2_VERSION},
        {"1.3", TLS1_3_VERSION}};
    return versions.at(name);
}

/** Judges the client's certificate as the faults say, whatever it is. */
int JudgeClient(int /*isAccepted*/, X509_STORE_CTX* verification)
{
    const auto* const ssl = static_cast<const SSL*>(
        X509_STORE_CTX_get_ex_data(verification, SSL_get_ex_data_X509_STORE_CTX_idx()));
    const auto* const faults =
        static_cast<const TlsFaults*>(SSL_CTX_get_app_data(SSL_get_SSL_CTX(ssl)));
    X509_STORE_CTX_set_error(verification, faults->verdict.value_or(X509_V_OK));
    return faults->verdict == X509_V_OK ? 1 : 0;
}

Tampering GetTampering(const Misbehaviour& misbehaviour)
{
    Tampering tampering;
    tampering.cutAt = misbehaviour.tls.cutsHandshake ? misbehaviour.parameter.value_or(0) : -1;
    tampering.changeAt =
        misbehaviour.tls.changesHandshake ? misbehaviour.parameter.value_or(0) : -1;
    return tampering;
}

} // namespace

TlsSide::TlsSide(const Misbehaviour& misbehaviour, const State& state, const std::string& host)
    : _faults(misbehaviour.tls)
    , _tampering(GetTampering(misbehaviour))
    , _context(SSL_CTX_new(TLS_server_method()))
{
    if (_context == nullptr) {
        throw std::bad_alloc();
    }
    SSL_CTX_set_security_level(_context.get(), 0); // it shows what nobody should accept
    SSL_CTX_set_session_id_context(
        _context.get(), reinterpret_cast<const unsigned char*>("devsts"), 6);
    ShowIdentity(state, host);
    SetVersions();
    if (_faults.verdict) {
        DemandCertificate();
    }
}

void TlsSide::ShowIdentity(const State& state, const std::string& host)
{
    const ShownIdentity identity = IssueIdentity(_faults.certificate, state, host);
    if (identity.chain.empty()) {
        return;
    }
    SSL_CTX* const context = _context.get();
    Require(
        SSL_CTX_use_certificate(context, identity.chain.front().get()) == 1
            && SSL_CTX_use_PrivateKey(context, identity.key.get()) == 1,
        "certificate");
    for (std::size_t i = 1; i < identity.chain.size(); ++i) {
        Require(SSL_CTX_add1_chain_cert(context, identity.chain[i].get()) == 1, "chain");
    }
}

void TlsSide::SetVersions()
{
    SSL_CTX* const context = _context.get();
    if (_faults.version.empty()) {
        SSL_CTX_set_min_proto_version(context, TLS1_2_VERSION);
    } else {
        const int version = GetVersion(_faults.version);
        SSL_CTX_set_min_proto_version(context, version);
        SSL_CTX_set_max_proto_version(context, version);
    }
    const std::string ciphers = _faults.ciphers.empty() ? "DEFAULT" : _faults.ciphers;
    Require(
        SSL_CTX_set_cipher_list(context, (ciphers + ":@SECLEVEL=0").c_str()) == 1, "cipher suites");
}

void TlsSide::DemandCertificate()
{
    SSL_CTX_set_app_data(_context.get(), const_cast<TlsFaults*>(&_faults));
    SSL_CTX_set_verify(
        _context.get(), SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, &JudgeClient);
}

std::unique_ptr<SecureChannel> TlsSide::Accept(int socket) const
{
    if (!_faults.instead.empty()) {
        Channel bare(socket);
        const ScriptHost nobody{{}, [] {}};
        Script(bare, nullptr, nobody, std::nullopt).Run(_faults.instead);
        return nullptr;
    }
    auto channel = std::make_unique<SecureChannel>(socket, _context.get(), _tampering);
    if (!channel->MakeHandshake()) {
        channel->Vanish();
        channel->Drain();
        return nullptr;
    }
    return channel;
}

} // namespace DevSts
