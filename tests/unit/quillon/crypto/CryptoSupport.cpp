#include "CryptoSupport.h"

#include <sys/mman.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <system_error>

namespace Quillon::Crypto {

namespace {

struct PipeCloser
{
    void operator()(FILE* pipe) const noexcept { pclose(pipe); }
};

std::string ReadWholeFile(const std::string& path)
{
    std::ifstream file(path, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    if (!file) {
        throw std::runtime_error("Cannot read " + path);
    }
    return text.str();
}

} // namespace

std::string TestFile(const std::string& name)
{
    return std::string(TEST_DATA_DIR) + "/" + name;
}

std::string ReadTestFile(const std::string& name)
{
    return ReadWholeFile(TestFile(name));
}

std::string RunOpenSsl(const std::string& arguments)
{
    const std::unique_ptr<FILE, PipeCloser> pipe(
        popen(("openssl " + arguments + " 2>/dev/null").c_str(), "r"));
    std::string output;
    std::array<char, 4096> buffer{};
    std::size_t count = 0;
    while ((count = std::fread(buffer.data(), 1, buffer.size(), pipe.get())) > 0) {
        output.append(buffer.data(), count);
    }
    while (!output.empty() && output.back() == '\n') {
        output.pop_back();
    }
    return output;
}

std::string ReplaceBlank(std::string text)
{
    std::replace(text.begin(), text.end(), ' ', 'T');
    return text;
}

std::string ToPlainHex(const std::string& fingerprint)
{
    std::string hex;
    for (const char digit : fingerprint.substr(fingerprint.rfind('=') + 1)) {
        if (digit != ':') {
            hex += static_cast<char>(std::tolower(static_cast<unsigned char>(digit)));
        }
    }
    return hex;
}

TemporaryFolder::TemporaryFolder()
    : _path((std::filesystem::temp_directory_path() / "quillon-crypto-XXXXXX").string())
{
    if (mkdtemp(_path.data()) == nullptr) {
        throw std::runtime_error("Cannot make a temporary folder");
    }
}

TemporaryFolder::~TemporaryFolder()
{
    std::error_code ignored;
    std::filesystem::remove_all(_path, ignored);
}

void TemporaryFolder::WriteFile(const std::string& name, const std::string& content) const
{
    std::ofstream(GetPath(name), std::ios::binary) << content;
}

std::string TemporaryFolder::ReadFile(const std::string& name) const
{
    return ReadWholeFile(GetPath(name));
}

HugeText::HugeText()
    : _memory(mmap(nullptr, Size, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0))
{
    if (_memory == MAP_FAILED) {
        throw std::system_error(errno, std::generic_category(), "mmap");
    }
}

HugeText::~HugeText()
{
    munmap(_memory, Size);
}

} // namespace Quillon::Crypto
