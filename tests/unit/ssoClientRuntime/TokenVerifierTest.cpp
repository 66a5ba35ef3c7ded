#include "ssoClientRuntime/TokenVerifier.h"

#include "support/Failure.h"
#include "support/FixedClock.h"
#include "support/TestData.h"

#include <gtest/gtest.h>

#include <optional>
#include <thread>
#include <vector>

using namespace SsoClient;

namespace {

using Token = boost::shared_ptr<const SamlToken>;

constexpr char WhenTokensAreValid[] = "2026-06-15T12:00:00Z";

/** The text with an octet of its middle changed. */
std::string Tampered(std::string xml)
{
    char& octet = xml.at(xml.size() / 2);
    octet = octet == 'a' ? 'b' : 'a';
    return xml;
}

class Verifier : public testing::Test
{
protected:
    boost::shared_ptr<TokenVerifier> Make() const { return CreateTokenVerifier(sts, options); }

    std::string GetVerifyFailure(TokenVerifier& verifier, const std::string& text) const
    {
        return GetFailure([&] { verifier.Verify(text); });
    }

    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> sts =
        GetTestCertificates("sts");
    const std::string xml = ReadTestData("tokens/accepted/bearer.xml");
    const std::string large = ReadTestData("tokens/accepted/bearer-100k.xml");
    TokenVerifierOptions options;
    std::optional<FixedClock> clock{std::in_place, WhenTokensAreValid};
};

} // namespace

TEST_F(Verifier, GivesTheSameObjectForTheSameText)
{
    const auto verifier = Make();
    for (const std::string& text : {xml, large}) {
        const Token token = verifier->Verify(text);
        EXPECT_EQ(token->ToXml(), text);
        EXPECT_EQ(verifier->Verify(std::string(text)), token);
    }
    const TokenVerifierStatus status = verifier->GetStatus();
    EXPECT_EQ(status.hits, 2U);
    EXPECT_EQ(status.misses, 2U);
    EXPECT_EQ(status.entries, 2U);
    EXPECT_GT(status.bytes, xml.size() + large.size());
}

TEST_F(Verifier, RefusesWhatDiffersInOneOctetAsIfItWereNew)
{
    const auto verifier = Make();
    for (const std::string& text : {xml, large}) {
        const Token token = verifier->Verify(text);
        const std::string expected = GetFailure([&] { CreateSamlToken(Tampered(text), sts); });
        EXPECT_NE(expected, "none");
        EXPECT_EQ(GetVerifyFailure(*verifier, Tampered(text)), expected);
        EXPECT_EQ(verifier->Verify(text), token); // which nothing has pushed out
    }
}

TEST_F(Verifier, RemembersNoRefusal)
{
    const auto verifier = Make();
    EXPECT_NE(GetVerifyFailure(*verifier, Tampered(xml)), "none");
    EXPECT_EQ(verifier->GetStatus().entries, 0U);
    EXPECT_EQ(verifier->GetStatus().misses, 1U);
}

TEST_F(Verifier, JudgesTheValidityAnew)
{
    const auto verifier = Make();
    const Token token = verifier->Verify(xml);
    const auto moment = [](const Quillon::System::DateTime& time, long long offsetUs) {
        return Quillon::System::DateTimeFromUtc(time.GetUtcTime() + offsetUs, false);
    };
    const long long tolerance = 600'000'000;
    const auto judge = [&](const Quillon::System::DateTime& time) {
        clock.reset();
        clock.emplace(time);
        const std::string expected = GetFailure([&] { CreateSamlToken(xml, sts); });
        EXPECT_EQ(GetVerifyFailure(*verifier, xml), expected);
        return expected;
    };
    EXPECT_EQ(judge(moment(token->GetStartDate(), -tolerance)), "none");
    EXPECT_NE(judge(moment(token->GetStartDate(), -tolerance - 1)), "none");
    EXPECT_EQ(judge(moment(token->GetEndDate(), tolerance - 1)), "none");
    EXPECT_NE(judge(moment(token->GetEndDate(), tolerance)), "none");
    EXPECT_EQ(verifier->GetStatus().hits, 2U);
}

TEST_F(Verifier, HasItsOwnTolerance)
{
    options.clockToleranceSec = 0;
    const auto verifier = Make();
    const Token token = verifier->Verify(xml);
    clock.reset();
    clock.emplace(token->GetEndDate());
    EXPECT_NE(GetVerifyFailure(*verifier, xml), "none");
}

TEST_F(Verifier, ForgetsEverythingWhenOthersAreTrusted)
{
    const auto verifier = Make();
    const Token token = verifier->Verify(xml);
    verifier->SetTrustedCertificates(GetTestCertificates("client"));
    EXPECT_EQ(verifier->GetStatus().entries, 0U);
    EXPECT_EQ(verifier->GetStatus().bytes, 0U);
    EXPECT_EQ(GetVerifyFailure(*verifier, xml), GetFailure([&] {
                  CreateSamlToken(xml, GetTestCertificates("client"));
              }));
    verifier->SetTrustedCertificates(sts);
    EXPECT_NE(verifier->Verify(xml), token);
}

TEST_F(Verifier, RefusesANullCertificate)
{
    auto certificates = sts;
    certificates.emplace_back();
    const std::string expected =
        "InvalidArgumentException: Invalid argument : A trusted certificate is null";
    EXPECT_EQ(GetFailure([&] { CreateTokenVerifier(certificates); }), expected);
    const auto verifier = Make();
    verifier->Verify(xml);
    EXPECT_EQ(GetFailure([&] { verifier->SetTrustedCertificates(certificates); }), expected);
    EXPECT_EQ(verifier->GetStatus().entries, 1U);
}

TEST_F(Verifier, LetsGoOfWhatWasUsedLeastRecently)
{
    const std::string other = ReadTestData("tokens/accepted/bearer-4k.xml");
    const std::string third = ReadTestData("tokens/accepted/bearer-8k.xml");
    options.maxEntries = 2;
    const auto verifier = Make();
    const Token first = verifier->Verify(xml);
    const Token second = verifier->Verify(other);
    EXPECT_EQ(verifier->Verify(xml), first);
    verifier->Verify(third);
    EXPECT_EQ(verifier->GetStatus().evicted, 1U);
    EXPECT_EQ(verifier->Verify(xml), first);
    EXPECT_NE(verifier->Verify(other), second);
}

TEST_F(Verifier, KeepsNoMoreOctetsThanItMay)
{
    options.maxBytes = 20'000;
    const auto verifier = Make();
    verifier->Verify(large);
    EXPECT_EQ(verifier->GetStatus().entries, 0U);
    verifier->Verify(xml);
    verifier->Verify(ReadTestData("tokens/accepted/bearer-8k.xml"));
    verifier->Verify(ReadTestData("tokens/accepted/bearer-4k.xml"));
    EXPECT_LE(verifier->GetStatus().bytes, options.maxBytes);
    EXPECT_GT(verifier->GetStatus().evicted, 0U);
}

TEST_F(Verifier, KeepsNothingIfItMayNot)
{
    options.maxEntries = 0;
    const auto verifier = Make();
    EXPECT_NE(verifier->Verify(xml), verifier->Verify(xml));
    EXPECT_EQ(verifier->GetStatus().entries, 0U);
}

TEST_F(Verifier, IsSharedByThreads)
{
    const std::vector<std::string> texts = {
        xml,
        ReadTestData("tokens/accepted/bearer-4k.xml"),
        ReadTestData("tokens/accepted/bearer-8k.xml")};
    options.maxEntries = 2;
    const auto verifier = Make();
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i < 4; ++i) {
        threads.emplace_back([&, i] {
            for (std::size_t round = 0; round < 30; ++round) {
                const std::string& text = texts[(i + round) % texts.size()];
                EXPECT_EQ(verifier->Verify(text)->ToXml(), text);
                if (round == 15) {
                    verifier->SetTrustedCertificates(sts);
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    const TokenVerifierStatus status = verifier->GetStatus();
    EXPECT_EQ(status.hits + status.misses, 120U);
    EXPECT_LE(status.entries, 2U);
}
