#include "ssoClientRuntime/DelegatedTokensImpl.h"

#include "ssoClient/Exceptions.h"
#include "ssoClientRuntime/observing.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <algorithm>
#include <iterator>
#include <utility>

namespace SsoClient {

namespace {

// What an entry takes beside the texts: the token's other members, and nodes of list and index.
constexpr std::size_t EntryOverhead = 1024;

} // namespace

DelegatedTokensImpl::DelegatedTokensImpl(const DelegatedTokensOptions& options)
    : _options(options)
    , _environment(options.environment ? options.environment : GetProcessEnvironment())
{}

Moment DelegatedTokensImpl::GetNow() const
{
    return ReadClocks(*_environment);
}

boost::shared_ptr<const SamlToken> DelegatedTokensImpl::GetToken(
    const boost::shared_ptr<const SecurityTokenService>& service,
    const SamlToken& presented,
    const TokenSpec& spec)
{
    if (service == nullptr) {
        throw Quillon::InvalidArgumentException("there is no token service");
    }
    DelegationKey key(service, presented, spec);
    std::shared_future<Outcome> others;
    Token kept;
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        kept = Find(key);
        others = kept ? others : JoinOrBegin(key);
    }
    TellLookUp(_options.observer, "DelegatedTokens", kept || others.valid());
    if (kept) {
        return kept;
    }
    const Outcome outcome = others.valid() ? others.get() : Exchange(key, presented, spec);
    if (outcome.failure) {
        outcome.failure->Throw();
    }
    return outcome.token;
}

/** Invalid if nobody makes that exchange already, and the caller is to make it. */
std::shared_future<Outcome> DelegatedTokensImpl::JoinOrBegin(const DelegationKey& key)
{
    const auto flight = std::find_if(_flights.begin(), _flights.end(), [&](const auto& other) {
        return other->key == key && !other->isForgotten;
    });
    if (flight != _flights.end()) {
        ++_status.hits;
        return (*flight)->outcome;
    }
    ++_status.misses;
    _flights.push_back(std::make_shared<Flight>(key));
    return {};
}

Outcome DelegatedTokensImpl::Exchange(
    DelegationKey& key, const SamlToken& presented, const TokenSpec& spec)
{
    const Moment asked = GetNow();
    Outcome outcome = Try([&] { return key.GetService().AcquireTokenByToken(presented, spec); });
    Validity validity;
    if (outcome.token) {
        validity = ReadValidity(*outcome.token);
        const Moment now = GetNow();
        if (!MakeLease(asked, validity, Span()).Covers(now)) {
            outcome = {nullptr, MakeTooEarly(validity, now)};
        }
    }
    Lease lease = MakeLease(asked, validity, _options.minRemainingValidity);
    lease.wallUntil = std::min(lease.wallUntil, Span(presented.GetEndDate().GetUtcTime()));
    End(key, outcome, lease);
    return outcome;
}

void DelegatedTokensImpl::End(DelegationKey& key, const Outcome& outcome, const Lease& lease)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    const auto position = std::find_if(
        _flights.begin(), _flights.end(), [&](const auto& flight) { return &flight->key == &key; });
    const std::shared_ptr<Flight> flight = *position;
    _flights.erase(position);
    flight->promise.set_value(outcome);
    if (outcome.token && !flight->isForgotten && lease.Covers(GetNow())) {
        Keep(key, outcome.token, lease);
    }
}

DelegatedTokensImpl::Token DelegatedTokensImpl::Find(const DelegationKey& key)
{
    const auto [begin, end] = _index.equal_range(key.GetDigest());
    const auto found =
        std::find_if(begin, end, [&](const auto& row) { return row.second->key == key; });
    if (found == end) {
        return nullptr;
    }
    const auto entry = found->second;
    if (!entry->lease.Covers(GetNow())) {
        Remove(entry);
        return nullptr;
    }
    ++_status.hits;
    _entries.splice(_entries.begin(), _entries, entry);
    return entry->token;
}

/** Takes the key over. */
void DelegatedTokensImpl::Keep(DelegationKey& key, const Token& token, const Lease& lease)
{
    const std::size_t bytes = key.GetBytes() + token->ToXml().size() + EntryOverhead;
    if (bytes > _options.maxBytes || _options.maxEntries == 0) {
        return;
    }
    MakeRoom(bytes);
    const DelegationKey::Digest digest = key.GetDigest();
    _entries.push_front({std::move(key), token, lease, bytes});
    _status.bytes += bytes;
    try {
        _index.emplace(digest, _entries.begin());
    } catch (...) { // an entry that nobody finds would stay for ever
        _status.bytes -= bytes;
        _entries.pop_front();
        throw;
    }
}

void DelegatedTokensImpl::MakeRoom(std::size_t bytes)
{
    while (_entries.size() >= _options.maxEntries || _status.bytes + bytes > _options.maxBytes) {
        Remove(std::prev(_entries.end()));
        ++_status.evicted;
    }
}

void DelegatedTokensImpl::Remove(Entries::iterator entry)
{
    const auto [begin, end] = _index.equal_range(entry->key.GetDigest());
    _index.erase(std::find_if(begin, end, [&](const auto& row) { return row.second == entry; }));
    _status.bytes -= entry->bytes;
    _entries.erase(entry);
}

template <class Predicate>
void DelegatedTokensImpl::RemoveIf(const Predicate& predicate)
{
    for (auto entry = _entries.begin(); entry != _entries.end();) {
        const auto next = std::next(entry);
        if (predicate(*entry)) {
            Remove(entry);
        }
        entry = next;
    }
}

void DelegatedTokensImpl::Invalidate(const std::string& tokenId)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    RemoveIf([&](const Entry& entry) { return entry.token->GetId() == tokenId; });
}

void DelegatedTokensImpl::Forget(const SamlToken& presented)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    RemoveIf([&](const Entry& entry) { return entry.key.IsAbout(presented); });
    for (const auto& flight : _flights) {
        flight->isForgotten = flight->isForgotten || flight->key.IsAbout(presented);
    }
}

void DelegatedTokensImpl::Clear()
{
    const std::lock_guard<std::mutex> lock(_mutex);
    RemoveIf([](const Entry&) { return true; });
    for (const auto& flight : _flights) {
        flight->isForgotten = true;
    }
}

DelegatedTokensStatus DelegatedTokensImpl::GetStatus() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    DelegatedTokensStatus status = _status;
    status.entries = _entries.size();
    status.underWay = _flights.size();
    return status;
}

boost::shared_ptr<DelegatedTokens> CreateDelegatedTokens(const DelegatedTokensOptions& options)
{
    if (options.minRemainingValidity < std::chrono::milliseconds(0)) {
        throw Quillon::InvalidArgumentException("the remaining validity asked for is negative");
    }
    return boost::make_shared<DelegatedTokensImpl>(options);
}

} // namespace SsoClient
