#pragma once

#include "quillon/crypto/Sha256.h"
#include "ssoClientRuntime/TokenVerifier.h"

#include <atomic>
#include <cstring>
#include <list>
#include <memory>
#include <mutex>
#include <unordered_map>

namespace SsoClient {

class TokenVerifierImpl final : public TokenVerifier
{
public:
    using Certificates = std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>;

    TokenVerifierImpl(const Certificates& certificates, const TokenVerifierOptions& options);

    boost::shared_ptr<const SamlToken> Verify(const std::string& xml) override;
    void SetTrustedCertificates(const Certificates& certificates) override;
    TokenVerifierStatus GetStatus() const override;

private:
    using Token = boost::shared_ptr<const SamlToken>;
    using Digest = Quillon::Crypto::Sha256Value;
    using Trust = std::shared_ptr<const Certificates>; // another object for every change

    struct Entry
    {
        Digest digest;
        Token token;
        long long startUs; // of its validity, the tolerance included
        long long endUs;
        std::size_t bytes;
    };
    using Entries = std::list<Entry>;

    struct DigestHash
    {
        /** The digest is as good as any hash of it. */
        std::size_t operator()(const Digest& digest) const noexcept
        {
            std::size_t hash = 0;
            std::memcpy(&hash, digest.data(), sizeof hash);
            return hash;
        }
    };

    Entry MakeEntry(const Digest& digest, const Token& token) const;
    Token Find(const Digest& digest, Trust& trust);
    Token Keep(Entry entry, const Trust& trust);

    // Called under the lock.
    void MakeRoom(std::size_t bytes, Entries& gone);
    void Add(Entry entry);
    void Remove(Entries::iterator entry, Entries& gone);

    const TokenVerifierOptions _options;

    mutable std::mutex _mutex;
    Trust _trust;
    Entries _entries; // the most recently used first
    std::unordered_map<Digest, Entries::iterator, DigestHash> _index;
    TokenVerifierStatus _status; // without the following
    std::atomic<std::uint64_t> _hits{0};
    std::atomic<std::uint64_t> _misses{0};
};

} // namespace SsoClient
