#include "CryptoSupport.h"

#include "quillon/crypto/Certificate.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <stdexcept>

namespace Quillon::Crypto {

namespace {

Ref<const Certificate> LoadCertificate(const std::string& name)
{
    return ParsePemCertificates(ReadTestFile("keys/" + name + "-cert.pem")).front();
}

// [RFC 7468 2]
TEST(ParsePemCertificates, ReadsAllAndPassesOverTheRest)
{
    const std::string pem = "text before\n" + ReadTestFile("keys/sts-cert.pem")
                            + ReadTestFile("keys/sts-key.pem") + "text between\n"
                            + ReadTestFile("keys/client-cert.pem");
    const auto certificates = ParsePemCertificates(pem);
    ASSERT_EQ(certificates.size(), 2U);
    EXPECT_EQ(certificates.front()->GetEncoded(), LoadCertificate("sts")->GetEncoded());
    EXPECT_EQ(certificates.back()->GetEncoded(), LoadCertificate("client")->GetEncoded());
}

TEST(ParsePemCertificates, RefusesTextWithoutACertificate)
{
    EXPECT_EQ(
        GetCryptoError([] { ParsePemCertificates(""); }), "The PEM text holds no certificate");
    EXPECT_EQ(
        GetCryptoError([] { ParsePemCertificates(ReadTestFile("keys/sts-key.pem")); }),
        "The PEM text holds no certificate");
}

TEST(ParsePemCertificates, RefusesABrokenBlock)
{
    std::string pem = ReadTestFile("keys/sts-cert.pem");
    pem.resize(pem.size() / 2);
    EXPECT_NE(GetCryptoError([&] { ParsePemCertificates(pem); }), "accepted");
    EXPECT_NE(
        GetCryptoError([] {
            ParsePemCertificates("-----BEGIN CERTIFICATE-----\nAAAA\n-----END CERTIFICATE-----\n");
        }),
        "accepted");
}

TEST(CreateCertificate, KeepsTheBytesAsGiven)
{
    const std::vector<unsigned char> der = LoadCertificate("sts")->GetEncoded();
    EXPECT_EQ(CreateCertificate(der.data(), der.size())->GetEncoded(), der);
}

TEST(CreateCertificate, RefusesEveryTruncationAndAnythingAfterTheEnd)
{
    std::vector<unsigned char> der = LoadCertificate("sts")->GetEncoded();
    for (std::size_t length = 0; length < der.size(); ++length) {
        EXPECT_NE(GetCryptoError([&] { CreateCertificate(der.data(), length); }), "accepted")
            << length;
    }
    der.push_back(0);
    EXPECT_EQ(
        GetCryptoError([&] { CreateCertificate(der.data(), der.size()); }),
        "Not a certificate in DER form: 1 bytes follow it");
}

// [RFC 5280 4.1]
TEST(Certificate, TellsWhatOpenSslTells)
{
    const Ref<const Certificate> certificate = LoadCertificate("sts");
    const std::string file = TestFile("keys/sts-cert.pem");
    EXPECT_EQ(
        "subject=" + certificate->GetSubjectName(),
        RunOpenSsl("x509 -noout -subject -nameopt RFC2253 -in " + file));
    EXPECT_EQ(
        "issuer=" + certificate->GetIssuerName(),
        RunOpenSsl("x509 -noout -issuer -nameopt RFC2253 -in " + file));
    EXPECT_EQ(
        "notBefore=" + certificate->GetNotBefore().ToString().substr(0, 19) + "Z",
        ReplaceBlank(RunOpenSsl("x509 -noout -startdate -dateopt iso_8601 -in " + file)));
    EXPECT_EQ(
        "notAfter=" + certificate->GetNotAfter().ToString().substr(0, 19) + "Z",
        ReplaceBlank(RunOpenSsl("x509 -noout -enddate -dateopt iso_8601 -in " + file)));
    EXPECT_EQ(
        certificate->GetFingerprint(),
        ToPlainHex(RunOpenSsl("x509 -noout -fingerprint -sha256 -in " + file)));
}

/** The certificate of `sts`, whose last day lies in 2126, with another year in its place. */
Ref<const Certificate> MakeEndingIn(const std::string& year)
{
    std::vector<unsigned char> der = LoadCertificate("sts")->GetEncoded();
    const std::string old = "2126";
    const auto place = std::search(der.begin(), der.end(), old.begin(), old.end());
    if (place == der.end()) {
        throw std::logic_error("the certificate does not end in 2126");
    }
    std::copy(year.begin(), year.end(), place);
    return CreateCertificate(der.data(), der.size());
}

// [RFC 5280 4.1.2.5.2]
TEST(Certificate, HasNoDateInTheYearZero)
{
    EXPECT_EQ(MakeEndingIn("0001")->GetNotAfter().ToString().substr(0, 4), "0001");
    EXPECT_EQ(
        GetCryptoError([] { MakeEndingIn("0000")->GetNotAfter(); }).substr(0, 93),
        "The certificate has an unusable date: Not a date and time of the years 1 to 9999: "
        "'0000-10-27");
}

TEST(ParsePemCertificates, RefusesATextThatOpenSslCannotCount)
{
    const HugeText text;
    EXPECT_EQ(
        GetCryptoError([&] { ParsePemCertificates(text.Get()); }),
        "A text of 2147483648 bytes is too long to be read");
    EXPECT_EQ(
        GetCryptoError([&] { CreateCertificate(text.Get().data(), text.Get().size()); }),
        "Not a certificate: 2147483648 bytes");
}

TEST(Certificate, DescribesItsKey)
{
    EXPECT_EQ(LoadCertificate("sts")->GetPublicKey().GetDescription(), "RSA-2048");
    EXPECT_EQ(LoadCertificate("sts")->GetPublicKey().GetKeyType(), KeyType::RSA);
    EXPECT_EQ(LoadCertificate("sts")->GetPublicKey().GetBits(), 2048);
    EXPECT_EQ(LoadCertificate("sts-p256")->GetPublicKey().GetDescription(), "EC prime256v1");
    EXPECT_EQ(LoadCertificate("sts-p521")->GetPublicKey().GetKeyType(), KeyType::EC);
    EXPECT_EQ(LoadCertificate("sts-p521")->GetPublicKey().GetBits(), 521);
}

} // namespace

} // namespace Quillon::Crypto
