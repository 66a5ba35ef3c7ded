#include "Trust.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "Files.h"

#include "quillon/MessageFormatter.h"

namespace {

CertificateList ReadCertificateFile(const std::string& file)
{
    const std::string pem = ReadFile(file);
    try {
        return Quillon::Crypto::ParsePemCertificates(pem);
    } catch (const Quillon::Crypto::CryptoException& error) {
        throw UsageError(Quillon::MessageFormatter::ASPrint(
            "cannot take certificates from `%1': %2", file, error.what()));
    }
}

} // namespace

Option AddTrustTo(const Command& command, std::vector<std::string>& trustFiles)
{
    return command
        .AddOption(
            "--trust", trustFiles, "PEM files with the certificates that may have signed the token")
        .Check(CheckNotEmpty)
        .ValueName("PEM");
}

CertificateList ReadCertificates(const std::vector<std::string>& files)
{
    CertificateList certificates;
    for (const std::string& file : files) {
        certificates.splice(certificates.end(), ReadCertificateFile(file));
    }
    return certificates;
}
