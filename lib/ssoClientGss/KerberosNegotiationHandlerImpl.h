#pragma once

#include "ssoClientGss/Credentials.h"
#include "ssoClientGss/Gssapi.h"
#include "ssoClientGss/KerberosNegotiationHandler.h"

#include <optional>
#include <string>

namespace SsoClient::Gss {

class KerberosNegotiationHandlerImpl : public NegotiationHandler
{
public:
    /** Kerberos needs two legs, and SPNEGO one more at most. */
    static constexpr int DefaultMaxLegs = 16;

    /**
     * @param options  checked, with a service name.
     * @param maxLegs  how many legs are made at most.
     */
    explicit KerberosNegotiationHandlerImpl(
        const KerberosOptions& options, int maxLegs = DefaultMaxLegs);

    boost::shared_ptr<Leg> Negotiate(const Leg& serverLeg) override;

private:
    enum class State
    {
        NEW,
        RUNNING,
        COMPLETE, // on this side
        OVER
    };

    void CheckServerLeg(State state, const Leg& leg) const;
    boost::shared_ptr<Leg> TakeStep(const Leg& serverLeg);
    /** @return true if the negotiation is complete. */
    bool AdvanceContext(Leg serverLeg, GssBuffer& output, OM_uint32& flags);

    const KerberosOptions _options;
    const int _maxLegs;
    int _legs = 0;
    State _state = State::NEW;
    std::optional<Credentials> _credentials;
    GssName _service;
    GssContext _context;
};

} // namespace SsoClient::Gss
