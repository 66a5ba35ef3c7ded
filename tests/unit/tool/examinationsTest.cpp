#include "examinations.h"

#include "quillon/system/Clock.h"
#include "ssoClient/Exceptions.h"
#include "support/TestTls.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using namespace Testing;
using Quillon::Http::ExchangeFacts;
using Quillon::System::GetUtcDateTime;
using testing::HasSubstr;

namespace {

constexpr long Day = 86'400;

Quillon::Ref<const Quillon::Crypto::Certificate> MakeCertificate(long fromSec, long toSec)
{
    CertificateOptions options;
    options.commonName = "sts";
    options.notBeforeSec = fromSec;
    options.notAfterSec = toSec;
    const std::vector<unsigned char> der = MakeIdentity(options).GetDer();
    return Quillon::Crypto::CreateCertificate(der.data(), der.size());
}

Finding ExamineTrusted(long fromSec, long toSec)
{
    return ExamineTrust({MakeCertificate(fromSec, toSec)}, GetUtcDateTime()).front();
}

} // namespace

TEST(ExamineTrust, TellsHowLongACertificateIsValid)
{
    const Finding good = ExamineTrusted(-Day, 31 * Day);
    EXPECT_EQ(good.health, Health::GOOD);
    EXPECT_THAT(good.text, HasSubstr("CN=sts, issued by CN=sts, expires at "));
    EXPECT_EQ(good.remedy, "");

    const Finding soon = ExamineTrusted(-Day, 29 * Day);
    EXPECT_EQ(soon.health, Health::NOTE);
    EXPECT_THAT(soon.text, HasSubstr(", in 28 d 23 h"));
    EXPECT_NE(soon.remedy, "");
}

TEST(ExamineTrust, FindsACertificateThatIsNotValid)
{
    const Finding expired = ExamineTrusted(-2 * Day, -Day);
    EXPECT_EQ(expired.health, Health::BAD);
    EXPECT_THAT(expired.text, HasSubstr("expired at "));

    const Finding early = ExamineTrusted(Day, 2 * Day);
    EXPECT_EQ(early.health, Health::BAD);
    EXPECT_THAT(early.text, HasSubstr("not valid before "));
}

TEST(ExamineTls, JudgesEveryCertificateThatIsShown)
{
    ExchangeFacts exchange;
    exchange.tlsVersion = "TLSv1.3";
    exchange.status = 200;
    exchange.certificates = {MakeCertificate(-Day, 365 * Day), MakeCertificate(-Day, -1)};
    const std::vector<Finding> findings = ExamineTls(exchange, nullptr, GetUtcDateTime());
    ASSERT_EQ(findings.size(), 3U);
    EXPECT_EQ(findings[1].health, Health::GOOD);
    EXPECT_THAT(findings[1].text, HasSubstr("pin (--peer) sha256//"));
    EXPECT_EQ(findings[2].health, Health::BAD);
    EXPECT_THAT(findings[2].text, testing::Not(HasSubstr("pin")));
}

TEST(ExamineAnswer, FindsAServiceThatLetsAnybodyIn)
{
    EXPECT_EQ(ExamineAnswer(std::nullopt, nullptr).health, Health::BAD);
}

TEST(ExamineAnswer, TellsOfNoFaultThatIsOnlyQuoted)
{
    const SsoClient::SsoException quoted("no Unexpected SOAP fault: x; request failed.");
    EXPECT_EQ(ExamineAnswer(std::nullopt, &quoted).health, Health::BAD);
}
