#ifndef DEVSTS_TOKEN_SERVICE_H
#define DEVSTS_TOKEN_SERVICE_H

#include "devsts/Assertion.h"
#include "devsts/Clock.h"
#include "devsts/Messages.h"
#include "devsts/Request.h"
#include "devsts/Signing.h"
#include "devsts/State.h"
#include "devsts/Users.h"

namespace DevSts {

/**
 * Decides what a request gets.
 *
 * Thread safety: any number of threads.
 */
class TokenService
{
public:
    /** `state` is borrowed. */
    TokenService(const State& state, Clock clock);

    /** Never throws but for lack of memory: whatever is wrong becomes a SOAP fault. */
    Reply Answer(const ReceivedRequest& received) const;

private:
    std::string Handle(const ReceivedRequest& received) const;
    std::string Issue(const Request& request, const Users& users, TimePoint now) const;

    const State& _state;
    Clock _clock;
    Signer _signer;
};

} // namespace DevSts

#endif
