#include "quillon/crypto/KeyValue.h"

#include "CryptoSupport.h"
#include "quillon/crypto/Certificate.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

// Numbers, serial numbers and PSS signatures come from the `openssl` program.
namespace Quillon::Crypto {

namespace {

std::vector<unsigned char> FromHex(const std::string& hex)
{
    std::vector<unsigned char> bytes;
    for (std::size_t i = 0; i + 1 < hex.size(); i += 2) {
        bytes.push_back(static_cast<unsigned char>(std::stoi(hex.substr(i, 2), nullptr, 16)));
    }
    return bytes;
}

Ref<const Certificate> ReadCertificate(const std::string& name)
{
    return ParsePemCertificates(ReadTestFile("keys/" + name + "-cert.pem")).front();
}

std::vector<unsigned char> ModulusOf(const std::string& name)
{
    const std::string text =
        RunOpenSsl("x509 -noout -modulus -in " + TestFile("keys/" + name + "-cert.pem"));
    return FromHex(text.substr(text.find('=') + 1));
}

/** The public point, which ends the DER form of the key. */
std::vector<unsigned char> PointOf(const std::string& name, std::size_t length)
{
    std::vector<unsigned char> der = ReadCertificate(name)->GetPublicKey().GetEncoded();
    return {der.end() - static_cast<std::ptrdiff_t>(length), der.end()};
}

const std::vector<unsigned char> Exponent = {1, 0, 1};

/** A PSS signature of "text" by the key `name`. */
std::vector<unsigned char> SignPss(
    const std::string& name, const std::string& hash, const std::string& options)
{
    const TemporaryFolder folder;
    folder.WriteFile("text", "text");
    RunOpenSsl(
        "dgst -" + hash + " -sigopt rsa_padding_mode:pss " + options + " -sign "
        + TestFile("keys/" + name + "-key.pem") + " -out " + folder.GetPath("signature") + " "
        + folder.GetPath("text"));
    const std::string bytes = folder.ReadFile("signature");
    return {bytes.begin(), bytes.end()};
}

/** The 32 octets of a number that `openssl asn1parse` prints. */
std::vector<unsigned char> NumberAfter(const std::string& printed, std::size_t& position)
{
    const std::string mark = "INTEGER           :";
    const std::size_t begin = printed.find(mark, position) + mark.size();
    position = printed.find('\n', begin);
    const std::string digits = printed.substr(begin, position - begin);
    return FromHex(std::string(64 - digits.size(), '0') + digits);
}

/** A signature of "text" on the curve P-256, as r and s of 32 octets each. */
std::vector<unsigned char> SignEcdsa()
{
    const TemporaryFolder folder;
    folder.WriteFile("text", "text");
    RunOpenSsl(
        "dgst -sha256 -sign " + TestFile("keys/sts-p256-key.pem") + " -out "
        + folder.GetPath("signature") + " " + folder.GetPath("text"));
    const std::string printed =
        RunOpenSsl("asn1parse -inform DER -in " + folder.GetPath("signature"));
    std::size_t position = 0;
    std::vector<unsigned char> signature = NumberAfter(printed, position);
    const std::vector<unsigned char> s = NumberAfter(printed, position);
    signature.insert(signature.end(), s.begin(), s.end());
    return signature;
}

/** The digest of "text" by `sha256sum` and its like. */
std::vector<unsigned char> DigestOfText(HashAlgorithm algorithm)
{
    if (algorithm == HashAlgorithm::SHA256) {
        return FromHex("982d9e3eb996f559e633f4d194def3761d909f5a3b647d1a851fead67c32c9d1");
    }
    return FromHex(
        algorithm == HashAlgorithm::SHA384
            ? "313a7e3322ac655c276b3a0a9e6b27c448c5707b1b0e20037b42ab7761ba2516"
              "2f7659d4ffe1eafd9966204c1b41fb73"
            : "eaf2c12742cb8c161bcbd84b032b9bb98999a23282542672ca01cc6edd268f7d"
              "ce9987ad6b2bc79305634f89d90b90102bcd59a57e7135b8e3ceb93c0597117b");
}

bool VerifiesPss(
    const std::string& name, HashAlgorithm algorithm, const std::vector<unsigned char>& signature)
{
    return ReadCertificate(name)->GetPublicKey().VerifyPssDigest(
        algorithm, DigestOfText(algorithm).data(), signature.data(), signature.size());
}

bool VerifiesEcdsa(const std::vector<unsigned char>& signature)
{
    return ReadCertificate("sts-p256")
        ->GetPublicKey()
        .VerifyDigest(
            HashAlgorithm::SHA256,
            DigestOfText(HashAlgorithm::SHA256).data(),
            signature.data(),
            signature.size());
}

} // namespace

// [XMLDSIG11 6.4.3]
TEST(VerifyDigest, TakesTwoNumbersOfTheOrdersLengthAndNothingAround)
{
    const std::vector<unsigned char> signature = SignEcdsa();
    EXPECT_TRUE(VerifiesEcdsa(signature));
    std::vector<unsigned char> longer = signature;
    longer.push_back(0);
    EXPECT_FALSE(VerifiesEcdsa(longer));
    EXPECT_FALSE(VerifiesEcdsa({signature.begin(), signature.end() - 1}));
    std::vector<unsigned char> padded = signature;
    padded.insert(padded.begin(), 0);
    padded.insert(padded.begin() + 33, 0);
    EXPECT_FALSE(VerifiesEcdsa(padded));
    EXPECT_FALSE(VerifiesEcdsa({}));
}

// [RFC 8017 8.1], [RFC 9231 2.3.10]
TEST(VerifyPssDigest, TakesASaltAsLongAsTheDigest)
{
    const std::string options = "-sigopt rsa_pss_saltlen:-1";
    EXPECT_TRUE(VerifiesPss("sts", HashAlgorithm::SHA256, SignPss("sts", "sha256", options)));
    EXPECT_TRUE(VerifiesPss("sts", HashAlgorithm::SHA384, SignPss("sts", "sha384", options)));
    EXPECT_TRUE(VerifiesPss("sts", HashAlgorithm::SHA512, SignPss("sts", "sha512", options)));
}

TEST(VerifyPssDigest, RefusesAnotherSaltMaskPaddingOrKey)
{
    const auto verifies = [](const std::string& options) {
        return VerifiesPss("sts", HashAlgorithm::SHA256, SignPss("sts", "sha256", options));
    };
    EXPECT_FALSE(verifies("-sigopt rsa_pss_saltlen:20"));
    EXPECT_FALSE(verifies("-sigopt rsa_pss_saltlen:0"));
    EXPECT_FALSE(verifies("-sigopt rsa_pss_saltlen:-1 -sigopt rsa_mgf1_md:sha384"));
    EXPECT_FALSE(verifies("-sigopt rsa_padding_mode:pkcs1"));
    const auto foreign = SignPss("foreign", "sha256", "-sigopt rsa_pss_saltlen:-1");
    EXPECT_FALSE(VerifiesPss("sts", HashAlgorithm::SHA256, foreign));
    EXPECT_TRUE(VerifiesPss("foreign", HashAlgorithm::SHA256, foreign));
    EXPECT_FALSE(VerifiesPss("sts-p256", HashAlgorithm::SHA256, foreign));
}

TEST(VerifyPssDigest, IsNotWhatThePlainPaddingVerifies)
{
    const auto signature = SignPss("sts", "sha256", "-sigopt rsa_pss_saltlen:-1");
    EXPECT_FALSE(ReadCertificate("sts")->GetPublicKey().VerifyDigest(
        HashAlgorithm::SHA256,
        DigestOfText(HashAlgorithm::SHA256).data(),
        signature.data(),
        signature.size()));
}

TEST(CreateRsaPublicKey, MakesTheKeyOfTheNumbers)
{
    const auto key = CreateRsaPublicKey(ModulusOf("client"), Exponent);
    EXPECT_EQ(key->GetDescription(), "RSA-2048");
    EXPECT_EQ(key->GetEncoded(), ReadCertificate("client")->GetPublicKey().GetEncoded());
    EXPECT_NE(key->GetEncoded(), ReadCertificate("sts")->GetPublicKey().GetEncoded());
}

TEST(CreateRsaPublicKey, RefusesNumbersThatAreNoKey)
{
    EXPECT_NE(GetCryptoError([] { CreateRsaPublicKey({}, Exponent); }), "accepted");
    EXPECT_NE(GetCryptoError([] { CreateRsaPublicKey(ModulusOf("sts"), {}); }), "accepted");
    EXPECT_EQ(
        GetCryptoError(
            [] { CreateRsaPublicKey(std::vector<unsigned char>(2049, 0xff), Exponent); }),
        "Not a public key of type RSA: a modulus of 2049 bytes and an exponent of 3");
}

TEST(CreateRsaPublicKey, RefusesNumbersWithWhichAnybodyCanSign)
{
    std::vector<unsigned char> even = ModulusOf("sts");
    even.back() &= 0xfeU;
    for (const std::vector<unsigned char>& exponent :
         {std::vector<unsigned char>{0}, std::vector<unsigned char>{1}}) {
        EXPECT_THAT(
            GetCryptoError([&] { CreateRsaPublicKey(ModulusOf("sts"), exponent); }),
            testing::StartsWith("Not a public key of type RSA: "));
    }
    for (const std::vector<unsigned char>& modulus : {std::vector<unsigned char>{1}, even}) {
        EXPECT_THAT(
            GetCryptoError([&] { CreateRsaPublicKey(modulus, Exponent); }),
            testing::StartsWith("Not a public key of type RSA: "));
    }
}

// [SEC1 3.2.2]
TEST(CreateEcPublicKey, RefusesThePointAtInfinity)
{
    EXPECT_THAT(
        GetCryptoError([] { CreateEcPublicKey("P-256", {0}); }),
        testing::StartsWith("Not a public key of type EC: "));
}

// [SEC1 2.3.3], [XMLDSIG11 4.5.2.3]
TEST(CreateEcPublicKey, MakesTheKeyOfThePoint)
{
    const auto key = CreateEcPublicKey("P-256", PointOf("sts-p256", 65));
    EXPECT_EQ(key->GetDescription(), "EC prime256v1");
    EXPECT_EQ(key->GetEncoded(), ReadCertificate("sts-p256")->GetPublicKey().GetEncoded());
    EXPECT_EQ(
        CreateEcPublicKey("P-521", PointOf("sts-p521", 133))->GetEncoded(),
        ReadCertificate("sts-p521")->GetPublicKey().GetEncoded());
}

// [FIPS 186-4 D.1.2]
TEST(CreateEcPublicKey, RefusesPointsOffTheCurveAndOtherCurves)
{
    std::vector<unsigned char> point = PointOf("sts-p256", 65);
    EXPECT_EQ(
        GetCryptoError([&] { CreateEcPublicKey("secp256k1", point); }),
        "Elliptic curve 'secp256k1' is not accepted");
    EXPECT_NE(GetCryptoError([&] { CreateEcPublicKey("P-384", point); }), "accepted");
    point.back() ^= 1U;
    EXPECT_NE(GetCryptoError([&] { CreateEcPublicKey("P-256", point); }), "accepted");
}

// [RFC 5280 4.1.2.2]
TEST(GetSerialNumber, IsInDecimalDigits)
{
    // openssl x509 -noout -serial, turned into decimal digits by Python
    EXPECT_EQ(
        GetSerialNumber(*ReadCertificate("sts")),
        "573453980445731920397774884576969036765092312072");
}

} // namespace Quillon::Crypto
