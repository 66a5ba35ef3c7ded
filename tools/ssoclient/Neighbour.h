#pragma once

#include <string>
#include <vector>

/**
 * The one of `names` that was most likely meant by `typed`: one that has it as a part, or differs
 * in few letters. Empty if none is near.
 */
std::string FindNeighbour(const std::string& typed, const std::vector<std::string>& names);
