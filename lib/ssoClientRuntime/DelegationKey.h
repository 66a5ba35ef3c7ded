#pragma once

#include "quillon/Wiped.h"
#include "quillon/crypto/Sha256.h"
#include "ssoClient/SecurityTokenService.h"

#include <boost/smart_ptr/shared_ptr.hpp>

namespace SsoClient {

/**
 * Who wants what for which presented token, in full: the service object, which it keeps alive so
 * that its address means no other, every field of the spec, and the whole token. Wiped when it
 * goes.
 */
class DelegationKey
{
public:
    using Service = boost::shared_ptr<const SecurityTokenService>;
    using Digest = Quillon::Crypto::Sha256Value;

    DelegationKey(Service service, const SamlToken& presented, const TokenSpec& spec);

    const SecurityTokenService& GetService() const noexcept { return *_service; }
    const Digest& GetDigest() const noexcept { return _digest; }
    std::size_t GetBytes() const noexcept { return _text.Get().size(); }

    /** Whether it is about that token, whatever is wanted for it. */
    bool IsAbout(const SamlToken& presented) const;

    friend bool operator==(const DelegationKey& a, const DelegationKey& b)
    {
        return a._digest == b._digest && a._service == b._service && a._text.Get() == b._text.Get();
    }

private:
    Service _service;
    Quillon::Wiped _text; // the spec, and then the token
    std::size_t _specBytes = 0;
    Digest _digest{};
};

} // namespace SsoClient
