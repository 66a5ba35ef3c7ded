#pragma once

#include <string>

namespace DevSts {

/** The version of this program, and in a second line those of the libraries below. */
std::string DescribeVersions();

} // namespace DevSts
