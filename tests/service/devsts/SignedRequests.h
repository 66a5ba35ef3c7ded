#pragma once

#include <filesystem>
#include <string>

// Requests written by hand and signed by xmlsec1.

namespace DevStsTests {

struct Identity
{
    std::filesystem::path key;
    std::filesystem::path certificate;
};

/** The client of the shared state, whom the STS knows as service@example.test. */
Identity Client();

/** Keys that the STS does not know, made by openssl. */
Identity Stranger();

/** The certificate's Base64 in one line. */
std::string Base64Of(const Identity& identity);

std::string BinaryToken(const Identity& identity);
std::string CertificateReference();
std::string SamlReference(const std::string& assertionId);

/** An envelope with a signature that has no values yet. */
std::string SignatureTemplate(
    const std::string& headerPart, const std::string& body, const std::string& keyInfo);

/** A template that names the certificate in the header. */
std::string CertificateTemplate(
    const std::string& headerPart, const std::string& body, const Identity& identity = Client());

/** `text` with its signature template filled in. */
std::string Sign(const std::string& text, const Identity& identity = Client());

constexpr const char* UseKey = "<wst:UseKey Sig=\"holderOfKeyProofSignature\"/>";

} // namespace DevStsTests
