#include "quillon/xml/security/Signature.h"

#include <algorithm>

namespace Quillon::Xml::Security {

namespace {

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
            throw XmlSecurityException(
                "The signing certificate is not one of the " + std::to_string(_trusted.size())
                + " trusted certificates");
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
