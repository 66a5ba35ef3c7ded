#include "ssoClientRuntime/TrustStoreImpl.h"

#include "quillon/Exceptions.h"
#include "quillon/system/Clock.h"
#include "quillon/system/SignalBlock.h"
#include "ssoClientRuntime/trustFiles.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <algorithm>
#include <system_error>
#include <utility>

namespace SsoClient {

namespace {

using Quillon::Crypto::Certificate;

/** A thousand years: times can be added to it. */
constexpr std::chrono::hours LongestNotice(24 * 365'250);

bool Has(const TrustStore::Certificates& certificates, const Certificate& wanted)
{
    return std::any_of(certificates.begin(), certificates.end(), [&](const auto& certificate) {
        return certificate->GetEncoded() == wanted.GetEncoded();
    });
}

bool AreSame(const TrustStore::Certificates& a, const TrustStore::Certificates& b)
{
    return std::equal(
        a.begin(), a.end(), b.begin(), b.end(), [](const auto& one, const auto& other) {
            return one->GetEncoded() == other->GetEncoded();
        });
}

/** A date that cannot be read is not judged: it plays no part in trust either. */
bool EndsBy(const Certificate& certificate, long long momentUs)
{
    try {
        return certificate.GetNotAfter().GetUtcTime() <= momentUs;
    } catch (const Quillon::Exception&) {
        return false;
    }
}

} // namespace

void TrustObserver::OnAdded(const Certificate& /*certificate*/) noexcept {}
void TrustObserver::OnRemoved(const Certificate& /*certificate*/) noexcept {}
void TrustObserver::OnExpiring(const Certificate& /*certificate*/) noexcept {}
void TrustObserver::OnReloadFailed(const std::string& /*reason*/) noexcept {}

TrustSet::TrustSet(const std::string& path, const TrustStoreOptions& options)
    : _path(path)
    , _options(options)
    , _certificates(boost::make_shared<const Certificates>())
{
    const std::lock_guard<std::mutex> lock(_reloading);
    TakeOver(ReadTrustFiles(_path));
}

boost::shared_ptr<const TrustStore::Certificates> TrustSet::Get() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return _certificates;
}

std::string TrustSet::GetFailure() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return _failure;
}

bool TrustSet::Reload()
{
    const std::lock_guard<std::mutex> lock(_reloading);
    try {
        TakeOver(ReadTrustFiles(_path));
        return true;
    } catch (const std::exception& error) {
        Fail(error.what());
        return false;
    }
}

void TrustSet::TakeOver(Certificates certificates)
{
    const auto before = Get();
    if (!AreSame(*before, certificates)) {
        const auto now = boost::make_shared<const Certificates>(std::move(certificates));
        Publish(now);
        TellDifference(*before, *now);
    }
    TellExpiring();
    const std::lock_guard<std::mutex> lock(_mutex);
    _failure.clear();
}

void TrustSet::Publish(const boost::shared_ptr<const Certificates>& certificates)
{
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _certificates = certificates;
    }
    for (const boost::weak_ptr<TokenVerifier>& listed : _verifiers) {
        if (const boost::shared_ptr<TokenVerifier> verifier = listed.lock()) {
            verifier->SetTrustedCertificates(*certificates);
        }
    }
}

void TrustSet::TellDifference(const Certificates& before, const Certificates& now) const
{
    if (_options.observer == nullptr) {
        return;
    }
    for (const auto& certificate : now) {
        if (!Has(before, *certificate)) {
            _options.observer->OnAdded(*certificate);
        }
    }
    for (const auto& certificate : before) {
        if (!Has(now, *certificate)) {
            _options.observer->OnRemoved(*certificate);
        }
    }
}

void TrustSet::TellExpiring()
{
    if (_options.observer == nullptr) {
        return;
    }
    const auto notice =
        std::chrono::microseconds(std::min(_options.expiryNotice, LongestNotice)).count();
    const long long moment = Quillon::System::GetUtcDateTime().GetUtcTime() + notice;
    const auto certificates = Get();
    for (const auto& certificate : *certificates) {
        if (EndsBy(*certificate, moment)
            && _toldOfExpiry.insert(certificate->GetFingerprint()).second) {
            _options.observer->OnExpiring(*certificate);
        }
    }
}

void TrustSet::Fail(const std::string& reason)
{
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _failure = reason;
    }
    if (_options.observer != nullptr) {
        _options.observer->OnReloadFailed(reason);
    }
}

void TrustSet::Supply(const boost::shared_ptr<TokenVerifier>& verifier)
{
    if (verifier == nullptr) {
        throw Quillon::InvalidArgumentException("There is no verifier.");
    }
    const std::lock_guard<std::mutex> lock(_reloading);
    _verifiers.erase(
        std::remove_if(
            _verifiers.begin(),
            _verifiers.end(),
            [](const auto& listed) { return listed.expired(); }),
        _verifiers.end());
    _verifiers.push_back(verifier);
    verifier->SetTrustedCertificates(*Get());
}

void TrustSet::Follow(Quillon::System::FileWatch& watch)
{
    do {
        // Looking begins before reading, so that no change falls between the two.
        watch.Begin();
        Reload();
    } while (watch.Wait(_options.longestAge) != Quillon::System::FileWatch::Outcome::STOPPED);
}

TrustStoreImpl::TrustStoreImpl(const std::string& path, const TrustStoreOptions& options)
    : _set(std::make_shared<TrustSet>(path, options))
{
    if (options.followsChanges) {
        StartThread(path);
    }
}

void TrustStoreImpl::StartThread(const std::string& path)
{
    _watch = std::make_shared<Quillon::System::FileWatch>(path);
    const Quillon::System::SignalBlock noSignals;
    try {
        _thread = std::thread([set = _set, watch = _watch] { set->Follow(*watch); });
    } catch (const std::system_error&) {
        throw Quillon::InvalidStateException(
            "There is no thread to follow changes of certificates with.");
    }
}

TrustStoreImpl::~TrustStoreImpl()
{
    if (!_thread.joinable()) {
        return;
    }
    const bool isOwn = _watch->IsOwn();
    if (isOwn) {
        _watch->Stop();
    }
    // An observer that lets go of the store is on its thread; a forked child does not have it.
    if (isOwn && _thread.get_id() != std::this_thread::get_id()) {
        _thread.join();
    } else {
        _thread.detach();
    }
}

boost::shared_ptr<TrustStore> CreateTrustStore(
    const std::string& path, const TrustStoreOptions& options)
{
    if (options.longestAge <= std::chrono::milliseconds(0)) {
        throw Quillon::InvalidArgumentException("The longest age of certificates is not positive.");
    }
    if (options.expiryNotice < std::chrono::hours(0)) {
        throw Quillon::InvalidArgumentException("The notice before an expiry is negative.");
    }
    return boost::make_shared<TrustStoreImpl>(path, options);
}

} // namespace SsoClient
