#include "CryptoSupport.h"

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <stdexcept>
#include <thread>

namespace Quillon::Crypto {

namespace {

const std::string Digest32(32, 'd');

const unsigned char* ToBytes(const std::string& text)
{
    return reinterpret_cast<const unsigned char*>(text.data());
}

Ref<const PrivateKey> LoadKey(const std::string& name)
{
    return CreatePrivateKey(ReadTestFile("keys/" + name + "-key.pem"));
}

const PublicKey& GetPublicKey(const Ref<const Certificate>& certificate)
{
    return certificate->GetPublicKey();
}

Ref<const Certificate> LoadCertificate(const std::string& name)
{
    return ParsePemCertificates(ReadTestFile("keys/" + name + "-cert.pem")).front();
}

// [RFC 8017 8.2]
TEST(SignDigest, MakesAnRsaSignatureThatOpenSslVerifies)
{
    const TemporaryFolder folder;
    const auto signature = LoadKey("sts")->SignDigest(HashAlgorithm::SHA256, ToBytes(Digest32));
    folder.WriteFile("digest", Digest32);
    folder.WriteFile("signature", std::string(signature.begin(), signature.end()));
    const std::string verify = "pkeyutl -verify -certin -inkey " + TestFile("keys/sts-cert.pem")
                               + " -pkeyopt digest:sha256 -in " + folder.GetPath("digest")
                               + " -sigfile " + folder.GetPath("signature");
    EXPECT_EQ(RunOpenSsl(verify), "Signature Verified Successfully");
    folder.WriteFile("digest", std::string(32, 'e'));
    EXPECT_EQ(RunOpenSsl(verify), "Signature Verification Failure");
}

TEST(VerifyDigest, AcceptsItsOwnKeyAndNoOther)
{
    for (const char* name : {"sts", "sts-p256", "sts-p384", "sts-p521"}) {
        std::vector<unsigned char> signature =
            LoadKey(name)->SignDigest(HashAlgorithm::SHA256, ToBytes(Digest32));
        const auto verify = [&](const std::string& key, const std::string& digest) {
            return GetPublicKey(LoadCertificate(key))
                .VerifyDigest(
                    HashAlgorithm::SHA256, ToBytes(digest), signature.data(), signature.size());
        };
        EXPECT_TRUE(verify(name, Digest32)) << name;
        EXPECT_FALSE(verify(name, std::string(32, 'e'))) << name;
        EXPECT_FALSE(verify("foreign", Digest32)) << name;
        signature.back() ^= 1U;
        EXPECT_FALSE(verify(name, Digest32)) << name;
        signature.pop_back();
        EXPECT_FALSE(verify(name, Digest32)) << name;
        signature.clear();
        EXPECT_FALSE(verify(name, Digest32)) << name;
    }
}

// [XMLDSIG11 6.4.3]: r and s, each as long as the curve's order.
/** The order of the group of P-256 [FIPS 186-4 D.1.2.3], most significant byte first. */
constexpr std::array<unsigned char, 32> OrderOfP256{
    0xff, 0xff, 0xff, 0xff, 0x00, 0x00, 0x00, 0x00, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff,
    0xbc, 0xe6, 0xfa, 0xad, 0xa7, 0x17, 0x9e, 0x84, 0xf3, 0xb9, 0xca, 0xc2, 0xfc, 0x63, 0x25, 0x51};

/** r and n - s of a signature's r and s. */
std::vector<unsigned char> Negate(const std::vector<unsigned char>& signature)
{
    std::vector<unsigned char> negated = signature;
    int borrow = 0;
    for (std::size_t i = 1; i <= OrderOfP256.size(); ++i) {
        const int difference =
            OrderOfP256.at(OrderOfP256.size() - i) - signature.at(signature.size() - i) - borrow;
        negated.at(signature.size() - i) = static_cast<unsigned char>(difference & 0xff);
        borrow = difference < 0 ? 1 : 0;
    }
    return negated;
}

// Anyone can make a second signature value of one that they see, so a signed text is no key.
TEST(VerifyDigest, TellsOneDigestFromAnotherHoweverTheyAlternate)
{
    const auto makeDigest = [](HashAlgorithm algorithm) {
        return std::string(64, algorithm == HashAlgorithm::SHA256 ? 'd' : 'e');
    };
    for (const char* name : {"sts", "sts-p256"}) {
        const auto key = LoadKey(name);
        const auto certificate = LoadCertificate(name);
        // ECDSA takes the start of a digest that is too long for its key [FIPS 186-4 6.4].
        const auto algorithms = {HashAlgorithm::SHA512, HashAlgorithm::SHA256};
        for (int round = 0; round < 2; ++round) {
            for (const HashAlgorithm signedWith : algorithms) {
                const auto signature = key->SignDigest(signedWith, ToBytes(makeDigest(signedWith)));
                for (const HashAlgorithm algorithm : algorithms) {
                    const bool isVerified = GetPublicKey(certificate)
                                                .VerifyDigest(
                                                    algorithm,
                                                    ToBytes(makeDigest(algorithm)),
                                                    signature.data(),
                                                    signature.size());
                    EXPECT_EQ(algorithm == signedWith, isVerified) << name;
                }
            }
        }
    }
}

TEST(VerifyDigest, AcceptsBothFormsOfAnEcdsaSignature)
{
    const auto verify = [](const std::vector<unsigned char>& signature) {
        return GetPublicKey(LoadCertificate("sts-p256"))
            .VerifyDigest(
                HashAlgorithm::SHA256, ToBytes(Digest32), signature.data(), signature.size());
    };
    const std::vector<unsigned char> signature =
        LoadKey("sts-p256")->SignDigest(HashAlgorithm::SHA256, ToBytes(Digest32));
    const std::vector<unsigned char> other = Negate(signature);
    EXPECT_NE(signature, other);
    EXPECT_TRUE(verify(signature));
    EXPECT_TRUE(verify(other));
    std::vector<unsigned char> third = other;
    third[0] ^= 1U;
    EXPECT_FALSE(verify(third));
}

TEST(SignDigest, GivesEcdsaValuesOfFixedLength)
{
    const std::string digest(64, 'd');
    EXPECT_EQ(LoadKey("sts-p256")->SignDigest(HashAlgorithm::SHA512, ToBytes(digest)).size(), 64U);
    EXPECT_EQ(LoadKey("sts-p384")->SignDigest(HashAlgorithm::SHA512, ToBytes(digest)).size(), 96U);
    EXPECT_EQ(LoadKey("sts-p521")->SignDigest(HashAlgorithm::SHA512, ToBytes(digest)).size(), 132U);
}

TEST(SignDigest, ServesManyThreadsAtOnce)
{
    const Ref<const PrivateKey> key = LoadKey("sts");
    const auto expected = key->SignDigest(HashAlgorithm::SHA256, ToBytes(Digest32));
    std::vector<std::thread> threads;
    std::atomic<int> equal{0};
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            for (int round = 0; round < 20; ++round) {
                equal +=
                    key->SignDigest(HashAlgorithm::SHA256, ToBytes(Digest32)) == expected ? 1 : 0;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(equal, 80);
}

TEST(CreatePrivateKey, ReadsPemAndDerOfEveryForm)
{
    const std::string file = TestFile("keys/sts-key.pem");
    for (const char* form :
         {"pkcs8 -topk8 -nocrypt -outform PEM",
          "pkcs8 -topk8 -nocrypt -outform DER",
          "rsa -traditional -outform PEM",
          "rsa -traditional -outform DER"}) {
        const TemporaryFolder folder;
        RunOpenSsl(std::string(form) + " -in " + file + " -out " + folder.GetPath("key"));
        const auto key = LoadPrivateKey("file:" + folder.GetPath("key"));
        EXPECT_EQ(key->GetDescription(), "RSA-2048") << form;
    }
    EXPECT_EQ(LoadKey("sts-p256")->GetDescription(), "EC prime256v1");
    EXPECT_EQ(LoadKey("weak")->GetBits(), 1024);
}

class EncryptedKey : public testing::Test
{
protected:
    EncryptedKey()
    {
        RunOpenSsl(
            "pkcs8 -topk8 -v2 aes256 -passout pass:correct -in " + TestFile("keys/sts-key.pem")
            + " -out " + _folder.GetPath("key"));
    }

    std::string GetUri() const { return "file:" + _folder.GetPath("key"); }
    std::string GetPem() const { return _folder.ReadFile("key"); }

private:
    TemporaryFolder _folder;
};

TEST_F(EncryptedKey, OpensWithItsPassphrase)
{
    const auto passphrase = [] { return std::string("correct"); };
    EXPECT_EQ(CreatePrivateKey(GetPem(), passphrase)->GetDescription(), "RSA-2048");
    EXPECT_EQ(LoadPrivateKey(GetUri(), passphrase)->GetDescription(), "RSA-2048");
}

TEST_F(EncryptedKey, TellsAWrongPassphraseFromAMissingOne)
{
    const auto wrong = [] { return std::string("wrong"); };
    EXPECT_EQ(
        GetCryptoError([&] { CreatePrivateKey(GetPem(), wrong); }),
        "Cannot read the private key: the passphrase is wrong");
    EXPECT_EQ(
        GetCryptoError([&] { CreatePrivateKey(GetPem()); }),
        "Cannot read the private key: it is encrypted and there is no passphrase");
    EXPECT_EQ(
        GetCryptoError([&] { LoadPrivateKey(GetUri()); }),
        "There is no private key at '" + GetUri()
            + "': it is encrypted and there is no passphrase");
}

TEST_F(EncryptedKey, PassesOnWhatTheCallbackThrows)
{
    const auto failing = []() -> std::string { throw std::runtime_error("cancelled"); };
    EXPECT_THROW(CreatePrivateKey(GetPem(), failing), std::runtime_error);
    EXPECT_THROW(LoadPrivateKey(GetUri(), failing), std::runtime_error);
}

TEST_F(EncryptedKey, RefusesAPassphraseThatIsTooLong)
{
    const auto endless = [] { return std::string(100000, 'x'); };
    EXPECT_NE(GetCryptoError([&] { CreatePrivateKey(GetPem(), endless); }), "accepted");
}

TEST(CreatePrivateKey, AsksForNoPassphraseWithoutNeed)
{
    bool wasAsked = false;
    const auto passphrase = [&wasAsked] {
        wasAsked = true;
        return std::string();
    };
    CreatePrivateKey(ReadTestFile("keys/sts-key.pem"), passphrase);
    EXPECT_FALSE(wasAsked);
}

TEST(CreatePrivateKey, RefusesWhatIsNoPrivateKey)
{
    for (const std::string& text :
         {std::string(),
          std::string("no key"),
          std::string(100, '\0'),
          ReadTestFile("keys/sts-cert.pem")}) {
        EXPECT_THAT(
            GetCryptoError([&] { CreatePrivateKey(text); }),
            testing::StartsWith("Cannot read the private key: "));
    }
}

TEST(CreatePrivateKey, RefusesATextThatOpenSslCannotCount)
{
    const HugeText text;
    EXPECT_EQ(
        GetCryptoError([&] { CreatePrivateKey(text.Get()); }),
        "Not a private key: 2147483648 bytes");
}

TEST(LoadPrivateKey, RefusesWhereThereIsNone)
{
    EXPECT_EQ(
        GetCryptoError([] { LoadPrivateKey("file:/nonexistent/key.pem"); }),
        "Cannot open 'file:/nonexistent/key.pem': No such file or directory");
    const std::string certificate = "file:" + TestFile("keys/sts-cert.pem");
    EXPECT_THAT(
        GetCryptoError([&] { LoadPrivateKey(certificate); }),
        testing::StartsWith("There is no private key at '" + certificate + "': "));
    EXPECT_THAT(
        GetCryptoError([] { LoadPrivateKey("unknown-scheme:x"); }),
        testing::StartsWith("Cannot open 'unknown-scheme:x': "));
}

} // namespace

} // namespace Quillon::Crypto
