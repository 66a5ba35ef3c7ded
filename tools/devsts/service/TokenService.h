#pragma once

#include "devsts/negotiation/Negotiator.h"
#include "devsts/security/ReplayGuard.h"
#include "devsts/security/Signing.h"
#include "devsts/service/Authentication.h"
#include "devsts/state/State.h"
#include "devsts/state/Users.h"
#include "devsts/token/Assertion.h"
#include "devsts/wire/Clock.h"
#include "devsts/wire/Messages.h"
#include "devsts/wire/Request.h"

namespace DevSts {

/**
 * Answers requests: Issue, also by negotiation, Renew and Validate.
 *
 * Thread safety: any number of threads.
 */
class TokenService
{
public:
    /** `state` is borrowed. @throws std::runtime_error  the keytab cannot be used. */
    TokenService(const State& state, Clock clock, const NegotiatorOptions& negotiation);

    /** Never throws but for lack of memory: whatever is wrong becomes a SOAP fault. */
    Reply Answer(const ReceivedRequest& received);

private:
    Reply Handle(const ReceivedRequest& received);
    std::string Issue(const Request& request, const Users& users, TimePoint now);
    Reply BeginNegotiation(const Request& request, const Users& users, TimePoint now);
    Reply ContinueNegotiation(
        const Request& request, const Headers& headers, const Users& users, TimePoint now);
    std::string AnswerLeg(const Negotiator::Step& step, const Users& users, TimePoint now);
    std::string Renew(const Request& request, const Users& users, TimePoint now);
    std::string Validate(const Request& request, const Users& users, TimePoint now) const;
    Authentication Authenticate(const Users& users, TimePoint now);
    XmlDocument Sign(const Assertion& assertion) const;

    const State& _state;
    Clock _clock;
    Signer _signer;
    std::string _signingCertificateDer;
    ReplayGuard _guard;
    Negotiator _negotiator;
};

} // namespace DevSts
