#include "ExitCode.h"
#include "Files.h"
#include "PrivateKeys.h"
#include "Profile.h"
#include "Secret.h"
#include "Trust.h"
#include "fuzz/fuzzing.h"
#include "ssoClient/CreateSamlToken.h"

#include <cerrno>
#include <sys/mman.h>
#include <unistd.h>

// The files that the command line reads: whatever is in them, it takes them or says in one
// exception of its own why it does not.
namespace {

/** A file in memory, under a name. */
class MemoryFile
{
public:
    explicit MemoryFile(std::string_view text)
        : _descriptor(memfd_create("fuzz", MFD_CLOEXEC))
    {
        const ssize_t written = write(_descriptor, text.data(), text.size());
        Fuzzing::Require(written == static_cast<ssize_t>(text.size()), "cannot write a file");
    }
    ~MemoryFile() { close(_descriptor); }
    MemoryFile(const MemoryFile&) = delete;
    MemoryFile& operator=(const MemoryFile&) = delete;

    std::string GetPath() const { return "/proc/self/fd/" + std::to_string(_descriptor); }

private:
    const int _descriptor;
};

void ReadProfileFile(const std::string& text)
{
    const Profile profile = ParseProfile(text, "/etc/config.toml", "p");
    Fuzzing::Require(profile.name == "p", "another profile");
    for (const auto& [option, values] : profile.values) {
        Fuzzing::Require(!option.empty() && !values.empty(), "an option without a value");
    }
}

/** A password is the first line, and nothing that XML cannot hold. */
void ReadPasswordFile(const std::string& text)
{
    Quillon::Wiped password;
    GetPassword(MemoryFile(text).GetPath(), password);
    const std::string& read = password.Get();
    Fuzzing::Require(!read.empty(), "an empty password");
    Fuzzing::Require(text.compare(0, read.size(), read) == 0, "another password");
    Fuzzing::Require(read.find('\n') == std::string::npos, "a password of two lines");
}

void ReadTrustFile(const std::string& text)
{
    Fuzzing::Require(!ReadCertificates({MemoryFile(text).GetPath()}).empty(), "trust in nobody");
}

/** With a passphrase from a file, so that nobody is asked. */
void ReadKeyFile(const std::string& text)
{
    const MemoryFile passphrase("secret\n");
    ReadPrivateKey(MemoryFile(text).GetPath(), KeyPassphrase, passphrase.GetPath());
}

void ReadTokenFile(const std::string& text)
{
    Fuzzing::Require(ReadFile(MemoryFile(text).GetPath()) == text, "another text");
    SsoClient::CreateSamlToken(text, CertificateList(), 0);
}

void Read(unsigned kind, const std::string& text)
{
    switch (kind) {
    case 0:
        return ReadProfileFile(text);
    case 1:
        return ReadPasswordFile(text);
    case 2:
        return ReadTrustFile(text);
    case 3:
        return ReadKeyFile(text);
    default:
        return ReadTokenFile(text);
    }
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    std::string_view input = Fuzzing::ToText(data, size);
    const unsigned kind = Fuzzing::TakeChoice(input) % 5;
    try {
        Read(kind, std::string(input));
    } catch (const Quillon::Exception& error) {
        Fuzzing::Require(error.what()[0] != '\0', "an exception without a text");
    }
    return 0;
}
