#pragma once

#include "quillon/system/FileWatch.h"
#include "ssoClientRuntime/TrustStore.h"

#include <boost/smart_ptr/weak_ptr.hpp>

#include <memory>
#include <mutex>
#include <set>
#include <thread>
#include <vector>

namespace SsoClient {

/** The set, and everything about it. The store's thread has a share in it. */
class TrustSet
{
public:
    using Certificates = TrustStore::Certificates;

    /** Reads the files for the first time. @throws Quillon::Crypto::CryptoException */
    TrustSet(const std::string& path, const TrustStoreOptions& options);

    boost::shared_ptr<const Certificates> Get() const;
    bool Reload();
    void Supply(const boost::shared_ptr<TokenVerifier>& verifier);
    std::string GetFailure() const;

    /** Reads the files whenever something changes, until the watch is stopped. */
    void Follow(Quillon::System::FileWatch& watch);

private:
    void TakeOver(Certificates certificates);
    void Publish(const boost::shared_ptr<const Certificates>& certificates);
    void TellDifference(const Certificates& before, const Certificates& now) const;
    void TellExpiring();
    void Fail(const std::string& reason);

    const std::string _path;
    const TrustStoreOptions _options;

    std::mutex _reloading;               // one at a time; guards the following
    std::set<std::string> _toldOfExpiry; // fingerprints
    std::vector<boost::weak_ptr<TokenVerifier>> _verifiers;

    mutable std::mutex _mutex; // guards the following, for a moment
    boost::shared_ptr<const Certificates> _certificates;
    std::string _failure;
};

class TrustStoreImpl final : public TrustStore
{
public:
    TrustStoreImpl(const std::string& path, const TrustStoreOptions& options);
    TrustStoreImpl(const TrustStoreImpl&) = delete;
    TrustStoreImpl& operator=(const TrustStoreImpl&) = delete;
    ~TrustStoreImpl();

    boost::shared_ptr<const Certificates> Get() const override { return _set->Get(); }
    bool Reload() override { return _set->Reload(); }
    void Supply(const boost::shared_ptr<TokenVerifier>& verifier) override
    {
        _set->Supply(verifier);
    }
    std::string GetFailure() const override { return _set->GetFailure(); }

private:
    void StartThread(const std::string& path);

    std::shared_ptr<TrustSet> _set;
    std::shared_ptr<Quillon::System::FileWatch> _watch; // null if changes are not followed
    std::thread _thread;
};

} // namespace SsoClient
