#include "fuzz/fuzzing.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

// Runs a target over files and folders of files, where there is no fuzzer to do it, and where the
// target has a way of its own to change them, over a few mutants of each.

#pragma weak LLVMFuzzerCustomMutator

namespace {

constexpr unsigned MutantsOfEach = 12;

std::vector<std::filesystem::path> ListFiles(int count, char** names)
{
    std::vector<std::filesystem::path> files;
    for (int i = 1; i < count; ++i) {
        if (!std::filesystem::is_directory(names[i])) {
            files.emplace_back(names[i]);
            continue;
        }
        for (const auto& entry : std::filesystem::recursive_directory_iterator(names[i])) {
            if (entry.is_regular_file()) {
                files.push_back(entry.path());
            }
        }
    }
    std::sort(files.begin(), files.end());
    return files;
}

void Run(const std::string& input)
{
    LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(input.data()), input.size());
}

void RunMutants(const std::string& input)
{
    for (unsigned seed = 0; seed < MutantsOfEach; ++seed) {
        std::string mutant = input;
        mutant.resize(2 * input.size() + 4096);
        const std::size_t size = LLVMFuzzerCustomMutator(
            reinterpret_cast<std::uint8_t*>(mutant.data()), input.size(), mutant.size(), seed);
        Run(mutant.substr(0, size));
    }
}

} // namespace

/** In the place of libFuzzer's: changes one octet. */
extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t /*most*/)
{
    if (size > 0) {
        data[size / 2] ^= 1;
    }
    return size;
}

int main(int argc, char** argv)
{
    const std::vector<std::filesystem::path> files = ListFiles(argc, argv);
    for (const std::filesystem::path& path : files) {
        std::ifstream file(path, std::ios::binary);
        const std::string text{std::istreambuf_iterator<char>(file), {}};
        Fuzzing::Require(file.is_open(), "cannot read " + path.string());
        Run(text);
        if (LLVMFuzzerCustomMutator != nullptr) {
            RunMutants(text);
        }
    }
    std::printf("%zu inputs\n", files.size());
    return files.empty() ? 1 : 0;
}
