#pragma once

namespace Benchmarks {

/** Verifying tokens on two threads, beside verifying as many on one; by the wall clock. */
void RegisterThreadsBenchmarks();

} // namespace Benchmarks
