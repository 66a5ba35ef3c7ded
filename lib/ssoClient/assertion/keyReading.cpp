#include "ssoClient/assertion/keyReading.h"

#include "quillon/crypto/KeyValue.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/wire/wireNames.h"

#include <algorithm>
#include <array>
#include <utility>

namespace SsoClient::GeneralReader {

using Quillon::Ref;
using Quillon::Crypto::Certificate;
using Quillon::Crypto::PublicKey;
using Key = boost::shared_ptr<const PublicKey>;

namespace {

/** [XMLDSIG11 4.5.2.3] */
constexpr char Dsig11Namespace[] = "http://www.w3.org/2009/xmldsig11#";

constexpr std::array<std::pair<std::string_view, const char*>, 3> Curves{{
    {"urn:oid:1.2.840.10045.3.1.7", "P-256"},
    {"urn:oid:1.3.132.0.34", "P-384"},
    {"urn:oid:1.3.132.0.35", "P-521"},
}};

/** The number of certificates is bounded: each costs a decoding. */
constexpr std::size_t MaxCertificates = 16;

bool IsDs(const ElementNode& element, std::string_view localName)
{
    return element.HasQName(localName, Wire::DsNamespace);
}

Ref<const Certificate> ReadCertificate(const ElementNode& element)
{
    const std::vector<unsigned char> bytes = ReadBase64(element);
    try {
        return Quillon::Crypto::CreateCertificate(bytes.data(), bytes.size());
    } catch (const Quillon::Crypto::CryptoException& error) {
        throw ParseException(Describe(element) + ": " + error.what());
    }
}

Key ReadRsaKeyValue(const ElementNode& element)
{
    ElementCursor child(element);
    const auto modulus = ReadBase64(child.TakeNamed("Modulus", Wire::DsNamespace));
    const auto exponent = ReadBase64(child.TakeNamed("Exponent", Wire::DsNamespace));
    child.RequireEnd();
    return Quillon::Crypto::CreateRsaPublicKey(modulus, exponent);
}

Key ReadEcKeyValue(const ElementNode& element)
{
    ElementCursor child(element);
    const ElementNode& curve = child.TakeNamed("NamedCurve", Dsig11Namespace);
    const auto point = ReadBase64(child.TakeNamed("PublicKey", Dsig11Namespace));
    child.RequireEnd();
    const std::string uri = GetRequired(curve, "URI");
    const auto* found = std::find_if(
        Curves.begin(), Curves.end(), [&uri](const auto& known) { return known.first == uri; });
    if (found == Curves.end()) {
        throw ParseException("Curve " + Quote(uri) + " of " + Describe(curve) + " is not accepted");
    }
    return Quillon::Crypto::CreateEcPublicKey(found->second, point);
}

Key ReadKeyValue(const ElementNode& element)
{
    ElementCursor child(element);
    if (child.Get() == nullptr) {
        throw ParseException(Describe(element) + " holds no key");
    }
    const ElementNode& value = child.TakeAny();
    child.RequireEnd();
    const bool isRsa = IsDs(value, "RSAKeyValue");
    if (!isRsa && !value.HasQName("ECKeyValue", Dsig11Namespace)) {
        ThrowUnexpected(value, Describe(element));
    }
    try {
        return isRsa ? ReadRsaKeyValue(value) : ReadEcKeyValue(value);
    } catch (const Quillon::Crypto::CryptoException& error) {
        throw ParseException(Describe(value) + ": " + error.what());
    }
}

CertificateReference ReadIssuerSerial(const ElementNode& element)
{
    ElementCursor child(element);
    CertificateReference reference;
    reference.issuerName = GetUri(child.TakeNamed("X509IssuerName", Wire::DsNamespace));
    reference.serialNumber = GetUri(child.TakeNamed("X509SerialNumber", Wire::DsNamespace));
    child.RequireEnd();
    return reference;
}

/** A second description of the same kind would need somebody to choose. */
void RequireFirst(bool isFirst, const ElementNode& element)
{
    if (!isFirst) {
        throw ParseException("Second element " + Describe(element) + " for one key");
    }
}

void ReadX509Child(const ElementNode& element, AssertionKey& key)
{
    if (IsDs(element, "X509Certificate")) {
        if (key.certificates.size() == MaxCertificates) {
            throw ParseException(
                "More than " + std::to_string(MaxCertificates) + " certificates for one key");
        }
        key.certificates.push_back(ReadCertificate(element));
    } else if (IsDs(element, "X509IssuerSerial")) {
        RequireFirst(!key.issuerSerial, element);
        key.issuerSerial = ReadIssuerSerial(element);
    } else if (IsDs(element, "X509SubjectName")) {
        RequireFirst(!key.subjectName, element);
        key.subjectName = GetUri(element);
    } else if (!IsDs(element, "X509SKI") && !IsDs(element, "X509CRL")) {
        ThrowUnexpected(element, "the description of a certificate");
    }
}

void ReadX509Data(const ElementNode& element, AssertionKey& key)
{
    for (ElementCursor child(element); child.Get() != nullptr;) {
        ReadX509Child(child.TakeAny(), key);
    }
}

bool HasIssued(const Certificate& issuer, const Certificate& other)
{
    return issuer.GetEncoded() != other.GetEncoded()
           && issuer.GetSubjectName() == other.GetIssuerName();
}

bool HoldsTheKey(const AssertionKey& key, const Certificate& candidate)
{
    if (key.publicKey && key.publicKey->GetEncoded() != candidate.GetPublicKey().GetEncoded()) {
        return false;
    }
    if (key.issuerSerial
        && key.issuerSerial->serialNumber != Quillon::Crypto::GetSerialNumber(candidate)) {
        return false;
    }
    if (key.publicKey || key.issuerSerial) {
        return true;
    }
    return std::none_of(
        key.certificates.begin(), key.certificates.end(), [&candidate](const auto& other) {
            return HasIssued(candidate, *other);
        });
}

void ChooseCertificate(AssertionKey& key, const ElementNode& element)
{
    if (key.certificates.empty()) {
        return;
    }
    std::vector<Ref<const Certificate>> holders;
    std::copy_if(
        key.certificates.begin(),
        key.certificates.end(),
        std::back_inserter(holders),
        [&key](const auto& candidate) { return HoldsTheKey(key, *candidate); });
    if (holders.size() != 1) {
        throw ParseException(
            std::to_string(holders.size()) + " of the " + std::to_string(key.certificates.size())
            + " certificates in " + Describe(element) + " may hold the key, expected one");
    }
    key.certificate = holders.front();
    // The certificate's key lives as long as the certificate.
    key.publicKey =
        Key(&key.certificate->GetPublicKey(),
            [certificate = key.certificate](const PublicKey* /*key*/) {});
}

} // namespace

AssertionKey ReadKeyInfo(const ElementNode& element)
{
    AssertionKey key;
    for (ElementCursor child(element); child.Get() != nullptr;) {
        const ElementNode& description = child.TakeAny();
        if (IsDs(description, "X509Data")) {
            ReadX509Data(description, key);
        } else if (IsDs(description, "KeyValue")) {
            RequireFirst(key.publicKey == nullptr, description);
            key.publicKey = ReadKeyValue(description);
        } else if (IsDs(description, "KeyName")) {
            RequireFirst(!key.keyName, description);
            key.keyName = GetText(description);
        } else {
            ThrowUnexpected(description, Describe(element) + ", which must name a public key");
        }
    }
    ChooseCertificate(key, element);
    if (!key.publicKey && !key.issuerSerial && !key.subjectName && !key.keyName) {
        throw ParseException(Describe(element) + " names no key");
    }
    return key;
}

} // namespace SsoClient::GeneralReader
