#include "ssoClientRuntime/TokenVerifierImpl.h"

#include "quillon/Exceptions.h"
#include "quillon/system/Clock.h"
#include "ssoClientRuntime/observing.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <algorithm>
#include <iterator>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Certificates = std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>;

constexpr long long MicrosecondsPerSecond = 1'000'000;

/** More seconds than the calendar has. */
constexpr long long MaxToleranceSec = 400'000'000'000;

/** What an entry takes beside the text: the token's members, and nodes of list and index. */
constexpr std::size_t EntryOverhead = 2048;

/** How much of each end of a text is looked up by. */
constexpr std::size_t KeyEnd = 4096;

/**
 * The ends of a large text and its size tell valid tokens apart: ID, digest and signature stand in
 * the first. Texts that only differ in between meet in the comparison, of which there always is
 * one.
 */
Quillon::Crypto::Sha256Value MakeKey(const std::string& xml)
{
    if (xml.size() <= 2 * KeyEnd) {
        return Quillon::Crypto::Sha256(xml);
    }
    const std::string_view text = xml;
    std::string ends = std::to_string(xml.size());
    ends.append(text.substr(0, KeyEnd)).append(text.substr(text.size() - KeyEnd));
    return Quillon::Crypto::Sha256(ends);
}

std::shared_ptr<const Certificates> MakeTrust(const Certificates& certificates)
{
    if (std::find(certificates.begin(), certificates.end(), nullptr) != certificates.end()) {
        throw Quillon::InvalidArgumentException("A trusted certificate is null");
    }
    return std::make_shared<const Certificates>(certificates);
}

} // namespace

TokenVerifierImpl::TokenVerifierImpl(
    const Certificates& certificates, const TokenVerifierOptions& options)
    : _options(options)
    , _trust(MakeTrust(certificates))
{}

boost::shared_ptr<const SamlToken> TokenVerifierImpl::Verify(const std::string& xml)
{
    const Digest digest = MakeKey(xml);
    Trust trust;
    Token known = Find(digest, trust);
    if (known != nullptr && known->ToXml() == xml) {
        ++_hits;
        TellLookUp(_options.observer, "TokenVerifier", true);
        return known;
    }
    ++_misses;
    TellLookUp(_options.observer, "TokenVerifier", false);
    Entry entry = MakeEntry(digest, CreateSamlToken(xml, *trust, _options.clockToleranceSec));
    return Keep(std::move(entry), trust);
}

/**
 * What is known under that digest, and what is trusted. A token that is not valid at the moment is
 * verified again, so that the refusal is the usual one.
 */
TokenVerifierImpl::Token TokenVerifierImpl::Find(const Digest& digest, Trust& trust)
{
    const long long now = Quillon::System::GetUtcDateTime().GetUtcTime();
    const std::lock_guard<std::mutex> lock(_mutex);
    trust = _trust;
    const auto found = _index.find(digest);
    if (found == _index.end() || now < found->second->startUs || found->second->endUs <= now) {
        return nullptr;
    }
    _entries.splice(_entries.begin(), _entries, found->second);
    return found->second->token;
}

TokenVerifierImpl::Entry TokenVerifierImpl::MakeEntry(
    const Digest& digest, const Token& token) const
{
    const long long tolerance =
        std::clamp(_options.clockToleranceSec, -MaxToleranceSec, MaxToleranceSec)
        * MicrosecondsPerSecond;
    return {
        digest,
        token,
        token->GetStartDate().GetUtcTime() - tolerance,
        token->GetEndDate().GetUtcTime() + tolerance,
        token->ToXml().size() + EntryOverhead};
}

/** The object for the text: that of another thread, if it was sooner. */
TokenVerifierImpl::Token TokenVerifierImpl::Keep(Entry entry, const Trust& trust)
{
    Token token = entry.token;
    Entries gone; // after the lock
    const std::lock_guard<std::mutex> lock(_mutex);
    if (trust != _trust || entry.bytes > _options.maxBytes || _options.maxEntries == 0) {
        return token;
    }
    const auto present = _index.find(entry.digest);
    if (present != _index.end()) {
        if (present->second->token->ToXml() == token->ToXml()) {
            return present->second->token;
        }
        Remove(present->second, gone);
    }
    MakeRoom(entry.bytes, gone);
    Add(std::move(entry));
    return token;
}

void TokenVerifierImpl::MakeRoom(std::size_t bytes, Entries& gone)
{
    while (_entries.size() >= _options.maxEntries || _status.bytes + bytes > _options.maxBytes) {
        Remove(std::prev(_entries.end()), gone);
        ++_status.evicted;
    }
}

void TokenVerifierImpl::Add(Entry entry)
{
    _entries.push_front(std::move(entry));
    try {
        _index.emplace(_entries.front().digest, _entries.begin());
    } catch (...) { // an entry that nobody finds would stay for ever
        _entries.pop_front();
        throw;
    }
    _status.bytes += _entries.front().bytes;
}

void TokenVerifierImpl::Remove(Entries::iterator entry, Entries& gone)
{
    _status.bytes -= entry->bytes;
    _index.erase(entry->digest);
    gone.splice(gone.end(), _entries, entry);
}

void TokenVerifierImpl::SetTrustedCertificates(const Certificates& certificates)
{
    Trust trust = MakeTrust(certificates);
    Entries gone; // after the lock
    const std::lock_guard<std::mutex> lock(_mutex);
    _trust.swap(trust);
    _index.clear();
    gone.swap(_entries);
    _status.bytes = 0;
}

TokenVerifierStatus TokenVerifierImpl::GetStatus() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    TokenVerifierStatus status = _status;
    status.entries = _entries.size();
    status.hits = _hits;
    status.misses = _misses;
    return status;
}

boost::shared_ptr<TokenVerifier> CreateTokenVerifier(
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& certificates,
    const TokenVerifierOptions& options)
{
    return boost::make_shared<TokenVerifierImpl>(certificates, options);
}

} // namespace SsoClient
