#include "CryptoSupport.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <stdexcept>

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

} // namespace Quillon::Crypto
