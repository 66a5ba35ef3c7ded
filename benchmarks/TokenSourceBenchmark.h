#pragma once

namespace Benchmarks {

/** A good token of a source, beside what reading two clocks and copying a pointer costs. */
void RegisterTokenSourceBenchmarks();

} // namespace Benchmarks
