#pragma once

#include "quillon/crypto/Certificate.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/OperationObserver.h"
#include "ssoClientRuntime/Export.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <cstddef>
#include <cstdint>
#include <list>
#include <string>

namespace SsoClient {

/** What is kept of the tokens that were verified. */
struct TokenVerifierOptions
{
    /** See `CreateSamlToken`. */
    long long clockToleranceSec = DefaultClockToleranceSec;

    /** Beyond either, what was used least recently goes. 0: nothing is kept. */
    std::size_t maxEntries = 10'000;
    std::size_t maxBytes = std::size_t{64} * 1024 * 1024;

    /** Told of each hit and miss, on the thread that asks. Kept; null for none. */
    boost::shared_ptr<OperationObserver> observer;
};

struct TokenVerifierStatus
{
    std::size_t entries = 0;
    std::size_t bytes = 0; ///< of the entries, about

    std::uint64_t hits = 0;
    std::uint64_t misses = 0;  ///< verifications, whatever came of them
    std::uint64_t evicted = 0; ///< entries that went because there was no room
};

/**
 * Verifies tokens as `CreateSamlToken` does, and remembers the good ones: a relying party is shown
 * the same token with each request of a user.
 *
 * Only the same text, octet for octet, is the same token. It is looked up by a SHA-256 digest and
 * then compared in full. Its validity is judged anew each time, with the clock of the process;
 * other certificates make everything be verified again. What is refused is not remembered.
 *
 * There is no virtual destructor: it is only owned by the pointer of its factory.
 *
 * Thread safety: any number of threads, which verify side by side.
 */
class SSOCLIENT_RUNTIME_API TokenVerifier
{
public:
    /**
     * @return the verified token; the same object for the same text as long as it is remembered.
     * @throws Quillon::Exception  everything that `CreateSamlToken` throws, with its texts.
     */
    virtual boost::shared_ptr<const SamlToken> Verify(const std::string& xml) = 0;

    /**
     * Trusts these certificates, and no others, from now on. A verification that is under way may
     * still end with the earlier ones.
     *
     * @throws Quillon::InvalidArgumentException  a certificate is null.
     */
    virtual void SetTrustedCertificates(
        const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& certificates) = 0;

    virtual TokenVerifierStatus GetStatus() const = 0;

protected:
    ~TokenVerifier() = default;
};

/**
 * @param certificates  the certificates whose keys may have signed. With an empty list nothing
 *                      verifies.
 * @throws Quillon::InvalidArgumentException  a certificate is null.
 */
SSOCLIENT_RUNTIME_API boost::shared_ptr<TokenVerifier> CreateTokenVerifier(
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& certificates,
    const TokenVerifierOptions& options = TokenVerifierOptions());

} // namespace SsoClient
