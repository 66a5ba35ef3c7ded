#include "fuzz/fuzzing.h"
#include "quillon/Exceptions.h"
#include "quillon/StringUtil.h"
#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"
#include "quillon/http/HttpURL.h"
#include "quillon/system/DateTime.h"

#include <vector>

// Small texts: what is read is what is written again.
namespace {

using Quillon::System::DateTime;

void ReadDate(const std::string& text)
{
    const DateTime date(text);
    Fuzzing::Require(DateTime(date.ToString()) == date, "another date: " + date.ToString());
}

void ReadBase64(const std::string& text)
{
    std::vector<unsigned char> bytes;
    Quillon::StringUtil::Base64Decode(text, bytes);
    std::string bare;
    for (const char character : text) {
        if (std::string_view(" \t\r\n").find(character) == std::string_view::npos) {
            bare += character;
        }
    }
    Fuzzing::Require(
        Quillon::StringUtil::Base64Encode(bytes) == bare, "two texts of one value: " + text);
}

void ReadUrl(const std::string& text)
{
    bool isHttps = false;
    std::string host;
    int port = 0;
    std::string path;
    Quillon::Http::ParseHttpURL(text, isHttps, host, port, path);
    Fuzzing::Require(!host.empty() && port > 0 && port < 65536 && path[0] == '/', "half a URL");
    for (const char character : host + path) {
        Fuzzing::Require(character > ' ' && character < '\x7f', "a URL that cannot be sent");
    }
}

void ReadCertificate(const std::string& text)
{
    const auto certificate = Quillon::Crypto::CreateCertificate(text.data(), text.size());
    const std::vector<unsigned char> encoded = certificate->GetEncoded();
    Fuzzing::Require(std::string(encoded.begin(), encoded.end()) == text, "another certificate");
    certificate->GetSubjectName();
    certificate->GetFingerprint();
    certificate->GetNotBefore();
    certificate->GetNotAfter();
}

void Read(unsigned kind, const std::string& text)
{
    switch (kind) {
    case 0:
        return ReadDate(text);
    case 1:
        return ReadBase64(text);
    case 2:
        return ReadUrl(text);
    case 3:
        return ReadCertificate(text);
    case 4:
        Quillon::Crypto::ParsePemCertificates(text);
        return;
    default:
        Quillon::Crypto::CreatePrivateKey(text);
    }
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    std::string_view input = Fuzzing::ToText(data, size);
    const unsigned kind = Fuzzing::TakeChoice(input) % 6;
    try {
        Read(kind, std::string(input));
    } catch (const Quillon::Exception&) {
        return 0;
    }
    return 0;
}
