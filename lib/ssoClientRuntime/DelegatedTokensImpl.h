#pragma once

#include "ssoClientRuntime/DelegatedTokens.h"
#include "ssoClientRuntime/DelegationKey.h"
#include "ssoClientRuntime/Moment.h"
#include "ssoClientRuntime/attempts.h"

#include <cstring>
#include <future>
#include <list>
#include <memory>
#include <mutex>
#include <unordered_map>

namespace SsoClient {

class DelegatedTokensImpl final : public DelegatedTokens
{
public:
    explicit DelegatedTokensImpl(const DelegatedTokensOptions& options);

    boost::shared_ptr<const SamlToken> GetToken(
        const boost::shared_ptr<const SecurityTokenService>& service,
        const SamlToken& presented,
        const TokenSpec& spec) override;
    void Invalidate(const std::string& tokenId) override;
    void Forget(const SamlToken& presented) override;
    void Clear() override;
    DelegatedTokensStatus GetStatus() const override;

private:
    using Token = boost::shared_ptr<const SamlToken>;

    struct Entry
    {
        DelegationKey key;
        Token token;
        Lease lease;
        std::size_t bytes;
    };
    using Entries = std::list<Entry>;

    /** An exchange that is under way. */
    struct Flight
    {
        explicit Flight(const DelegationKey& theKey)
            : key(theKey)
        {}

        const DelegationKey& key; ///< of the thread that makes the exchange
        std::promise<Outcome> promise;
        std::shared_future<Outcome> outcome = promise.get_future().share();
        bool isForgotten = false; ///< its token is not to be kept
    };

    struct DigestHash
    {
        /** The digest is as good as any hash of it. */
        std::size_t operator()(const DelegationKey::Digest& digest) const noexcept
        {
            std::size_t hash = 0;
            std::memcpy(&hash, digest.data(), sizeof hash);
            return hash;
        }
    };

    Moment GetNow() const;
    Outcome Exchange(DelegationKey& key, const SamlToken& presented, const TokenSpec& spec);
    void End(DelegationKey& key, const Outcome& outcome, const Lease& lease);

    // Called under the lock.
    Token Find(const DelegationKey& key);
    std::shared_future<Outcome> JoinOrBegin(const DelegationKey& key);
    void Keep(DelegationKey& key, const Token& token, const Lease& lease);
    void MakeRoom(std::size_t bytes);
    void Remove(Entries::iterator entry);
    template <class Predicate>
    void RemoveIf(const Predicate& predicate);

    const DelegatedTokensOptions _options;
    const boost::shared_ptr<RuntimeEnvironment> _environment;

    mutable std::mutex _mutex;
    Entries _entries; // the most recently used first
    std::unordered_multimap<DelegationKey::Digest, Entries::iterator, DigestHash> _index;
    std::list<std::shared_ptr<Flight>> _flights;
    DelegatedTokensStatus _status;
};

} // namespace SsoClient
