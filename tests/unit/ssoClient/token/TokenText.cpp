#include "unit/ssoClient/token/TokenText.h"

#include "quillon/Exceptions.h"
#include "quillon/StringUtil.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/wire/wireNames.h"

#include <openssl/evp.h>
#include <openssl/rsa.h>
#include <openssl/x509.h>

#include <array>
#include <stdexcept>

namespace TokenText {

namespace {

namespace Wire = SsoClient::Wire;

const std::string BearerConfirmation =
    R"(<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer">)"
    R"(<saml:SubjectConfirmationData NotOnOrAfter="2012-01-31T12:05:00Z">)"
    R"(</saml:SubjectConfirmationData></saml:SubjectConfirmation>)";

std::string Sha256Base64(const std::string& text)
{
    std::array<unsigned char, 32> digest{};
    unsigned length = 0;
    EVP_Digest(text.data(), text.size(), digest.data(), &length, EVP_sha256(), nullptr);
    return Quillon::StringUtil::Base64Encode(digest.data(), length);
}

std::string Algorithm(const std::string& element, const std::string& identifier)
{
    return "<ds:" + element + " Algorithm=\"" + identifier + "\"></ds:" + element + ">";
}

/** The content of a SignedInfo in canonical form. */
std::string SignedInfoContent(const std::string& digestValue, const std::string& uri)
{
    return Algorithm("CanonicalizationMethod", "http://www.w3.org/2001/10/xml-exc-c14n#")
           + Algorithm("SignatureMethod", "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256")
           + "<ds:Reference URI=\"" + uri + "\"><ds:Transforms>"
           + Algorithm("Transform", "http://www.w3.org/2000/09/xmldsig#enveloped-signature")
           + R"(<ds:Transform Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#">)"
             R"(<ec:InclusiveNamespaces xmlns:ec="http://www.w3.org/2001/10/xml-exc-c14n#")"
             R"( PrefixList="del rsa xs xsi"></ec:InclusiveNamespaces></ds:Transform>)"
             "</ds:Transforms>"
           + Algorithm("DigestMethod", "http://www.w3.org/2001/04/xmlenc#sha256")
           + "<ds:DigestValue>" + digestValue + "</ds:DigestValue></ds:Reference>";
}

std::string WithSignature(
    const std::string& assertion, const std::string& signedInfoContent, const std::string& value)
{
    return Replace(
        assertion,
        "</saml:Issuer>",
        std::string("</saml:Issuer><ds:Signature xmlns:ds=\"") + Wire::DsNamespace
            + "\"><ds:SignedInfo>" + signedInfoContent + "</ds:SignedInfo><ds:SignatureValue>"
            + value + "</ds:SignatureValue></ds:Signature>");
}

using CertificateOwner = std::unique_ptr<X509, decltype(&X509_free)>;

std::vector<unsigned char> MakeCertificate(EVP_PKEY* key)
{
    const CertificateOwner certificate(X509_new(), &X509_free);
    X509_set_version(certificate.get(), X509_VERSION_3);
    ASN1_INTEGER_set(X509_get_serialNumber(certificate.get()), 1);
    // Long over: a pinned certificate's own validity does not matter.
    ASN1_TIME_set_string(X509_getm_notBefore(certificate.get()), "100101000000Z");
    ASN1_TIME_set_string(X509_getm_notAfter(certificate.get()), "110101000000Z");
    X509_set_pubkey(certificate.get(), key);
    X509_sign(certificate.get(), key, EVP_sha256());
    std::vector<unsigned char> bytes(
        static_cast<std::size_t>(i2d_X509(certificate.get(), nullptr)));
    unsigned char* out = bytes.data();
    i2d_X509(certificate.get(), &out);
    return bytes;
}

} // namespace

std::string Bearer()
{
    return std::string(R"(<saml:Assertion xmlns:del=")") + Wire::DelegationNamespace
           + "\" xmlns:rsa=\"" + Wire::RsaNamespace + "\" xmlns:saml=\"" + Wire::SamlNamespace
           + "\" xmlns:xs=\"" + Wire::XsNamespace + "\" xmlns:xsi=\"" + Wire::XsiNamespace
           + R"(" ID="_token" IssueInstant="2012-01-31T11:59:00.000Z" Version="2.0">)"
             R"(<saml:Issuer Format="urn:oasis:names:tc:SAML:2.0:nameid-format:entity">)"
             "https://sts.example.com</saml:Issuer>"
             "<saml:Subject>"
           + NameId("user@example.com") + BearerConfirmation
           + R"(</saml:Subject><saml:Conditions NotBefore="2012-01-31T11:55:00Z")"
             R"( NotOnOrAfter="2012-01-31T12:05:00Z"></saml:Conditions>)"
             R"(<saml:AuthnStatement AuthnInstant="2012-01-31T11:59:00Z"><saml:AuthnContext>)"
             "<saml:AuthnContextClassRef>password</saml:AuthnContextClassRef>"
             "</saml:AuthnContext></saml:AuthnStatement></saml:Assertion>";
}

std::string HolderOfKey(const std::string& certificate)
{
    return Replace(
        Bearer(),
        BearerConfirmation,
        std::string(
            R"(<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:holder-of-key">)"
            R"(<saml:SubjectConfirmationData xsi:type="saml:KeyInfoConfirmationDataType">)"
            R"(<ds:KeyInfo xmlns:ds=")")
            + Wire::DsNamespace + "\"><ds:X509Data><ds:X509Certificate>" + certificate
            + "</ds:X509Certificate></ds:X509Data></ds:KeyInfo>"
              "</saml:SubjectConfirmationData></saml:SubjectConfirmation>");
}

std::string NameId(const std::string& value)
{
    return std::string("<saml:NameID Format=\"") + Wire::UpnClaim + "\">" + value
           + "</saml:NameID>";
}

std::string DelegationRestriction(const std::vector<std::string>& delegates)
{
    std::string text = R"(<saml:Condition xsi:type="del:DelegationRestrictionType">)";
    for (const std::string& delegate : delegates) {
        text += R"(<del:Delegate DelegationInstant="2012-01-31T11:00:00Z">)" + NameId(delegate)
                + "</del:Delegate>";
    }
    return text + "</saml:Condition>";
}

std::string Attribute(const std::string& name, const std::vector<std::string>& values)
{
    std::string text = "<saml:Attribute Name=\"" + name
                       + R"(" NameFormat="urn:oasis:names:tc:SAML:2.0:attrname-format:uri">)";
    for (const std::string& value : values) {
        text += "<saml:AttributeValue>" + value + "</saml:AttributeValue>";
    }
    return text + "</saml:Attribute>";
}

std::string Replace(const std::string& text, const std::string& from, const std::string& to)
{
    const std::size_t position = text.find(from);
    if (position == std::string::npos || text.find(from, position + 1) != std::string::npos) {
        throw std::logic_error("not found just once: " + from);
    }
    return std::string(text).replace(position, from.size(), to);
}

std::string InsertBefore(
    const std::string& text, const std::string& where, const std::string& inserted)
{
    return Replace(text, where, inserted + where);
}

std::string WithConditions(const std::string& conditions)
{
    return InsertBefore(Bearer(), EndOfConditions, conditions);
}

std::string WithAttributes(const std::string& attributes)
{
    return InsertBefore(
        Bearer(),
        EndOfAssertion,
        "<saml:AttributeStatement>" + attributes + "</saml:AttributeStatement>");
}

std::string WithDummySignature(const std::string& assertion)
{
    return WithSignature(assertion, SignedInfoContent("AAAA", "#_token"), "AAAA");
}

SigningKey::SigningKey()
    : _key(EVP_RSA_gen(2048), &EVP_PKEY_free)
{
    const std::vector<unsigned char> certificate = MakeCertificate(_key.get());
    _certificateBase64 = Quillon::StringUtil::Base64Encode(certificate);
    _certificate = Quillon::Crypto::CreateCertificate(certificate.data(), certificate.size());
}

std::string SigningKey::Sign(const std::string& assertion, const std::string& uri) const
{
    const std::string content = SignedInfoContent(Sha256Base64(assertion), uri);
    const std::string canonical = std::string("<ds:SignedInfo xmlns:ds=\"") + Wire::DsNamespace
                                  + "\">" + content + "</ds:SignedInfo>";
    return WithSignature(assertion, content, SignValue(canonical));
}

std::string SigningKey::SignValue(const std::string& text) const
{
    const std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)> context(
        EVP_MD_CTX_new(), &EVP_MD_CTX_free);
    std::vector<unsigned char> value(256);
    std::size_t length = value.size();
    EVP_DigestSignInit(context.get(), nullptr, EVP_sha256(), nullptr, _key.get());
    const auto* bytes = reinterpret_cast<const unsigned char*>(text.data());
    if (EVP_DigestSign(context.get(), value.data(), &length, bytes, text.size()) != 1) {
        throw std::logic_error("cannot sign");
    }
    return Quillon::StringUtil::Base64Encode(value);
}

const SigningKey& StsKey()
{
    static const SigningKey key;
    return key;
}

std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> TrustSts()
{
    return {StsKey().GetCertificate()};
}

boost::shared_ptr<const SsoClient::SamlToken> MakeToken(const std::string& assertion)
{
    return SsoClient::CreateSamlToken(StsKey().Sign(assertion), TrustSts());
}

FixedClock::FixedClock(const std::string& time)
    : _now(time)
{
    Quillon::System::ReplaceClock(this);
}

FixedClock::~FixedClock()
{
    Quillon::System::ReplaceClock(nullptr);
}

std::string Judge(
    const std::string& xml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trusted,
    long long clockToleranceSec)
{
    try {
        SsoClient::CreateSamlToken(xml, trusted, clockToleranceSec);
        return "accepted";
    } catch (const Quillon::Exception& error) {
        return Quillon::GetClassName(error).append(": ").append(error.what());
    }
}

std::string JudgeUnsigned(const std::string& assertion, long long clockToleranceSec)
{
    return Judge(WithDummySignature(assertion), {}, clockToleranceSec);
}

std::string JudgeReplaced(const std::string& from, const std::string& to)
{
    return JudgeUnsigned(Replace(Bearer(), from, to));
}

std::string JudgeConditions(const std::string& conditions)
{
    return JudgeUnsigned(WithConditions(conditions));
}

} // namespace TokenText
