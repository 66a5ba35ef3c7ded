#pragma once

#include "devsts/negotiation/Kerberos.h"
#include "devsts/token/Sender.h"
#include "devsts/wire/Clock.h"
#include "devsts/wire/Request.h"

#include <cstddef>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>

namespace DevSts {

/** One negotiation between its first request and its token. */
struct Negotiation
{
    std::string id;
    std::string cookie;
    TimePoint begun;
    SecurityContext context;
    TokenRequest wanted;
    std::optional<KeyProof> proof; ///< of the first request, the only one that may be signed
};

/**
 * The negotiations that wait for their client's next leg, bounded in number and in age. Each is
 * taken out for its next leg, and so takes one leg at a time; one that ends is not put back.
 *
 * Thread safety: any number of threads.
 */
class Negotiations
{
public:
    explicit Negotiations(std::size_t most)
        : _most(most)
    {}

    /** Keeps a negotiation until its next leg. @throws Fault  there are too many. */
    void Put(std::unique_ptr<Negotiation> negotiation, TimePoint now);

    /**
     * @param cookies  the values that the client sent; one of them belongs to the negotiation.
     * @throws Fault  there is no such negotiation, or it is not this client's; then it stays.
     */
    std::unique_ptr<Negotiation> Take(
        const std::string& id, const std::set<std::string>& cookies, TimePoint now);

private:
    void DropOld(TimePoint now);

    const std::size_t _most;
    std::mutex _mutex;
    std::map<std::string, std::unique_ptr<Negotiation>> _pending;
};

} // namespace DevSts
