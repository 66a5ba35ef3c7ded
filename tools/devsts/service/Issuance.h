#pragma once

#include "devsts/token/Sender.h"
#include "devsts/wire/Request.h"

// What a token says, given who asks for it.

namespace DevSts {

/**
 * A token for whoever logged on, or, if a token was presented, one derived from that:
 *
 *  - the delegation chain grows by `delegateTo`, and the count of further delegations shrinks;
 *  - it ends no later, and is renewable or delegable only if the presented one is;
 *  - its audience lies within the presented one's, and the advice is kept unless new is given.
 *
 * A holder-of-key token is bound to the key that signed the request, or to the known certificate
 * of the delegate.
 *
 * @throws Fault
 */
Assertion IssueAssertion(
    const Sender& sender, const TokenRequest& wanted, const Users& users, TimePoint now);

/** The same token again with a new lifetime and one renewal less. @throws Fault */
Assertion RenewAssertion(
    const Assertion& old,
    const KeyProof& proof,
    const Interval& lifetime,
    const Users& users,
    TimePoint now);

} // namespace DevSts
