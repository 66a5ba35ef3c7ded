#ifndef DEVSTS_TOKEN_SERVICE_H
#define DEVSTS_TOKEN_SERVICE_H

#include "devsts/Assertion.h"
#include "devsts/Authentication.h"
#include "devsts/Clock.h"
#include "devsts/Messages.h"
#include "devsts/ReplayGuard.h"
#include "devsts/Request.h"
#include "devsts/Signing.h"
#include "devsts/State.h"
#include "devsts/Users.h"

namespace DevSts {

/**
 * Answers requests: Issue, Renew and Validate.
 *
 * Thread safety: any number of threads.
 */
class TokenService
{
public:
    /** `state` is borrowed. */
    TokenService(const State& state, Clock clock);

    /** Never throws but for lack of memory: whatever is wrong becomes a SOAP fault. */
    Reply Answer(const ReceivedRequest& received);

private:
    std::string Handle(const ReceivedRequest& received);
    std::string Issue(const Request& request, const Users& users, TimePoint now);
    std::string Renew(const Request& request, const Users& users, TimePoint now);
    std::string Validate(const Request& request, const Users& users, TimePoint now) const;
    Authentication Authenticate(const Users& users, TimePoint now);
    XmlDocument Sign(const Assertion& assertion) const;

    const State& _state;
    Clock _clock;
    Signer _signer;
    std::string _signingCertificateDer;
    ReplayGuard _guard;
};

} // namespace DevSts

#endif
