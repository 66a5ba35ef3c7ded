#pragma once

namespace Benchmarks {

/**
 * Acquisitions over HTTPS from a server of this process, over a kept connection. The floor is a raw
 * POST over a kept connection, and the verification of the token.
 */
void RegisterAcquireBenchmarks();

} // namespace Benchmarks
