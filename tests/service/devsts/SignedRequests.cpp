#include "SignedRequests.h"

#include "Harness.h"
#include "Requests.h"

#include <stdexcept>

namespace DevStsTests {

namespace {

std::string ReferenceTemplate(const std::string& id)
{
    return "<ds:Reference URI=\"#" + id
           + "\"><ds:Transforms>"
             "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
             "</ds:Transforms>"
             "<ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
             "<ds:DigestValue></ds:DigestValue></ds:Reference>";
}

std::string SignatureElement(const std::string& keyInfo)
{
    return std::string("<ds:Signature xmlns:ds=\"") + Ns::Ds
           + "\" Id=\"holderOfKeyProofSignature\"><ds:SignedInfo>"
             "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
             "<ds:SignatureMethod "
             "Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/>"
           + ReferenceTemplate("body-1") + ReferenceTemplate("timestamp-1")
           + "</ds:SignedInfo><ds:SignatureValue></ds:SignatureValue><ds:KeyInfo>" + keyInfo
           + "</ds:KeyInfo></ds:Signature>";
}

} // namespace

Identity Client()
{
    return {SharedState() / "client.key", SharedState() / "client.pem"};
}

Identity Stranger()
{
    static const TempDir dir;
    Identity identity{dir.Path() / "key.pem", dir.Path() / "certificate.pem"};
    if (!std::filesystem::exists(identity.certificate)) {
        const CommandResult result = RunCommand(
            std::string(OPENSSL_PROGRAM)
            + " req -x509 -newkey rsa:2048 -nodes -subj /CN=stranger -keyout "
            + identity.key.string() + " -out " + identity.certificate.string());
        EXPECT_EQ(result.exitCode, 0) << result.output;
    }
    return identity;
}

std::string Base64Of(const Identity& identity)
{
    const std::string pem = ReadText(identity.certificate);
    const std::string begin = "-----BEGIN CERTIFICATE-----";
    const std::size_t from = pem.find(begin) + begin.size();
    std::string text;
    for (const char character : pem.substr(from, pem.find("-----END") - from)) {
        if (character != '\n') {
            text += character;
        }
    }
    return text;
}

std::string BinaryToken(const Identity& identity)
{
    return "<wsse:BinarySecurityToken "
           "EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
           "oasis-200401-wss-soap-message-security-1.0#Base64Binary\" "
           "ValueType=\"http://docs.oasis-open.org/wss/2004/01/"
           "oasis-200401-wss-x509-token-profile-1.0#X509v3\" "
           "wsu:Id=\"holderOfKeyCertificate\" xmlns:wsu=\""
           + std::string(Ns::Wsu) + "\">" + Base64Of(identity) + "</wsse:BinarySecurityToken>";
}

std::string CertificateReference()
{
    return std::string("<wsse:SecurityTokenReference xmlns:wsse=\"") + Ns::Wsse
           + "\"><wsse:Reference URI=\"#holderOfKeyCertificate\" "
             "ValueType=\"http://docs.oasis-open.org/wss/2004/01/"
             "oasis-200401-wss-x509-token-profile-1.0#X509v3\"/></wsse:SecurityTokenReference>";
}

std::string SamlReference(const std::string& assertionId)
{
    return std::string("<wsse:SecurityTokenReference "
                       "wsse11:TokenType=\"http://docs.oasis-open.org/wss/"
                       "oasis-wss-saml-tokenprofile-1.1#SAMLV2.0\" xmlns:wsse=\"")
           + Ns::Wsse
           + "\" xmlns:wsse11=\"http://docs.oasis-open.org/wss/"
             "oasis-wss-wssecurity-secext-1.1.xsd\"><wsse:KeyIdentifier "
             "ValueType=\"http://docs.oasis-open.org/wss/"
             "oasis-wss-saml-token-profile-1.1#SAMLID\">"
           + assertionId + "</wsse:KeyIdentifier></wsse:SecurityTokenReference>";
}

std::string SignatureTemplate(
    const std::string& headerPart, const std::string& body, const std::string& keyInfo)
{
    const std::string envelope = Envelope(headerPart + SignatureElement(keyInfo), body);
    return Replaced(
        Replaced(envelope, "<wsu:Timestamp ", "<wsu:Timestamp wsu:Id=\"timestamp-1\" "),
        "<soapenv:Body ",
        std::string("<soapenv:Body wsu:Id=\"body-1\" xmlns:wsu=\"") + Ns::Wsu + "\" ");
}

std::string CertificateTemplate(
    const std::string& headerPart, const std::string& body, const Identity& identity)
{
    return SignatureTemplate(headerPart + BinaryToken(identity), body, CertificateReference());
}

std::string Sign(const std::string& text, const Identity& identity)
{
    const TempDir dir;
    const std::filesystem::path input = dir.Path() / "template.xml";
    const std::filesystem::path output = dir.Path() / "signed.xml";
    WriteText(input, text);
    // A token in the message has a signature of its own, which comes before this one.
    const CommandResult result = RunCommand(
        std::string(XMLSEC1_PROGRAM) + " --sign --privkey-pem " + identity.key.string()
        + " --id-attr:Id " + Ns::Soap + ":Body --id-attr:Id " + Ns::Wsu
        + ":Timestamp --node-xpath \"//*[@Id='holderOfKeyProofSignature']\" --output "
        + output.string() + " " + input.string());
    if (result.exitCode != 0) {
        throw std::runtime_error("xmlsec1 did not sign: " + result.output);
    }
    return ReadText(output);
}

} // namespace DevStsTests
