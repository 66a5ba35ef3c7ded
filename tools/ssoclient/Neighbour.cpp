#include "Neighbour.h"

#include <algorithm>
#include <numeric>
#include <utility>

namespace {

constexpr std::size_t MinPart = 3;        // what is shorter is a part of too many names
constexpr std::size_t LettersPerSlip = 3; // so many letters, or a part of them, may hold one slip
constexpr std::size_t MaxTyped = 32;      // no name is longer by far

/** How many letters to insert, remove or replace to make one word the other (Levenshtein). */
std::size_t CountSlips(const std::string& one, const std::string& other)
{
    std::vector<std::size_t> row(other.size() + 1);
    std::iota(row.begin(), row.end(), 0);
    for (std::size_t i = 0; i < one.size(); ++i) {
        std::size_t diagonal = std::exchange(row[0], i + 1);
        for (std::size_t j = 0; j < other.size(); ++j) {
            const std::size_t replaced = diagonal + (one[i] == other[j] ? 0 : 1);
            diagonal = row[j + 1];
            row[j + 1] = std::min({replaced, diagonal + 1, row[j] + 1});
        }
    }
    return row.back();
}

} // namespace

std::string FindNeighbour(const std::string& typed, const std::vector<std::string>& names)
{
    if (typed.empty() || typed.size() > MaxTyped) {
        return "";
    }
    std::string nearest;
    std::size_t fewest = (typed.size() + LettersPerSlip - 1) / LettersPerSlip + 1;
    for (const std::string& name : names) {
        if (typed.size() >= MinPart && name.find(typed) != std::string::npos) {
            return name;
        }
        const std::size_t slips = CountSlips(typed, name);
        if (slips < fewest) {
            fewest = slips;
            nearest = name;
        }
    }
    return nearest;
}
