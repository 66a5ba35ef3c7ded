#include "fuzz/fuzzing.h"
#include "fuzz/xmlMutation.h"

#include <algorithm>

// Makes new inputs of documents by their structure, and now and then by their octets.

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t most);

std::size_t LLVMFuzzerCustomMutator(
    std::uint8_t* data, std::size_t size, std::size_t most, unsigned seed)
{
    constexpr unsigned OneOfEight = 8;
    std::string mutant;
    if (seed % OneOfEight != 0) {
        mutant = Fuzzing::MutateXml(std::string(Fuzzing::ToText(data, size)), seed / OneOfEight);
    }
    if (mutant.empty() || mutant.size() > most) {
        return LLVMFuzzerMutate(data, size, most);
    }
    std::copy(mutant.begin(), mutant.end(), data);
    return mutant.size();
}
