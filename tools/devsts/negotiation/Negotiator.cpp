#include "devsts/negotiation/Negotiator.h"

#include "devsts/security/Random.h"
#include "devsts/wire/Fault.h"

namespace DevSts {

namespace {

constexpr const char* CookieName = "devsts-negotiation";

// A UUID of version 4. [RFC4122 4.4]
std::string NewContext()
{
    std::string digits = RandomHex();
    digits[12] = '4';
    digits[16] = "89ab"[static_cast<unsigned char>(digits[16]) & 3U];
    return "urn:uuid:" + digits.substr(0, 8) + '-' + digits.substr(8, 4) + '-'
           + digits.substr(12, 4) + '-' + digits.substr(16, 4) + '-' + digits.substr(20);
}

// "a=b; c=d". [RFC6265 4.2.1]
void AddCookies(std::set<std::string>& values, const std::string& header)
{
    const std::string start = std::string(CookieName) + "=";
    std::size_t from = 0;
    while (from != std::string::npos) {
        const std::size_t end = header.find("; ", from);
        const std::string pair = header.substr(from, end - from);
        if (pair.compare(0, start.size(), start) == 0) {
            values.insert(pair.substr(start.size()));
        }
        from = end == std::string::npos ? end : end + 2;
    }
}

std::set<std::string> CookiesIn(const Headers& headers)
{
    std::set<std::string> values;
    const auto [first, last] = headers.equal_range("Cookie");
    for (auto header = first; header != last; ++header) {
        AddCookies(values, header->second);
    }
    return values;
}

std::optional<Acceptor> MakeAcceptor(const NegotiatorOptions& options)
{
    if (options.keytab.empty()) {
        return std::nullopt;
    }
    try {
        return Acceptor(options.keytab, options.replays);
    } catch (const GssError& error) {
        throw std::runtime_error(
            "The keytab " + options.keytab.string() + " cannot be used: " + error.what());
    }
}

} // namespace

Negotiator::Negotiator(const NegotiatorOptions& options)
    : _acceptor(MakeAcceptor(options))
    , _cookieAttributes(options.cookieAttributes)
    , _pending(options.mostPending)
{}

Negotiator::Step Negotiator::Begin(
    const std::string& leg,
    const TokenRequest& wanted,
    const std::optional<KeyProof>& proof,
    TimePoint now)
{
    RequireAcceptor();
    auto negotiation = std::make_unique<Negotiation>();
    negotiation->id = NewContext();
    negotiation->cookie = RandomHex();
    negotiation->begun = now;
    negotiation->wanted = wanted;
    negotiation->proof = proof;
    const std::string cookie = negotiation->cookie;
    Step step = Advance(std::move(negotiation), leg, now);
    step.setCookie = std::string(CookieName) + "=" + cookie + _cookieAttributes;
    return step;
}

Negotiator::Step Negotiator::Continue(
    const NegotiationLeg& leg, const Headers& headers, TimePoint now)
{
    RequireAcceptor();
    return Advance(_pending.Take(leg.context, CookiesIn(headers), now), leg.bytes, now);
}

const Acceptor& Negotiator::RequireAcceptor() const
{
    if (!_acceptor) {
        throw Fault(
            FaultCodes::InvalidRequest,
            "This token service negotiates only if it is started with --keytab");
    }
    return *_acceptor;
}

Negotiator::Step Negotiator::Advance(
    std::unique_ptr<Negotiation> negotiation, const std::string& leg, TimePoint now)
{
    Step step;
    step.leg.context = negotiation->id;
    try {
        step.leg.bytes = negotiation->context.Accept(*_acceptor, leg);
    } catch (const GssError& error) {
        throw Fault(
            FaultCodes::FailedAuthentication,
            std::string("The negotiation has failed: ") + error.what());
    }
    if (negotiation->context.IsComplete()) {
        step.complete = std::move(negotiation);
    } else {
        _pending.Put(std::move(negotiation), now);
    }
    return step;
}

} // namespace DevSts
