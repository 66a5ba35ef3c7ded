#pragma once

namespace Benchmarks {

/** Verifying bearer tokens of several sizes: `Own/Verify/SIZE` beside `Floor/Verify/SIZE`. */
void RegisterVerifyBenchmarks();

} // namespace Benchmarks
