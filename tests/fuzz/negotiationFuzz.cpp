#include "fuzz/fuzzing.h"
#include "fuzz/scriptedConnection.h"
#include "quillon/Exceptions.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClientGss/Exceptions.h"
#include "ssoClientGss/KerberosNegotiationHandler.h"
#include "unit/ssoClientGss/Acceptor.h"

#include <algorithm>
#include <vector>

// A negotiation ends, whatever legs the service sends, and nobody without the service's key brings
// it to a good end: forged legs, the genuine one with octets changed, and legs out of replies of
// any shape.
namespace {

using SsoClient::Leg;
using Handler = SsoClient::NegotiationHandler;

/** More than any negotiation may take. */
constexpr int EndlessLegs = 40;

/** Says that the negotiation is complete [RFC 4178 4.2.2]. */
const Leg Completed{0xa1, 0x07, 0x30, 0x05, 0xa0, 0x03, 0x0a, 0x01, 0x00};

/** A realm in which Alice has a ticket. */
class FuzzedRealm
{
public:
    FuzzedRealm()
    {
        _kdc.LogOn("alice", _kdc.GetFile("alice"));
        MakeHandler()->Negotiate(Leg()); // fetches the ticket for the service, once for all
    }

    boost::shared_ptr<Handler> MakeHandler() const
    {
        SsoClient::Gss::KerberosOptions options;
        options.service = "HTTP@localhost";
        options.ccache = _kdc.GetFile("alice");
        return CreateKerberosNegotiationHandler(options);
    }

    /** What the service answers to the first leg. */
    Leg Answer(const Leg& first) const { return Acceptor(_kdc).Accept(first); }

private:
    Testing::TestKdc _kdc;
};

const FuzzedRealm& GetRealm()
{
    static const FuzzedRealm realm;
    return realm;
}

/** The next leg: an octet for its length, in which 255 stands for the rest, and itself. */
Leg TakeLeg(std::string_view& input)
{
    constexpr unsigned Rest = 255;
    const unsigned length = Fuzzing::TakeChoice(input);
    const std::size_t size =
        length == Rest ? input.size() : std::min<std::size_t>(length, input.size());
    const Leg leg(input.begin(), input.begin() + static_cast<std::ptrdiff_t>(size));
    input.remove_prefix(size);
    return leg;
}

void SendForgedLegs(Handler& handler, std::string_view input)
{
    for (int count = 0; !input.empty(); ++count) {
        Fuzzing::Require(count < EndlessLegs, "a negotiation without end");
        const auto answer = handler.Negotiate(TakeLeg(input));
        Fuzzing::Require(answer != nullptr, "no leg");
        Fuzzing::Require(*answer != Completed, "completed by somebody without the key");
    }
}

/** Changes octets of the genuine leg: each takes three of the input, for the place and the change.
 */
void SendChangedLeg(Handler& handler, Leg leg, std::string_view input)
{
    while (input.size() >= 3 && !leg.empty()) {
        const std::size_t high = Fuzzing::TakeChoice(input);
        const std::size_t place = (high * 256 + Fuzzing::TakeChoice(input)) % leg.size();
        leg[place] ^= static_cast<unsigned char>(Fuzzing::TakeChoice(input));
    }
    if (!input.empty()) {
        leg.resize(leg.size() * (Fuzzing::TakeChoice(input) + 1) / 256);
    }
    handler.Negotiate(leg);
}

/** Lets a service answer each leg with the same octets. */
void Acquire(Handler& handler, std::string_view body)
{
    const std::string reply = "HTTP/1.1 200 OK\r\n\r\n" + std::string(body);
    ScriptedConnection::Play(&reply);
    SsoClient::SecurityTokenServiceConfig config;
    config.url = "http://127.0.0.1/sts";
    SsoClient::TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    try {
        CreateSecurityTokenService(config)->AcquireTokenByGSS(spec, handler);
    } catch (...) {
        ScriptedConnection::Play(nullptr);
        throw;
    }
    Fuzzing::Require(false, "a token of nobody");
}

/** A failure ends a negotiation for good. */
void RequireOver(Handler& handler)
{
    try {
        handler.Negotiate(Leg{1});
    } catch (const SsoClient::Gss::NegotiationException& error) {
        const std::string text = error.what();
        Fuzzing::Require(text.find(" is over; ") != std::string::npos, "not over: " + text);
        return;
    }
    Fuzzing::Require(false, "goes on after a failure");
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    std::string_view input = Fuzzing::ToText(data, size);
    const unsigned kind = Fuzzing::TakeChoice(input) % 3;
    const auto handler = GetRealm().MakeHandler();
    try {
        if (kind == 0) {
            handler->Negotiate(Leg());
            SendForgedLegs(*handler, input);
        } else if (kind == 1) {
            SendChangedLeg(*handler, GetRealm().Answer(*handler->Negotiate(Leg())), input);
        } else {
            Acquire(*handler, input.substr(0, ScriptedConnection::LargestScript - 100));
        }
    } catch (const SsoClient::Gss::NegotiationException&) {
        RequireOver(*handler);
    } catch (const Quillon::Exception& error) {
        Fuzzing::Require(kind == 2 && error.what()[0] != '\0', "another exception");
    }
    return 0;
}
