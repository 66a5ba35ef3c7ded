#pragma once

#include "ssoClient/OperationObserver.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClientRuntime/RuntimeEnvironment.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>

namespace SsoClient {

/** What is kept of the tokens that were exchanged. */
struct DelegatedTokensOptions
{
    /** Beyond either, what was used least recently goes. 0: nothing is kept. */
    std::size_t maxEntries = 10'000;
    std::size_t maxBytes = std::size_t{64} * 1024 * 1024;

    /** A token with less validity than this is not kept; not negative. */
    std::chrono::milliseconds minRemainingValidity = std::chrono::seconds(60);

    /** Null: the environment of the process. */
    boost::shared_ptr<RuntimeEnvironment> environment;

    /** Told of each hit and miss, on the thread that asks. Kept; null for none. */
    boost::shared_ptr<OperationObserver> observer;
};

struct DelegatedTokensStatus
{
    std::size_t entries = 0;
    std::size_t bytes = 0;    ///< of the entries, about
    std::size_t underWay = 0; ///< exchanges

    std::uint64_t hits = 0;    ///< answered with what was kept, or with somebody else's exchange
    std::uint64_t misses = 0;  ///< exchanges that were made
    std::uint64_t evicted = 0; ///< entries that went because there was no room
};

/**
 * Tokens for services that act for many users: each presented token is exchanged once, and the
 * result kept for as long as it, and the presented token, is valid.
 *
 * A token is given only to who presents the same text, letter for letter, to the same service
 * object with the same spec in each of its fields. That is looked up by a SHA-256 digest, and then
 * compared in full. A service object has one identity; so what one identity got is given to no
 * other. Make a service object once: another one with the same configuration is another service
 * here.
 *
 * What was kept of a presented token is overwritten when its entry goes. The token that was issued
 * for it belongs to whoever still holds it.
 *
 * There is no virtual destructor: it is only owned by the pointer of its factory.
 *
 * Thread safety: any number of threads. For each key there is one exchange at a time: others who
 * want the same wait for it, and share its outcome. Cost: about what the digest of the presented
 * token costs, if the token is there.
 */
class SSOCLIENT_RUNTIME_API DelegatedTokens
{
public:
    /**
     * The token that `service` issues for the presented one, as `AcquireTokenByToken` does.
     *
     * @return never null, and valid by this machine's clock.
     * @throws Quillon::InvalidArgumentException  the service is null.
     * @throws InvalidTokenException  the token that came is not valid by this machine's clock.
     * @throws Quillon::Exception     what the exchange fails with; nothing is kept of a failure.
     * What is no `Quillon::Exception` comes as an `SsoException`.
     */
    virtual boost::shared_ptr<const SamlToken> GetToken(
        const boost::shared_ptr<const SecurityTokenService>& service,
        const SamlToken& presented,
        const TokenSpec& spec) = 0;

    /** Gives the issued token with this ID to nobody any more. */
    virtual void Invalidate(const std::string& tokenId) = 0;

    /** Gives no more what was issued for a presented token: its user has logged off. */
    virtual void Forget(const SamlToken& presented) = 0;

    /** The same for everybody's. */
    virtual void Clear() = 0;

    virtual DelegatedTokensStatus GetStatus() const = 0;

protected:
    ~DelegatedTokens() = default;
};

/** @throws Quillon::InvalidArgumentException  the remaining validity is negative. */
SSOCLIENT_RUNTIME_API boost::shared_ptr<DelegatedTokens> CreateDelegatedTokens(
    const DelegatedTokensOptions& options = DelegatedTokensOptions());

} // namespace SsoClient
