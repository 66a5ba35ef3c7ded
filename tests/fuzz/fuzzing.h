#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>

/** One run of a target. What it promises is checked by `Require`; it must never end otherwise. */
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

/**
 * Makes another input of one in place, of at most `most` octets. A target may have one, and has
 * libFuzzer's without.
 */
extern "C" std::size_t LLVMFuzzerCustomMutator(
    std::uint8_t* data, std::size_t size, std::size_t most, unsigned seed);

namespace Fuzzing {

inline std::string_view ToText(const std::uint8_t* data, std::size_t size)
{
    return {reinterpret_cast<const char*>(data), size};
}

/** Ends the program, which is what a fuzzer takes for a finding. */
inline void Require(bool holds, const std::string& what)
{
    if (!holds) {
        std::fprintf(stderr, "%s\n", what.c_str());
        std::abort();
    }
}

/** Takes the first octet off, for a choice; 0 if there is none. */
inline unsigned TakeChoice(std::string_view& input)
{
    if (input.empty()) {
        return 0;
    }
    const auto choice = static_cast<unsigned char>(input.front());
    input.remove_prefix(1);
    return choice;
}

} // namespace Fuzzing
