#pragma once

namespace Benchmarks {

/** Verifies tokens of growing size, which are large for different reasons. */
void RegisterGrowthBenchmarks();

} // namespace Benchmarks
