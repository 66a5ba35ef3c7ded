#include "ssoClient/message/xmlSecurityBuilders.h"

#include "builderText.h"
#include "support/FixedClock.h"
#include "support/RunningClock.h"

#include <gtest/gtest.h>

using namespace SsoClient;
using Quillon::System::DateTime;

namespace {

#define WSSE "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"
#define WSU "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd"
#define X509V3                                                                                     \
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-x509-token-profile-1.0#X509v3"

/** A certificate of which only the encoding counts. */
class EncodingOnly : public Quillon::Crypto::Certificate
{
public:
    explicit EncodingOnly(std::vector<unsigned char> encoded)
        : _encoded(std::move(encoded))
    {}

    const std::vector<unsigned char>& GetEncoded() const noexcept override { return _encoded; }
    const Quillon::Crypto::PublicKey& GetPublicKey() const noexcept override { std::abort(); }
    std::string GetSubjectName() const override { std::abort(); }
    std::string GetIssuerName() const override { std::abort(); }
    std::string GetFingerprint() const override { std::abort(); }
    DateTime GetNotBefore() const override { std::abort(); }
    DateTime GetNotAfter() const override { std::abort(); }

private:
    std::vector<unsigned char> _encoded;
};

} // namespace

TEST(DateTimeFormatter, WritesMillisecondsAndDesignator)
{
    EXPECT_EQ(DateTimeFormatter(DateTime("2011-07-05T09:03:07.042Z")), "2011-07-05T09:03:07.042Z");
}

TEST(DateTimeFormatter, PadsEveryField)
{
    EXPECT_EQ(DateTimeFormatter(DateTime("0987-01-02T03:04:05.007Z")), "0987-01-02T03:04:05.007Z");
    EXPECT_EQ(DateTimeFormatter(DateTime("0001-01-01T00:00:00Z")), "0001-01-01T00:00:00.000Z");
}

TEST(DateTimeFormatter, CutsMicroseconds)
{
    EXPECT_EQ(
        DateTimeFormatter(DateTime("9999-12-31T23:59:59.999999Z")), "9999-12-31T23:59:59.999Z");
}

TEST(AddMinutesToDate, IsExactUpTo35Minutes)
{
    const DateTime time(Now);
    EXPECT_EQ(AddMinutesToDate(time, 35).GetUtcTime() - time.GetUtcTime(), 2'100'000'000);
    EXPECT_EQ(AddMinutesToDate(time, -35).GetUtcTime() - time.GetUtcTime(), -2'100'000'000);
    EXPECT_EQ(AddMinutesToDate(time, -5).GetUtcTime() - time.GetUtcTime(), -300'000'000);
    EXPECT_EQ(AddMinutesToDate(time, 0), time);
}

TEST(AddMinutesToDate, WrapsBeyond35Minutes)
{
    const DateTime time(Now);
    EXPECT_EQ(AddMinutesToDate(time, 36).GetUtcTime() - time.GetUtcTime(), -2'134'967'296);
    EXPECT_EQ(AddMinutesToDate(time, -36).GetUtcTime() - time.GetUtcTime(), 2'134'967'296);
}

TEST(WssuTimestampBuilder, WritesCreationAndExpiry)
{
    const FixedClock clock(Now);
    EXPECT_EQ(
        ToText(WssuTimestampBuilder(10)),
        "<wsu:Timestamp xmlns:wsu=\"" WSU "\">"
        "<wsu:Created>2011-07-05T09:03:07.042Z</wsu:Created>"
        "<wsu:Expires>2011-07-05T09:13:07.042Z</wsu:Expires>"
        "</wsu:Timestamp>");
}

TEST(WssuTimestampBuilder, KeepsTheTimeOfItsCreation)
{
    XMLBuilderPtr builder;
    {
        const FixedClock clock(Now);
        builder = WssuTimestampBuilder(10);
    }
    const FixedClock later("2012-01-01T00:00:00Z");
    EXPECT_NE(ToText(builder).find("<wsu:Created>2011-07-05T09:03:07.042Z<"), std::string::npos);
}

TEST(WssuTimestampBuilder, ReadsTheClockOnce)
{
    const RunningClock clock(Now);
    const std::string text = ToText(WssuTimestampBuilder(10));
    EXPECT_NE(text.find("<wsu:Created>2011-07-05T09:03:07.042Z<"), std::string::npos);
    EXPECT_NE(text.find("<wsu:Expires>2011-07-05T09:13:07.042Z<"), std::string::npos);
}

TEST(WsSecurityHeaderBuilder, HoldsTheTimestamp)
{
    const FixedClock clock(Now);
    EXPECT_EQ(
        ToText(WsSecurityHeaderBuilder(5)),
        "<wsse:Security xmlns:wsse=\"" WSSE "\">"
        "<wsu:Timestamp xmlns:wsu=\"" WSU "\">"
        "<wsu:Created>2011-07-05T09:03:07.042Z</wsu:Created>"
        "<wsu:Expires>2011-07-05T09:08:07.042Z</wsu:Expires>"
        "</wsu:Timestamp></wsse:Security>");
}

TEST(WsseUsernameTokenBuilder, WithoutPasswordHasTheNameOnly)
{
    EXPECT_EQ(
        ToText(WsseUsernameTokenBuilder("jdoe")),
        "<wsse:UsernameToken xmlns:wsse=\"" WSSE "\">"
        "<wsse:Username>jdoe</wsse:Username></wsse:UsernameToken>");
}

// [UsernameToken Profile 1.0, 3.1]
TEST(WsseUsernameTokenBuilder, WithPasswordHasNameThenPassword)
{
    EXPECT_EQ(
        ToText(WsseUsernameTokenBuilder("jdoe", "p<w&")),
        "<wsse:UsernameToken xmlns:wsse=\"" WSSE "\">"
        "<wsse:Username>jdoe</wsse:Username>"
        "<wsse:Password Type=\"http://docs.oasis-open.org/wss/2004/01/"
        "oasis-200401-wss-username-token-profile-1.0#PasswordText\">p&lt;w&amp;</wsse:Password>"
        "</wsse:UsernameToken>");
}

TEST(WsseUsernameTokenBuilder, WritesEmptyValuesAsGiven)
{
    const auto token = Build(*WsseUsernameTokenBuilder("", ""));
    const auto* const name = token->FindChildElement("Username");
    const auto* const password = token->FindChildElement("Password");
    ASSERT_NE(name, nullptr);
    ASSERT_NE(password, nullptr);
    EXPECT_EQ(Quillon::Xml::AsText(name->GetFirstChild())->GetText(), "");
    EXPECT_EQ(Quillon::Xml::AsText(password->GetFirstChild())->GetText(), "");
    EXPECT_EQ(password->GetAttributes().size(), 1U);
}

TEST(WsseX509v3BinarySecTokenBuilder, WritesTheEncodingInOneLine)
{
    // 60 zero bytes make 80 digits, more than a PEM line has.
    const Quillon::Ref<EncodingOnly> certificate(
        new EncodingOnly(std::vector<unsigned char>(60, 0)));
    EXPECT_EQ(
        ToText(WsseX509v3BinarySecTokenBuilder("certId", certificate.get())),
        "<wsse:BinarySecurityToken EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
        "oasis-200401-wss-soap-message-security-1.0#Base64Binary\" ValueType=\"" X509V3
        "\" wsu:Id=\"certId\" xmlns:wsu=\"" WSU "\">"
            + std::string(80, 'A') + "</wsse:BinarySecurityToken>");
}

TEST(WsseX509v3BSTReferenceBuilder, PointsAtTheTokenById)
{
    EXPECT_EQ(
        ToText(WsseX509v3BSTReferenceBuilder("certId")),
        "<wsse:SecurityTokenReference xmlns:wsse=\"" WSSE "\">"
        "<wsse:Reference URI=\"#certId\" ValueType=\"" X509V3 "\"/>"
        "</wsse:SecurityTokenReference>");
}

TEST(WsseSamlKeyIdReferenceBuilder, NamesTheAssertion)
{
    // The two spellings of the profile's name differ, as they do in the profile.
    EXPECT_EQ(
        ToText(WsseSamlKeyIdReferenceBuilder("_id-1")),
        "<wsse:SecurityTokenReference wsse11:TokenType=\"http://docs.oasis-open.org/wss/"
        "oasis-wss-saml-tokenprofile-1.1#SAMLV2.0\" xmlns:wsse=\"" WSSE
        "\" xmlns:wsse11=\"http://docs.oasis-open.org/wss/"
        "oasis-wss-wssecurity-secext-1.1.xsd\">"
        "<wsse:KeyIdentifier ValueType=\"http://docs.oasis-open.org/wss/"
        "oasis-wss-saml-token-profile-1.1#SAMLID\">_id-1</wsse:KeyIdentifier>"
        "</wsse:SecurityTokenReference>");
}
