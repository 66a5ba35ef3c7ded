#include "CryptoSupport.h"

#include "quillon/crypto/Certificate.h"
#include "quillon/ssl/SSLContext.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Quillon::Crypto {

namespace {

/** What is said about the file of the test with this content, without its name. */
std::string GetRefusal(const TemporaryFolder& folder)
{
    const std::string path = folder.GetPath("file");
    const std::string text = GetCryptoError([&] { LoadPemCertificates(path); });
    const std::string begin = "Cannot take certificates from '" + path + "': ";
    return text.rfind(begin, 0) == 0 ? text.substr(begin.size()) : text;
}

std::string GetRefusalOf(const std::string& content)
{
    const TemporaryFolder folder;
    folder.WriteFile("file", content);
    return GetRefusal(folder);
}

TEST(LoadPemCertificates, ReadsAllAndPassesOverTheRest)
{
    const TemporaryFolder folder;
    folder.WriteFile(
        "file",
        ReadTestFile("keys/sts-cert.pem") + ReadTestFile("keys/sts-key.pem")
            + ReadTestFile("keys/client-cert.pem"));
    const auto certificates = LoadPemCertificates(folder.GetPath("file"));
    ASSERT_EQ(certificates.size(), 2U);
    EXPECT_THAT(certificates.front()->GetSubjectName(), testing::HasSubstr("CN=STS signing"));
    EXPECT_THAT(certificates.back()->GetSubjectName(), testing::HasSubstr("CN=solution-user"));
}

TEST(LoadPemCertificates, RefusesWhatIsNoFile)
{
    const TemporaryFolder folder;
    EXPECT_EQ(GetRefusal(folder), "No such file or directory");
    EXPECT_EQ(
        GetCryptoError([] { LoadPemCertificates("/dev/"); }),
        "Cannot take certificates from '/dev/': Is a directory");
    EXPECT_EQ(
        GetCryptoError([] { LoadPemCertificates(""); }),
        "Cannot take certificates from '': No such file or directory");
}

TEST(LoadPemCertificates, RefusesANameThatTheSystemWouldCut)
{
    const std::string path = TestFile("keys/sts-cert.pem");
    EXPECT_EQ(LoadPemCertificates(path).size(), 1U);
    EXPECT_EQ(
        GetCryptoError([&] { LoadPemCertificates(path + '\0' + ".bak"); }),
        "Cannot take certificates from '" + path + "': the name has a NUL character");
}

TEST(LoadPemCertificates, RefusesAFileWithoutACertificate)
{
    constexpr auto Refusal = "The PEM text holds no certificate";
    EXPECT_EQ(GetRefusalOf(""), Refusal);
    EXPECT_EQ(GetRefusalOf(ReadTestFile("keys/sts-key.pem")), Refusal);
}

TEST(LoadPemCertificates, RefusesOtherForms)
{
    constexpr auto Refusal = "The PEM text holds no certificate";
    const TemporaryFolder folder;
    const std::string sts = "-in " + TestFile("keys/sts-cert.pem");
    const std::string out = " -out " + folder.GetPath("file");
    RunOpenSsl("x509 " + sts + " -outform DER" + out);
    EXPECT_EQ(GetRefusal(folder), Refusal);
    RunOpenSsl("pkcs12 -export -nokeys -passout pass:x " + sts + out);
    EXPECT_EQ(GetRefusal(folder), Refusal);
}

TEST(LoadPemCertificates, RefusesABrokenBlock)
{
    const std::string pem = ReadTestFile("keys/sts-cert.pem");
    EXPECT_THAT(
        GetRefusalOf(pem.substr(0, pem.size() / 2)), testing::StartsWith("Malformed PEM text: "));
}

TEST(LoadPemCertificates, RefusesTheFirstByteBeyondTheLimit)
{
    std::string text = ReadTestFile("keys/sts-cert.pem");
    text.resize(MaxCertificateFileBytes, '\n');
    EXPECT_EQ(GetRefusalOf(text), "accepted");
    EXPECT_EQ(GetRefusalOf(text + '\n'), "it is larger than 8388608 bytes");
}

TEST(LoadPemCertificates, EndsWithWhatNeverEnds)
{
    EXPECT_EQ(
        GetCryptoError([] { LoadPemCertificates("/dev/zero"); }),
        "Cannot take certificates from '/dev/zero': it is larger than 8388608 bytes");
}

TEST(LoadSSLContext, NamesTheFileThatItCannotUse)
{
    EXPECT_TRUE(Ssl::LoadSSLContext(TestFile("keys/sts-cert.pem")) != nullptr);
    EXPECT_EQ(
        GetCryptoError([] { Ssl::LoadSSLContext("/no/ca.pem"); }),
        "Cannot take certificates from '/no/ca.pem': No such file or directory");
}

} // namespace

} // namespace Quillon::Crypto
