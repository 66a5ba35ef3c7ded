#pragma once

#include <string>

/** The two largest units of a duration, as in `4 min 58 s`. */
std::string DescribeDuration(long long microseconds);
