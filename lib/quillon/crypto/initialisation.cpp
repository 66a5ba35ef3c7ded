#include "crypto/initialisation.h"

#include "crypto/OpenSsl.h"

namespace Quillon::Crypto {

void InitialiseOpenSsl() noexcept
{
    const ErrorQueueScope errors;
    // Without any option the call returns before it registers the clean-up; this one is cheap and
    // reads no configuration. It fails only after the clean-up, when there is nothing to be late
    // for.
    OPENSSL_init_crypto(OPENSSL_INIT_LOAD_CRYPTO_STRINGS, nullptr);
}

} // namespace Quillon::Crypto
