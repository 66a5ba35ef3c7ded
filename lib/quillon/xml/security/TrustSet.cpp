#include "quillon/xml/security/Signature.h"

#include "core/quote.h"

#include <algorithm>

namespace Quillon::Xml::Security {

namespace {

/** Subject and fingerprint, by which people tell certificates apart. */
std::string Describe(const Ref<const Crypto::Certificate>& certificate)
{
    return Quote(certificate->GetSubjectName()) + " (SHA-256 " + certificate->GetFingerprint()
           + ")";
}

/** The same for bytes that a document calls a certificate. */
std::string Describe(const std::vector<unsigned char>& encoded)
{
    try {
        return Describe(Crypto::CreateCertificate(encoded.data(), encoded.size()));
    } catch (const Crypto::CryptoException&) {
        return std::to_string(encoded.size()) + " bytes that are no certificate";
    }
}

/** The first few of `items`: a document may hold many. */
template <class Items>
std::string DescribeFirst(const Items& items)
{
    constexpr std::size_t MaxDescribed = 4;
    std::string text;
    for (std::size_t i = 0; i < std::min(items.size(), MaxDescribed); ++i) {
        text += (i == 0 ? "" : ", ") + Describe(items[i]);
    }
    return items.size() <= MaxDescribed
               ? text
               : text + " and " + std::to_string(items.size() - MaxDescribed) + " more";
}

[[noreturn]] void ThrowUntrusted(
    const KeyInfo& keyInfo, const std::vector<Ref<const Crypto::Certificate>>& trusted)
{
    throw XmlSecurityException(
        "The signing certificate is not one of the " + std::to_string(trusted.size())
        + " trusted certificates; the signature names " + DescribeFirst(keyInfo.certificates)
        + "; trusted: " + DescribeFirst(trusted));
}

/** The whole of the trust decision for signing keys. */
class TrustSetKeyResolver final : public KeyInfoResolver
{
public:
    explicit TrustSetKeyResolver(std::vector<Ref<const Crypto::Certificate>> trusted)
        : _trusted(std::move(trusted))
    {}

    std::vector<Ref<const Crypto::Certificate>> Resolve(const KeyInfo& keyInfo) const override
    {
        if (_trusted.empty()) {
            throw XmlSecurityException("There are no trusted certificates");
        }
        if (keyInfo.certificates.empty()) {
            return _trusted;
        }
        std::vector<Ref<const Crypto::Certificate>> picked;
        for (const Ref<const Crypto::Certificate>& trusted : _trusted) {
            const auto& all = keyInfo.certificates;
            if (std::find(all.begin(), all.end(), trusted->GetEncoded()) != all.end()) {
                picked.push_back(trusted);
            }
        }
        if (picked.empty()) {
            ThrowUntrusted(keyInfo, _trusted);
        }
        return picked;
    }

private:
    std::vector<Ref<const Crypto::Certificate>> _trusted;
};

} // namespace

Ref<KeyInfoResolver> CreateTrustSetKeyResolver(
    const std::list<Ref<const Crypto::Certificate>>& trustedCertificates)
{
    if (std::find(trustedCertificates.begin(), trustedCertificates.end(), nullptr)
        != trustedCertificates.end()) {
        throw InvalidArgumentException("A trusted certificate is null");
    }
    return Ref<KeyInfoResolver>(
        new TrustSetKeyResolver({trustedCertificates.begin(), trustedCertificates.end()}));
}

} // namespace Quillon::Xml::Security
