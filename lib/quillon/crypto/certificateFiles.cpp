#include "quillon/crypto/Certificate.h"

#include "core/quote.h"
#include "system/systemError.h"

#include <cerrno>
#include <cstdio>
#include <memory>

namespace Quillon::Crypto {

namespace {

struct FileCloser
{
    void operator()(std::FILE* file) const noexcept { std::fclose(file); }
};
using FileOwner = std::unique_ptr<std::FILE, FileCloser>;

[[noreturn]] void Fail(const std::string& path, const std::string& reason)
{
    throw CryptoException("Cannot take certificates from " + Quote(path) + ": " + reason);
}

FileOwner Open(const std::string& path)
{
    const std::size_t end = path.find('\0');
    if (end != std::string::npos) {
        // The system would open what the part before it names.
        Fail(path.substr(0, end), "the name has a NUL character");
    }
    FileOwner file(std::fopen(path.c_str(), "rbe"));
    if (!file) {
        Fail(path, System::DescribeSystemError(errno));
    }
    return file;
}

std::string ReadFile(const std::string& path)
{
    const FileOwner file = Open(path);
    std::string text(MaxCertificateFileBytes + 1, '\0');
    text.resize(std::fread(text.data(), 1, text.size(), file.get()));
    if (std::ferror(file.get()) != 0) {
        Fail(path, System::DescribeSystemError(errno));
    }
    if (text.size() > MaxCertificateFileBytes) {
        Fail(path, "it is larger than " + std::to_string(MaxCertificateFileBytes) + " bytes");
    }
    return text;
}

} // namespace

std::list<Ref<const Certificate>> LoadPemCertificates(const std::string& path)
{
    const std::string pem = ReadFile(path);
    try {
        return ParsePemCertificates(pem);
    } catch (const CryptoException& error) {
        Fail(path, error.what());
    }
}

} // namespace Quillon::Crypto
