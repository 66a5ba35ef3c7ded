#pragma once

#include "devsts/negotiation/Negotiations.h"
#include "devsts/wire/Messages.h"

#include <filesystem>

namespace DevSts {

struct NegotiatorOptions
{
    std::filesystem::path keytab;  ///< empty: every negotiation is refused
    std::filesystem::path replays; ///< remembers what was received
    std::size_t mostPending = 0;
    std::string cookieAttributes; ///< with a semicolon in front
};

/**
 * Takes the legs of SPNEGO negotiations. Each has a context that only its client knows, and a
 * cookie besides, as where several servers share the work and a negotiation stays with one.
 *
 * Thread safety: any number of threads.
 */
class Negotiator
{
public:
    /** @throws std::runtime_error  the keytab cannot be used. */
    explicit Negotiator(const NegotiatorOptions& options);

    struct Step
    {
        NegotiationLeg leg; ///< for the client; its bytes may be empty in the last one
        std::unique_ptr<Negotiation> complete; ///< null if the client has to go on
        std::string setCookie;                 ///< the header's value in the first step
    };

    /** @throws Fault */
    Step Begin(
        const std::string& leg,
        const TokenRequest& wanted,
        const std::optional<KeyProof>& proof,
        TimePoint now);

    /** `headers` are those of the request. @throws Fault */
    Step Continue(const NegotiationLeg& leg, const Headers& headers, TimePoint now);

private:
    const Acceptor& RequireAcceptor() const;
    Step Advance(std::unique_ptr<Negotiation> negotiation, const std::string& leg, TimePoint now);

    std::optional<Acceptor> _acceptor;
    std::string _cookieAttributes;
    Negotiations _pending;
};

} // namespace DevSts
