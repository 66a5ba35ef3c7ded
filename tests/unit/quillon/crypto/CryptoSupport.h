#pragma once

#include "quillon/crypto/PublicKey.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

// What the tests of keys and certificates share.
namespace Quillon::Crypto {

/** The path of a file of the test data, fit for a shell. */
std::string TestFile(const std::string& name);

std::string ReadTestFile(const std::string& name);

/** Runs the `openssl` program. @return its standard output without the last line break. */
std::string RunOpenSsl(const std::string& arguments);

/** The same date with `T` between day and time. */
std::string ReplaceBlank(std::string text);

/** The hexadecimal digits behind the last `=`, lower case, without colons. */
std::string ToPlainHex(const std::string& fingerprint);

/** A folder for the running test, deleted with it. */
class TemporaryFolder
{
public:
    TemporaryFolder();
    ~TemporaryFolder();
    TemporaryFolder(const TemporaryFolder&) = delete;
    TemporaryFolder& operator=(const TemporaryFolder&) = delete;

    std::string GetPath(const std::string& name) const { return _path + "/" + name; }
    void WriteFile(const std::string& name, const std::string& content) const;
    std::string ReadFile(const std::string& name) const;

private:
    std::string _path;
};

/** 2 GiB of zero bytes, which take no memory as long as nobody writes to them. */
class HugeText
{
public:
    HugeText();
    ~HugeText();
    HugeText(const HugeText&) = delete;
    HugeText& operator=(const HugeText&) = delete;

    std::string_view Get() const { return {static_cast<const char*>(_memory), Size}; }

private:
    static constexpr std::size_t Size = std::size_t{1} << 31U;
    void* _memory;
};

/** The message of the `CryptoException` that `action` raises; "accepted" if it does not. */
template <class Action>
std::string GetCryptoError(Action action)
{
    try {
        action();
    } catch (const CryptoException& error) {
        return error.what();
    }
    return "accepted";
}

} // namespace Quillon::Crypto
