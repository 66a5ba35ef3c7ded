#include "quillon/crypto/Sha256.h"

#include "crypto/Digest.h"

#include <algorithm>

namespace Quillon::Crypto {

Sha256Value Sha256(std::string_view bytes)
{
    Digest digest(HashAlgorithm::SHA256);
    digest.Update(bytes.data(), bytes.size());
    const DigestValue computed = digest.Finish();
    Sha256Value value{};
    std::copy_n(computed.bytes.begin(), value.size(), value.begin());
    return value;
}

} // namespace Quillon::Crypto
