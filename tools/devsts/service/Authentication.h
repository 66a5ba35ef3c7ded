#pragma once

#include "devsts/security/MessageSignature.h"
#include "devsts/security/ReplayGuard.h"
#include "devsts/token/Sender.h"
#include "devsts/wire/Request.h"

#include <optional>
#include <string>

namespace DevSts {

/** Finds out who sent a request. Borrows all it is given. */
class Authentication
{
public:
    Authentication(
        const Users& users,
        const std::string& signingCertificateDer,
        ReplayGuard& guard,
        TimePoint now)
        : _users(users)
        , _signingCertificateDer(signingCertificateDer)
        , _guard(guard)
        , _now(now)
    {}

    /** @throws Fault  the message is not fresh. */
    void RequireFresh(const Request& request) const;

    /**
     * The sender of an Issue request: by password, by presented token, or by certificate.
     *
     * @throws Fault
     */
    Sender Identify(const Request& request) const;

    /**
     * The key behind the first request of a negotiation, if it is signed.
     *
     * @throws Fault  it carries credentials besides its leg.
     */
    std::optional<KeyProof> ProveNegotiator(const Request& request) const;

    /**
     * The user who has negotiated as `principal`, NAME@REALM.
     *
     * @throws Fault  there is none.
     */
    Sender ByPrincipal(const std::string& principal, const std::optional<KeyProof>& proof) const;

    /** The key of a signed request that names a certificate in its header. @throws Fault */
    KeyProof ProveCertificate(const Request& request) const;

private:
    Sender ByPassword(const Request& request) const;
    Sender ByToken(const Request& request) const;
    Sender ByCertificate(const Request& request) const;
    Assertion ReadPresented(const Request& request) const;
    std::string PresenterCertificate(
        const MessageSignature& signature, const Assertion& presented) const;
    void RequireNew(const Request& request, const MessageSignature& signature) const;

    const Users& _users;
    const std::string& _signingCertificateDer;
    ReplayGuard& _guard;
    TimePoint _now;
};

} // namespace DevSts
