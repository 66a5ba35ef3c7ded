#include "quillon/crypto/Decryption.h"

#include "CryptoSupport.h"
#include "support/FreedMemory.h"

#include <gtest/gtest.h>

// What is encrypted by RSA-OAEP comes from the `openssl` program, the other texts from the test
// vectors that the authors of the cipher have published.
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

std::string ToText(const std::vector<unsigned char>& bytes)
{
    return {bytes.begin(), bytes.end()};
}

// [SP 800-38D]: test cases 3, 9 and 15 of its proposal differ in the key.
const std::string Vector = "cafebabefacedbaddecaf888";
const std::string Plain = "d9313225f88406e5a55909c5aff5269a86a7a9531534f7da2e4c303d8a318a72"
                          "1c3c0c95956809532fcf0e2449a6b525b16aedf5aa0de657ba637b391aafd255";

struct GcmCase
{
    std::string key;
    std::string encrypted;
    std::string tag;
};

const GcmCase GcmCases[] = {
    {"feffe9928665731c6d6a8f9467308308",
     "42831ec2217774244b7221b784d0d49ce3aa212f2c02a4e035c17e2329aca12e"
     "21d514b25466931c7d8f6a5aac84aa051ba30b396a0aac973d58e091473f5985",
     "4d5c2af327cd64a62cf35abd2ba6fab4"},
    {"feffe9928665731c6d6a8f9467308308feffe9928665731c",
     "3980ca0b3c00e841eb06fac4872a2757859e1ceaa6efd984628593b40ca1e19c"
     "7d773d00c144c525ac619d18c84a3f4718e2448b2fe324d9ccda2710acade256",
     "9924a7c8587336bfb118024db8674a14"},
    {"feffe9928665731c6d6a8f9467308308feffe9928665731c6d6a8f9467308308",
     "522dc1f099567d07f47f37a32a84427d643a8cdcbfe5c0c97598a2bd2555d1aa"
     "8cb08e48590dbb3da7b08b1056828838c5f61e6393ba7a0abcc9f662898015ad",
     "b094dac5d93471bdec1a502270e3cc6c"},
};

boost::optional<Wiped> DecryptGcm(const std::string& key, const std::string& text)
{
    return DecryptAesGcm(ToText(FromHex(key)), FromHex(text));
}

std::string GetText(const boost::optional<Wiped>& text)
{
    return text ? text->Get() : "nothing";
}

Ref<const PrivateKey> ReadKey(const std::string& name)
{
    return CreatePrivateKey(ReadTestFile("keys/" + name + "-key.pem"));
}

/** "secret", encrypted for the key `name` with these options of `openssl pkeyutl`. */
std::vector<unsigned char> Encrypt(const std::string& name, const std::string& options)
{
    const TemporaryFolder folder;
    folder.WriteFile("text", "secret");
    RunOpenSsl(
        "pkeyutl -encrypt -certin -inkey " + TestFile("keys/" + name + "-cert.pem") + " -in "
        + folder.GetPath("text") + " -out " + folder.GetPath("encrypted") + " " + options);
    const std::string bytes = folder.ReadFile("encrypted");
    return {bytes.begin(), bytes.end()};
}

std::string OaepOptions(const std::string& digest, const std::string& mask)
{
    return "-pkeyopt rsa_padding_mode:oaep -pkeyopt rsa_oaep_md:" + digest
           + " -pkeyopt rsa_mgf1_md:" + mask;
}

constexpr OaepHashes Sha1 = {OaepHash::SHA1, OaepHash::SHA1};

} // namespace

// [SP 800-38D 7.2]
TEST(DecryptAesGcm, OpensTheVectorsOfTheCipher)
{
    for (const GcmCase& known : GcmCases) {
        EXPECT_EQ(
            GetText(DecryptGcm(known.key, Vector + known.encrypted + known.tag)),
            ToText(FromHex(Plain)))
            << known.key;
    }
}

TEST(DecryptAesGcm, GivesNothingWhereAnyBitDiffers)
{
    const GcmCase& known = GcmCases[0];
    const std::vector<unsigned char> text = FromHex(Vector + known.encrypted + known.tag);
    for (std::size_t i = 0; i < text.size(); ++i) {
        std::vector<unsigned char> changed = text;
        changed[i] ^= 0x80U;
        EXPECT_FALSE(DecryptAesGcm(ToText(FromHex(known.key)), changed)) << i;
    }
}

TEST(DecryptAesGcm, GivesNothingForOtherLengths)
{
    const GcmCase& known = GcmCases[0];
    const std::string text = Vector + known.encrypted + known.tag;
    EXPECT_FALSE(DecryptGcm("", text));
    EXPECT_FALSE(DecryptGcm(known.key.substr(2), text));
    EXPECT_FALSE(DecryptGcm(known.key + "00", text));
    for (const std::size_t length : {0U, 12U, 27U}) {
        EXPECT_FALSE(DecryptGcm(known.key, text.substr(0, 2 * length))) << length;
    }
}

TEST(DecryptAesGcm, LeavesNothingOfWhatIsNotGenuineInFreedMemory)
{
    const GcmCase& known = GcmCases[0];
    const std::vector<unsigned char> text =
        FromHex(Vector + known.encrypted + "00000000000000000000000000000000");
    const std::string key = ToText(FromHex(known.key));
    const std::string plain = ToText(FromHex(Plain));
    const FreedMemory freed(plain);
    EXPECT_FALSE(DecryptAesGcm(key, text));
    EXPECT_FALSE(freed.HeldTheText());
}

// [RFC 8017 7.1.2]
TEST(DecryptOaep, OpensWhatWasEncryptedWithTheseHashes)
{
    const struct
    {
        OaepHashes hashes;
        std::string options;
    } cases[] = {
        {Sha1, OaepOptions("sha1", "sha1")},
        {{OaepHash::SHA256, OaepHash::SHA1}, OaepOptions("sha256", "sha1")},
        {{OaepHash::SHA1, OaepHash::SHA256}, OaepOptions("sha1", "sha256")},
        {{OaepHash::SHA384, OaepHash::SHA384}, OaepOptions("sha384", "sha384")},
        {{OaepHash::SHA512, OaepHash::SHA512}, OaepOptions("sha512", "sha512")}};
    const Ref<const PrivateKey> key = ReadKey("client");
    for (const auto& known : cases) {
        const std::vector<unsigned char> text = Encrypt("client", known.options);
        EXPECT_EQ(GetText(DecryptOaep(*key, known.hashes, text)), "secret") << known.options;
        EXPECT_FALSE(DecryptOaep(*key, {OaepHash::SHA384, OaepHash::SHA1}, text));
    }
}

TEST(DecryptOaep, GivesNothingForOtherTexts)
{
    const Ref<const PrivateKey> key = ReadKey("client");
    const std::string options = OaepOptions("sha1", "sha1");
    EXPECT_FALSE(DecryptOaep(*key, Sha1, Encrypt("foreign", options)));
    EXPECT_FALSE(DecryptOaep(*key, Sha1, Encrypt("sts-second", options)));
    EXPECT_FALSE(DecryptOaep(*key, Sha1, Encrypt("client", "-pkeyopt rsa_padding_mode:pkcs1")));
    EXPECT_FALSE(
        DecryptOaep(*key, Sha1, Encrypt("client", options + " -pkeyopt rsa_oaep_label:61")));
    EXPECT_FALSE(DecryptOaep(*key, Sha1, {}));
    EXPECT_FALSE(DecryptOaep(*key, Sha1, std::vector<unsigned char>(256, 0xFF)));
    EXPECT_FALSE(DecryptOaep(*key, Sha1, std::vector<unsigned char>(100'000, 1)));
}

TEST(DecryptOaep, GivesNothingForAKeyThatCannot)
{
    EXPECT_FALSE(DecryptOaep(*ReadKey("sts-p256"), Sha1, std::vector<unsigned char>(256, 1)));
}

} // namespace Quillon::Crypto
