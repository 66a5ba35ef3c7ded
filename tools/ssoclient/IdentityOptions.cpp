#include "IdentityOptions.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "PrivateKeys.h"
#include "Secret.h"
#include "Trust.h"

#include "quillon/MessageFormatter.h"

#include <algorithm>
#include <array>
#include <random>

using Quillon::MessageFormatter;
using Quillon::Crypto::Certificate;
using Quillon::Crypto::PrivateKey;

namespace {

constexpr int MinRsaBits = 2048;

// The service would refuse the request, or, with a key that cannot sign at all, there would be
// none: either is known here already.
void RequireSigningKey(const PrivateKey& key)
{
    if (key.GetKeyType() != Quillon::Crypto::KeyType::RSA || key.GetBits() < MinRsaBits) {
        throw UsageError(MessageFormatter::ASPrint(
            "requests are signed with an RSA key of %1 bits or more, not with one of type %2",
            MinRsaBits,
            key.GetDescription()));
    }
}

bool IsKeyOf(const PrivateKey& key, const Certificate& certificate)
{
    constexpr auto Hash = Quillon::Crypto::HashAlgorithm::SHA256;
    std::array<unsigned char, Quillon::Crypto::GetDigestLength(Hash)> digest = {};
    std::random_device random;
    std::generate(
        digest.begin(), digest.end(), [&] { return static_cast<unsigned char>(random()); });
    const std::vector<unsigned char> signature = key.SignDigest(Hash, digest.data());
    return certificate.GetPublicKey().VerifyDigest(
        Hash, digest.data(), signature.data(), signature.size());
}

Quillon::Ref<const PrivateKey> ReadSigningKey(
    const IdentityOptions& options, const Certificate& certificate)
{
    try {
        Quillon::Ref<const PrivateKey> key =
            ReadPrivateKey(*options.key, KeyPassphrase, options.keyPassphraseFile);
        RequireSigningKey(*key);
        if (!IsKeyOf(*key, certificate)) {
            throw UsageError(MessageFormatter::ASPrint(
                "the private key is not that of the certificate in `%1'", options.certificateFile));
        }
        return key;
    } catch (const Quillon::Crypto::CryptoException& error) {
        ThrowKeyError(*options.key, error.what());
    }
}

struct AddedOptions
{
    Option key;
    Option certificate;
};

AddedOptions AddOptions(const Command& owner, IdentityOptions& options)
{
    const Command command = owner.InGroup("The caller's key");
    const AddedOptions added = {
        command
            .AddOption(
                "--key",
                options.key,
                "The caller's own private key: a PEM or DER file, or the URI of a key in an "
                "OpenSSL store (file:..., pkcs11:...)")
            .Check(CheckNotEmpty)
            .ValueName("KEY"),
        command
            .AddOption(
                "--cert",
                options.certificateFile,
                "PEM file whose first certificate is that of the key")
            .Check(CheckNotEmpty)
            .ValueName("PEM")};
    command
        .AddOption(
            "--key-passphrase-file",
            options.keyPassphraseFile,
            "File whose first line is the passphrase of an encrypted key, - for standard input "
            "(default: ask for it)")
        .Needs(added.key)
        .Check(CheckNotEmpty)
        .ValueName("FILE");
    return added;
}

} // namespace

void IdentityOptions::AddTo(const Command& command)
{
    const AddedOptions added = AddOptions(command, *this);
    added.key.Needs(added.certificate);
    added.certificate.Needs(added.key);
}

void IdentityOptions::AddRequiredTo(const Command& command)
{
    const AddedOptions added = AddOptions(command, *this);
    added.key.Required();
    added.certificate.Required();
}

boost::optional<SsoClient::HolderOfKeyConfig> IdentityOptions::Read() const
{
    if (!key) {
        return boost::none;
    }
    SsoClient::HolderOfKeyConfig identity;
    identity.certificate = ReadCertificates({certificateFile}).front();
    identity.privateKey = ReadSigningKey(*this, *identity.certificate);
    return identity;
}
