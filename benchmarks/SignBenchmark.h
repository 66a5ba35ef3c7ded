#pragma once

namespace Benchmarks {

/** Building and signing a request: `Own/Sign/certificate` beside `Floor/Sign/certificate`. */
void RegisterSignBenchmarks();

} // namespace Benchmarks
