#pragma once

#include "devsts/misbehaviour/Channel.h"
#include "devsts/misbehaviour/Misbehaviour.h"
#include "devsts/state/State.h"

#include <memory>
#include <string>

namespace DevSts {

/** Makes the TLS of a misbehaving server. Thread safety: const; any number of threads. */
class TlsSide
{
public:
    /** @throws std::runtime_error  OpenSSL does not know what the faults ask for. */
    TlsSide(const Misbehaviour& misbehaviour, const State& state, const std::string& host);

    /** A channel over a connection that has just been accepted; null if there is no handshake. */
    std::unique_ptr<SecureChannel> Accept(int socket) const;

private:
    struct ContextDeleter
    {
        void operator()(SSL_CTX* context) const { SSL_CTX_free(context); }
    };

    void ShowIdentity(const State& state, const std::string& host);
    void SetVersions();
    void DemandCertificate();

    const TlsFaults _faults;
    Tampering _tampering;
    std::unique_ptr<SSL_CTX, ContextDeleter> _context;
};

} // namespace DevSts
