#pragma once

#include <string>

namespace Benchmarks {

/** A file of the test data. @throws std::runtime_error if it cannot be read or is empty. */
std::string ReadFile(const std::string& name);

} // namespace Benchmarks
