#pragma once

#include "devsts/security/Certificates.h"

#include <filesystem>
#include <string>

namespace DevSts {

/**
 * The state directory. What is missing is made on opening:
 *
 *   ca.pem, ca.key          the authority that signs the TLS certificate of each start
 *   sts.pem, sts.key        signs tokens (RSA-2048)
 *   client.pem, client.key  a client identity that users.json knows as a solution user
 *   users.json              the users
 *
 * Kerberos adds kerberos.replays, the authenticators that have been received.
 *
 * Keys have mode 0600.
 */
class State
{
public:
    /** @throws std::runtime_error  a file cannot be made or read, or half of a pair is missing. */
    explicit State(std::filesystem::path dir);

    const std::filesystem::path& Dir() const { return _dir; }
    const std::string& SigningKeyPem() const { return _signingKeyPem; }
    const std::string& SigningCertificatePem() const { return _signingCertificatePem; }

    struct TlsIdentity
    {
        PrivateKey key;
        Certificate certificate;
    };

    /** A new TLS certificate for loopback and for `host`, an address or a name. */
    TlsIdentity IssueTlsIdentity(const std::string& host) const;

    /** The names of such a certificate, in the syntax of openssl.cnf. */
    static std::string GetAlternativeNames(const std::string& host);

private:
    std::filesystem::path _dir;
    std::string _signingKeyPem;
    std::string _signingCertificatePem;
};

/** @throws std::runtime_error  names the file and the reason. */
std::string ReadFile(const std::filesystem::path& path);

} // namespace DevSts
