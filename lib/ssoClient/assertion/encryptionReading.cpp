#include "ssoClient/assertion/encryptionReading.h"

#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/wireNames.h"

#include <algorithm>
#include <array>
#include <utility>

namespace SsoClient::GeneralReader {

using Quillon::Crypto::OaepHash;
using Quillon::Crypto::OaepHashes;

namespace {

/** The number of keys is bounded: each costs an operation with every private key. */
constexpr std::size_t MaxKeys = 16;

constexpr char EncryptedData[] = "EncryptedData";
constexpr char ElementType[] = "http://www.w3.org/2001/04/xmlenc#Element";
constexpr std::string_view CbcSuffix = "-cbc";

constexpr std::array<std::pair<std::string_view, std::size_t>, 3> ContentKeyLengths{{
    {"http://www.w3.org/2009/xmlenc11#aes128-gcm", 16},
    {"http://www.w3.org/2009/xmlenc11#aes192-gcm", 24},
    {"http://www.w3.org/2009/xmlenc11#aes256-gcm", 32},
}};

// [XMLENC11 5.5.2]: the older one has MGF1 on SHA-1, the newer one says what it is on. There is no
// PKCS #1 v1.5: whoever sees that its padding is wrong can decrypt by asking often.
constexpr std::string_view OaepMgf1p = "http://www.w3.org/2001/04/xmlenc#rsa-oaep-mgf1p";
constexpr std::string_view Oaep = "http://www.w3.org/2009/xmlenc11#rsa-oaep";

// [XMLENC11 5.8] writes SHA-384 otherwise than XML Signature, and producers write either.
constexpr std::array<std::pair<std::string_view, OaepHash>, 5> Digests{{
    {"http://www.w3.org/2000/09/xmldsig#sha1", OaepHash::SHA1},
    {"http://www.w3.org/2001/04/xmlenc#sha256", OaepHash::SHA256},
    {"http://www.w3.org/2001/04/xmlenc#sha384", OaepHash::SHA384},
    {"http://www.w3.org/2001/04/xmldsig-more#sha384", OaepHash::SHA384},
    {"http://www.w3.org/2001/04/xmlenc#sha512", OaepHash::SHA512},
}};

constexpr std::array<std::pair<std::string_view, OaepHash>, 4> Masks{{
    {"http://www.w3.org/2009/xmlenc11#mgf1sha1", OaepHash::SHA1},
    {"http://www.w3.org/2009/xmlenc11#mgf1sha256", OaepHash::SHA256},
    {"http://www.w3.org/2009/xmlenc11#mgf1sha384", OaepHash::SHA384},
    {"http://www.w3.org/2009/xmlenc11#mgf1sha512", OaepHash::SHA512},
}};

[[noreturn]] void ThrowNotAccepted(
    std::string_view algorithm, const ElementNode& element, const char* expected)
{
    throw ParseException(
        "Algorithm " + Quote(algorithm) + " of " + Describe(element) + " is not accepted, expected "
        + expected);
}

template <class Table>
auto Find(const Table& table, const ElementNode& element, const char* expected)
{
    const std::string algorithm = GetRequired(element, "Algorithm");
    const auto* found = std::find_if(table.begin(), table.end(), [&algorithm](const auto& known) {
        return known.first == algorithm;
    });
    if (found == table.end()) {
        ThrowNotAccepted(algorithm, element, expected);
    }
    return found->second;
}

bool EndsWith(std::string_view text, std::string_view end) noexcept
{
    return text.size() >= end.size() && text.substr(text.size() - end.size()) == end;
}

/**
 * CBC has no tag. Whoever may change the text and sees how it fails decrypts it octet by octet, and
 * a signature that is itself encrypted does not hinder that [XMLENC11 6.1.1].
 */
std::size_t ReadContentMethod(const ElementNode& element)
{
    CheckAttributeNames(element, {"Algorithm"});
    ElementCursor(element).RequireEnd();
    const std::string algorithm = GetRequired(element, "Algorithm");
    if (EndsWith(algorithm, CbcSuffix)) {
        ThrowNotAccepted(
            algorithm,
            element,
            "AES in GCM: without a signature around what is encrypted, CBC lets others decrypt it");
    }
    return Find(ContentKeyLengths, element, "AES in GCM");
}

OaepHash ReadHash(const ElementNode& element, bool isMask)
{
    CheckAttributeNames(element, {"Algorithm"});
    ElementCursor(element).RequireEnd();
    return isMask ? Find(Masks, element, "MGF1 with SHA-1 or SHA-2")
                  : Find(Digests, element, "SHA-1 or SHA-2");
}

/** [XMLENC11 5.5.2]: SHA-1 where nothing is said. A label would add nothing, and nobody has one. */
OaepHashes ReadKeyMethod(const ElementNode& element)
{
    CheckAttributeNames(element, {"Algorithm"});
    const std::string algorithm = GetRequired(element, "Algorithm");
    if (algorithm != OaepMgf1p && algorithm != Oaep) {
        ThrowNotAccepted(algorithm, element, "RSA-OAEP");
    }
    OaepHashes hashes{OaepHash::SHA1, OaepHash::SHA1};
    bool hasDigest = false;
    bool hasMask = false;
    for (ElementCursor child(element); child.Get() != nullptr;) {
        const ElementNode& parameter = child.TakeAny();
        if (!hasDigest && parameter.HasQName("DigestMethod", Wire::DsNamespace)) {
            hashes.digest = ReadHash(parameter, false);
            hasDigest = true;
        } else if (
            !hasMask && algorithm == Oaep && parameter.HasQName("MGF", Wire::Xenc11Namespace)) {
            hashes.mask = ReadHash(parameter, true);
            hasMask = true;
        } else {
            ThrowUnexpected(parameter, Describe(element));
        }
    }
    return hashes;
}

std::vector<unsigned char> ReadCipherData(const ElementNode& element)
{
    CheckAttributeNames(element, {});
    ElementCursor child(element);
    const ElementNode& value = child.TakeNamed("CipherValue", Wire::XencNamespace);
    CheckAttributeNames(value, {});
    child.RequireEnd();
    return ReadBase64(value);
}

bool IsXenc(const ElementNode* element, std::string_view localName) noexcept
{
    return element != nullptr && element->HasQName(localName, Wire::XencNamespace);
}

/** Whom it is for and which key that is are hints, and so is where it is used. */
EncryptedKey ReadEncryptedKey(const ElementNode& element)
{
    CheckAttributeNames(element, {"Id", "Type", "MimeType", "Recipient"});
    ElementCursor child(element);
    EncryptedKey key{};
    key.hashes = ReadKeyMethod(child.TakeNamed("EncryptionMethod", Wire::XencNamespace));
    if (child.Get() != nullptr && child.Get()->HasQName("KeyInfo", Wire::DsNamespace)) {
        child.TakeAny();
    }
    key.text = ReadCipherData(child.TakeNamed("CipherData", Wire::XencNamespace));
    while (IsXenc(child.Get(), "ReferenceList") || IsXenc(child.Get(), "CarriedKeyName")) {
        child.TakeAny();
    }
    child.RequireEnd();
    return key;
}

void AddKey(const ElementNode& element, EncryptedElement& encrypted)
{
    if (encrypted.keys.size() == MaxKeys) {
        throw ParseException(
            "More than " + std::to_string(MaxKeys) + " encrypted keys for one element");
    }
    encrypted.keys.push_back(ReadEncryptedKey(element));
}

/** Whatever else it holds says where the key is: every one that is there is tried anyway. */
void ReadKeyInfo(const ElementNode& element, EncryptedElement& encrypted)
{
    for (ElementCursor child(element); child.Get() != nullptr;) {
        const ElementNode& description = child.TakeAny();
        if (IsXenc(&description, "EncryptedKey")) {
            AddKey(description, encrypted);
        }
    }
}

void ReadEncryptedData(const ElementNode& element, EncryptedElement& encrypted)
{
    CheckAttributeNames(element, {"Id", "Type", "MimeType"});
    const boost::optional<std::string> type = GetOptional(element, "Type");
    if (type && *type != ElementType) {
        throw ParseException(
            "The Type of " + Describe(element) + " is " + Quote(*type) + ", expected "
            + Quote(ElementType));
    }
    ElementCursor child(element);
    encrypted.keyLength =
        ReadContentMethod(child.TakeNamed("EncryptionMethod", Wire::XencNamespace));
    if (child.Get() != nullptr && child.Get()->HasQName("KeyInfo", Wire::DsNamespace)) {
        ReadKeyInfo(child.TakeAny(), encrypted);
    }
    encrypted.text = ReadCipherData(child.TakeNamed("CipherData", Wire::XencNamespace));
    child.RequireEnd();
}

void ReadWithKeysBeside(const ElementNode& element, EncryptedElement& encrypted)
{
    CheckAttributeNames(element, {});
    ElementCursor child(element);
    ReadEncryptedData(child.TakeNamed(EncryptedData, Wire::XencNamespace), encrypted);
    while (child.Get() != nullptr) {
        AddKey(child.TakeNamed("EncryptedKey", Wire::XencNamespace), encrypted);
    }
}

} // namespace

bool IsEncrypted(const ElementNode& element)
{
    return IsXenc(&element, EncryptedData)
           || element.HasQName("EncryptedAssertion", Wire::SamlNamespace);
}

EncryptedElement ReadEncryptedAssertion(const ElementNode& element)
{
    EncryptedElement encrypted{};
    if (IsXenc(&element, EncryptedData)) {
        ReadEncryptedData(element, encrypted);
    } else {
        ReadWithKeysBeside(element, encrypted);
    }
    if (encrypted.keys.empty()) {
        throw ParseException(Describe(element) + " has no EncryptedKey");
    }
    return encrypted;
}

} // namespace SsoClient::GeneralReader
