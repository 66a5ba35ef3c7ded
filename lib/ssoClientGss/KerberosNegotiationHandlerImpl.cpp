#include "ssoClientGss/KerberosNegotiationHandlerImpl.h"

#include "ssoClientGss/Exceptions.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <algorithm>
#include <array>
#include <utility>

namespace SsoClient::Gss {

namespace {

/** Far above any answer of a Kerberos service, which carries no authorization data. */
constexpr std::size_t MaxServerLegSize = 65536;

/**
 * A NegTokenResp with nothing but the state accept-completed [RFC 4178 4.2.2]: what is sent when
 * the negotiation has completed on this side and GSS has nothing to send.
 */
constexpr std::array<unsigned char, 9> AcceptCompleted{
    0xa1, 0x07, 0x30, 0x05, 0xa0, 0x03, 0x0a, 0x01, 0x00};

bool IsAcceptCompleted(const Leg& leg)
{
    return std::equal(leg.begin(), leg.end(), AcceptCompleted.begin(), AcceptCompleted.end());
}

boost::shared_ptr<Leg> MakeAcceptCompleted()
{
    return boost::make_shared<Leg>(AcceptCompleted.begin(), AcceptCompleted.end());
}

GssName ImportServiceName(const std::string& service)
{
    const gss_OID type = service.find('/') == std::string::npos ? GSS_C_NT_HOSTBASED_SERVICE
                                                                : GSS_KRB5_NT_PRINCIPAL_NAME;
    std::string text = service;
    gss_buffer_desc buffer{text.size(), text.data()};
    gss_name_t name = GSS_C_NO_NAME;
    OM_uint32 minor = 0;
    const OM_uint32 major = gss_import_name(&minor, &buffer, type, &name);
    if (GSS_ERROR(major)) {
        throw NegotiationException(
            "Cannot use the service name '" + service
            + "': " + GetGssError(major, minor, &spnegoMechanism));
    }
    return GssName(name);
}

} // namespace

KerberosNegotiationHandlerImpl::KerberosNegotiationHandlerImpl(
    const KerberosOptions& options, int maxLegs)
    : _options(options)
    , _maxLegs(maxLegs)
{}

boost::shared_ptr<Leg> KerberosNegotiationHandlerImpl::Negotiate(const Leg& serverLeg)
{
    // A failure ends the negotiation too: nothing that the service sends after it is looked at.
    const State state = std::exchange(_state, State::OVER);
    if (state == State::COMPLETE && IsAcceptCompleted(serverLeg)) {
        return MakeAcceptCompleted(); // the service says once that it agrees [RFC 4178 4.2.2]
    }
    CheckServerLeg(state, serverLeg);
    if (state == State::NEW) {
        _credentials.emplace(_options);
        _service = ImportServiceName(_options.service);
    }
    if (_legs++ == _maxLegs) {
        throw NegotiationException(
            "The negotiation with the service '" + _options.service + "' has no end after "
            + std::to_string(_maxLegs) + " legs");
    }
    return TakeStep(serverLeg);
}

void KerberosNegotiationHandlerImpl::CheckServerLeg(State state, const Leg& leg) const
{
    const std::string service = "the service '" + _options.service + "'";
    if (state == State::COMPLETE || state == State::OVER) {
        throw NegotiationException(
            "The negotiation with " + service + " is over; a handler serves only one");
    }
    if (state == State::NEW && !leg.empty()) {
        throw NegotiationException("The negotiation with " + service + " begins with an empty leg");
    }
    if (state == State::RUNNING && leg.empty()) {
        throw NegotiationException(
            "The negotiation with " + service + " is not complete, but its leg is empty");
    }
    if (leg.size() > MaxServerLegSize) {
        throw NegotiationException(
            "The leg of " + service + " has " + std::to_string(leg.size()) + " bytes; at most "
            + std::to_string(MaxServerLegSize) + " are accepted");
    }
}

boost::shared_ptr<Leg> KerberosNegotiationHandlerImpl::TakeStep(const Leg& serverLeg)
{
    GssBuffer output;
    OM_uint32 flags = 0;
    if (!AdvanceContext(serverLeg, output, flags)) {
        if (output.empty()) {
            throw NegotiationException(
                "The negotiation with the service '" + _options.service
                + "' is not complete, but there is no leg to send");
        }
        _state = State::RUNNING;
    } else if ((flags & GSS_C_MUTUAL_FLAG) == 0) {
        throw NegotiationException(
            "The negotiation with the service '" + _options.service
            + "' is complete, but the service has not authenticated itself");
    } else {
        _state = State::COMPLETE;
    }
    if (output.empty()) {
        return MakeAcceptCompleted();
    }
    return boost::make_shared<Leg>(output.begin(), output.end());
}

bool KerberosNegotiationHandlerImpl::AdvanceContext(
    Leg serverLeg, GssBuffer& output, OM_uint32& flags)
{
    gss_buffer_desc input{serverLeg.size(), serverLeg.data()};
    OM_uint32 minor = 0;
    gss_ctx_id_t context = _context.release();
    const bool isFirst = context == GSS_C_NO_CONTEXT;
    const OM_uint32 major = gss_init_sec_context(
        &minor,
        _credentials->Get(),
        &context,
        _service.get(),
        &spnegoMechanism,
        GSS_C_MUTUAL_FLAG | GSS_C_REPLAY_FLAG | GSS_C_SEQUENCE_FLAG,
        0,
        GSS_C_NO_CHANNEL_BINDINGS,
        &input,
        nullptr,
        output.Get(),
        &flags,
        nullptr);
    _context.reset(context);
    if (GSS_ERROR(major)) {
        throw NegotiationException(
            (isFirst ? "Cannot negotiate with the service '" + _options.service + "' using "
                           + DescribeCredentials(_options)
                     : "The leg of the service '" + _options.service + "' is not acceptable")
            + ": " + GetGssError(major, minor, &spnegoMechanism));
    }
    return (major & GSS_S_CONTINUE_NEEDED) == 0;
}

} // namespace SsoClient::Gss
