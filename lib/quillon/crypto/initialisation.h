#pragma once

namespace Quillon::Crypto {

/**
 * Makes sure that OpenSSL has registered its clean-up with `atexit`, so that what is registered
 * afterwards runs before it.
 */
void InitialiseOpenSsl() noexcept;

} // namespace Quillon::Crypto
