#pragma once

#include "quillon/crypto/Certificate.h"
#include "ssoClient/SecurityTokenService.h"
#include "ssoClientRuntime/Export.h"
#include "ssoClientRuntime/TokenVerifier.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <chrono>
#include <list>
#include <string>

namespace SsoClient {

/**
 * Told what becomes of the certificates of a store, on the thread that has read them: the store's
 * own, or the one that calls `Reload`. It must not throw, nor call into the store.
 */
class SSOCLIENT_RUNTIME_API TrustObserver
{
public:
    virtual void OnAdded(const Quillon::Crypto::Certificate& certificate) noexcept;
    virtual void OnRemoved(const Quillon::Crypto::Certificate& certificate) noexcept;

    /** A certificate ends within the time of the options, or has ended. Told once. */
    virtual void OnExpiring(const Quillon::Crypto::Certificate& certificate) noexcept;

    /** The files cannot be used; what was trusted before still is. */
    virtual void OnReloadFailed(const std::string& reason) noexcept;

protected:
    TrustObserver() = default;
    TrustObserver(const TrustObserver&) = default;
    TrustObserver& operator=(const TrustObserver&) = default;
    ~TrustObserver() = default;
};

struct TrustStoreOptions
{
    /**
     * The files are read again at least that often, whatever the system says of them: some file
     * systems do not tell of changes. Positive.
     */
    std::chrono::milliseconds longestAge = std::chrono::minutes(5);

    /** How long before the end of a certificate `OnExpiring` is told; not negative. */
    std::chrono::hours expiryNotice = std::chrono::hours(24 * 30);

    /** Kept; null for none. */
    boost::shared_ptr<TrustObserver> observer;

    /** Whether a thread of the store's own follows changes. Without it there is only `Reload`. */
    bool followsChanges = true;
};

/**
 * The signing certificates of a token service, from a PEM file or a folder of them, read again when
 * they change. A folder's certificates are those of its files `*.pem`, `*.crt` and `*.cer`.
 *
 * A set is taken over whole or not at all: if a file cannot be read or decoded, or there is no
 * certificate, the last good set stays. Write a new file beside the old one and rename it; then
 * nobody reads half of it. Every change in the folder around a file has it read again, because it
 * may be reached by links there: let that folder not be a busy one.
 *
 * The store's thread ends with it, and takes no signals. A forked child has none; it still has the
 * set and `Reload`.
 *
 * There is no virtual destructor: it is only owned by the pointer of its factory.
 *
 * Thread safety: any number of threads.
 */
class SSOCLIENT_RUNTIME_API TrustStore
{
public:
    using Certificates = std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>;

    /** What is trusted now; never null, never empty, and not changed any more. */
    virtual boost::shared_ptr<const Certificates> Get() const = 0;

    /** Reads the files now. @return whether they could be used. */
    virtual bool Reload() = 0;

    /**
     * Has a verifier trust what the store has, now and after each change, as long as both live.
     *
     * @throws Quillon::InvalidArgumentException  the verifier is null.
     */
    virtual void Supply(const boost::shared_ptr<TokenVerifier>& verifier) = 0;

    /** Why the files could not be used the last time; empty if they could. */
    virtual std::string GetFailure() const = 0;

protected:
    ~TrustStore() = default;
};

/**
 * @param path  of a file or a folder.
 * @throws Quillon::Crypto::CryptoException   the files cannot be used.
 * @throws Quillon::InvalidArgumentException  the longest age is not positive, or the notice is
 *                                            negative.
 * @throws Quillon::InvalidStateException     there is no thread or descriptor to follow changes
 *                                            with.
 */
SSOCLIENT_RUNTIME_API boost::shared_ptr<TrustStore> CreateTrustStore(
    const std::string& path, const TrustStoreOptions& options = TrustStoreOptions());

/**
 * A service that shares everything with `service`, options included, but takes tokens that were
 * signed by what the store trusts at the moment: each operation has the set with which it begins.
 * It keeps the store alive. `WithOptions` takes the service that is given here, not the one that
 * comes of it.
 *
 * @throws Quillon::InvalidArgumentException  the store is null, or the service is null or not one
 *                                            that the library made.
 *
 * Thread safety: any number of threads.
 */
SSOCLIENT_RUNTIME_API boost::shared_ptr<SecurityTokenService> FollowTrust(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const boost::shared_ptr<const TrustStore>& trust);

} // namespace SsoClient
