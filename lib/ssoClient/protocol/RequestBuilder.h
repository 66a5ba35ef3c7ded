#pragma once

#include "ssoClient/Leg.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/TokenSpec.h"
#include "ssoClient/protocol/Request.h"

#include <string>

namespace SsoClient {

/**
 * Turns one operation of the token service into the request to be sent. Arguments are checked
 * before anything is built, in the order in which the exceptions are listed. A failure may leave
 * the request's SOAP action set, but never its body.
 *
 * There is no virtual destructor: an object is only owned by a pointer of its own class.
 *
 * Thread safety: immutable; any number of threads.
 */
class RequestBuilder
{
public:
    /**
     * Signed if a holder-of-key token is asked for and is not delegated; unsigned otherwise.
     *
     * @throws Quillon::InvalidArgumentException  the lifetime is not positive.
     */
    virtual void BuildUserPassTokenRequest(
        const std::string& userName,
        const std::string& password,
        const TokenSpec& spec,
        Request& request) const = 0;

    /**
     * Begins a negotiation. Signed as a password request is.
     *
     * @throws Quillon::InvalidArgumentException  the lifetime is not positive.
     */
    virtual void BuildInitialSPNegoRequest(
        const TokenSpec& spec, const Leg& leg, Request& request) const = 0;

    /** Goes on with a negotiation, as a response to the service's response. Never signed. */
    virtual void BuildContinuedSPNegoRequest(
        const std::string& contextId, const Leg& leg, Request& request) const = 0;

    /**
     * Signed with the caller's own key.
     *
     * @throws Quillon::InvalidArgumentException  the lifetime is not positive.
     * @throws Quillon::InvalidStateException     there is no holder-of-key identity.
     * @throws Quillon::InvalidArgumentException  another confirmation than the default.
     */
    virtual void BuildCertificateTokenRequest(const TokenSpec& spec, Request& request) const = 0;

    /**
     * Signed with the caller's own key, which `token` vouches for.
     *
     * @throws Quillon::InvalidArgumentException  the lifetime is not positive.
     * @throws Quillon::InvalidStateException     there is no holder-of-key identity.
     */
    virtual void BuildExchangeTokenRequest(
        const SamlToken& token, const TokenSpec& spec, Request& request) const = 0;

    /** Never signed. */
    virtual void BuildValidateSubjectRequest(const SamlToken& token, Request& request) const = 0;

    /**
     * Signed with the caller's own key.
     *
     * @throws Quillon::InvalidArgumentException  the lifetime is not positive.
     * @throws Quillon::InvalidStateException     there is no holder-of-key identity.
     * @throws Quillon::InvalidArgumentException  the token is not holder-of-key.
     */
    virtual void BuildRenewRequest(
        const SamlToken& token, long long lifetimeSec, Request& request) const = 0;

protected:
    ~RequestBuilder() = default;
};

} // namespace SsoClient
