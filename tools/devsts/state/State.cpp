#include "devsts/state/State.h"

#include "devsts/state/Users.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <fstream>
#include <iterator>
#include <openssl/x509v3.h>
#include <sstream>
#include <stdexcept>
#include <sys/stat.h>
#include <unistd.h>

namespace DevSts {

namespace fs = std::filesystem;

namespace {

constexpr mode_t PublicMode = 0644;
constexpr mode_t SecretMode = 0600;

[[noreturn]] void ThrowFileError(const fs::path& path)
{
    throw std::runtime_error(path.string() + ": " + std::strerror(errno));
}

// The mode is given on creation, so that a key is never readable by others, not even briefly.
void CreateFile(const fs::path& path, const std::string& text, mode_t mode)
{
    const int file = open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode);
    if (file < 0) {
        ThrowFileError(path);
    }
    const ssize_t written = write(file, text.data(), text.size());
    const bool complete = written == static_cast<ssize_t>(text.size());
    if (close(file) != 0 || !complete) {
        ThrowFileError(path);
    }
}

// Tells whether both files are there; one without the other is an accident to report.
bool PairExists(const fs::path& first, const fs::path& second)
{
    const bool hasFirst = fs::exists(first);
    if (hasFirst != fs::exists(second)) {
        const fs::path& present = hasFirst ? first : second;
        const fs::path& missing = hasFirst ? second : first;
        throw std::runtime_error(
            missing.string() + " is missing although " + present.string()
            + " is there: delete both to have them made anew");
    }
    return hasFirst;
}

void EnsureIdentity(
    const fs::path& dir,
    const std::string& name,
    const CertificateSpec& spec,
    PrivateKey (*generate)())
{
    const fs::path keyPath = dir / (name + ".key");
    const fs::path certificatePath = dir / (name + ".pem");
    if (PairExists(keyPath, certificatePath)) {
        return;
    }
    const PrivateKey key = generate();
    const Certificate certificate = MakeSelfSigned(spec, key.get());
    CreateFile(keyPath, ToPem(key.get()), SecretMode);
    CreateFile(certificatePath, ToPem(certificate.get()), PublicMode);
}

bool IsAddress(const std::string& host)
{
    ASN1_OCTET_STRING* address = a2i_IPADDRESS(host.c_str());
    ASN1_OCTET_STRING_free(address);
    return address != nullptr;
}

} // namespace

State::State(fs::path dir)
    : _dir(std::move(dir))
{
    if (fs::create_directories(_dir)) {
        fs::permissions(_dir, fs::perms::owner_all);
    }
    EnsureIdentity(_dir, "ca", {"SsoClient development CA", true}, GenerateEcKey);
    EnsureIdentity(_dir, "sts", {"SsoClient development STS"}, GenerateRsaKey);
    EnsureIdentity(_dir, "client", {"SsoClient development client"}, GenerateRsaKey);
    // Passwords stand in it.
    if (!fs::exists(_dir / "users.json")) {
        CreateFile(_dir / "users.json", SampleUsersFile(), SecretMode);
    }
    Users::Load(_dir);
    _signingKeyPem = ReadFile(_dir / "sts.key");
    _signingCertificatePem = ReadFile(_dir / "sts.pem");
}

State::TlsIdentity State::IssueTlsIdentity(const std::string& host) const
{
    const PrivateKey authorityKey = PrivateKeyFromPem(ReadFile(_dir / "ca.key"));
    const Certificate authority = CertificateFromPem(ReadFile(_dir / "ca.pem"));
    PrivateKey key = GenerateEcKey();
    Certificate certificate = MakeSigned(
        {"SsoClient development STS (TLS)", false, GetAlternativeNames(host)},
        key.get(),
        authority.get(),
        authorityKey.get());
    return {std::move(key), std::move(certificate)};
}

std::string State::GetAlternativeNames(const std::string& host)
{
    std::string names = "IP:127.0.0.1,IP:::1,DNS:localhost";
    if (host != "127.0.0.1" && host != "::1" && host != "localhost") {
        names += (IsAddress(host) ? ",IP:" : ",DNS:") + host;
    }
    return names;
}

std::string ReadFile(const fs::path& path)
{
    std::ifstream file(path, std::ios::binary);
    if (!file) {
        ThrowFileError(path);
    }
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

} // namespace DevSts
