#include "Harness.h"

#include "support/Failure.h"
#include "support/FakeSamlToken.h"

#include <gmock/gmock.h>

using namespace SsoClient;

namespace {

constexpr char FiveMinutesLater[] = "2026-11-20T12:05:00Z";
constexpr char OneHourLater[] = "2026-11-20T13:00:00Z";

constexpr char NotRenewed[] =
    "SsoException: Unexpected SOAP fault: wst:UnableToRenew; request failed.";

class RenewTokenAtSts : public HttpsStsTest
{
protected:
    TokenPtr AcquireRenewable() const
    {
        TokenSpec spec = MakeSpec(600);
        spec.renewable = true;
        spec.audienceRestriction = {"urn:example:a"};
        return service->AcquireTokenByCertificate(spec);
    }

    ServicePtr service = MakeService();
};

class ValidateSubjectAtSts : public HttpsStsTest
{
protected:
    TokenPtr AcquireAlices() const
    {
        return MakeBearerService()->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
    }
};

class RenewTokenOverHttp : public HttpStsTest
{};

} // namespace

TEST_F(RenewTokenAtSts, GivesTheTokenANewLife)
{
    const TokenPtr old = AcquireRenewable();
    const FixedClock later(FiveMinutesLater);
    const TokenPtr renewed = service->RenewToken(*old, 900);
    ASSERT_NE(renewed, nullptr);
    EXPECT_NE(renewed->GetId(), old->GetId());
    EXPECT_EQ(renewed->GetStartDate(), Quillon::System::DateTime(FiveMinutesLater));
    EXPECT_EQ(GetLifetimeSec(*renewed), 900);
}

TEST_F(RenewTokenAtSts, KeepsWhatTheTokenSays)
{
    const TokenPtr old = AcquireRenewable();
    const TokenPtr renewed = service->RenewToken(*old, 900);
    ASSERT_NE(renewed, nullptr);
    EXPECT_EQ(renewed->GetSubject(), old->GetSubject());
    EXPECT_TRUE(renewed->IsRenewable());
    std::set<std::string> audience;
    renewed->GetAudience(audience);
    EXPECT_EQ(audience, std::set<std::string>{"urn:example:a"});
    ASSERT_NE(renewed->GetConfirmationCertificate(), nullptr);
    EXPECT_EQ(
        renewed->GetConfirmationCertificate()->GetEncoded(),
        old->GetConfirmationCertificate()->GetEncoded());
}

TEST_F(RenewTokenAtSts, RenewsARenewedToken)
{
    const TokenPtr first = service->RenewToken(*AcquireRenewable(), 900);
    const TokenPtr second = service->RenewToken(*first, 1200);
    ASSERT_NE(second, nullptr);
    EXPECT_EQ(GetLifetimeSec(*second), 1200);
}

TEST_F(RenewTokenAtSts, ReportsTokenThatIsNotRenewable)
{
    const TokenPtr token = service->AcquireTokenByCertificate(MakeSpec());
    EXPECT_EQ(GetFailure([&] { service->RenewToken(*token, 900); }), NotRenewed);
}

TEST_F(RenewTokenAtSts, ReportsTokenOfAnotherKey)
{
    const TokenPtr token = AcquireRenewable();
    const ServicePtr other = MakeService(MakeIdentity("foreign", "foreign"));
    EXPECT_EQ(GetFailure([&] { other->RenewToken(*token, 900); }), NotRenewed);
}

TEST_F(RenewTokenAtSts, ReportsExpiredToken)
{
    const TokenPtr token = AcquireRenewable();
    const FixedClock later(OneHourLater);
    EXPECT_EQ(GetFailure([&] { service->RenewToken(*token, 900); }), NotRenewed);
}

TEST_F(RenewTokenAtSts, RefusesBearerTokenWithoutSending)
{
    const TokenPtr token =
        MakeBearerService()->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
    EXPECT_EQ(
        GetFailure([&] { service->RenewToken(*token, 900); }),
        "InvalidArgumentException: Invalid argument : Unable to renew token: the provided token "
        "must be Holder Of Key");
    EXPECT_EQ(server.ReceivedRequests().size(), 1U);
}

TEST_F(ValidateSubjectAtSts, AcceptsTokenOfTheSts)
{
    EXPECT_TRUE(MakeBearerService()->ValidateSubject(*AcquireAlices()));
}

TEST_F(ValidateSubjectAtSts, AcceptsHolderOfKeyTokenWithIdentity)
{
    const ServicePtr service = MakeService();
    EXPECT_TRUE(service->ValidateSubject(*service->AcquireTokenByCertificate(MakeSpec())));
}

TEST_F(ValidateSubjectAtSts, RefusesExpiredToken)
{
    const TokenPtr token = AcquireAlices();
    const FixedClock later(OneHourLater);
    EXPECT_FALSE(MakeBearerService()->ValidateSubject(*token));
}

TEST_F(ValidateSubjectAtSts, RefusesTokenThatWasChanged)
{
    FakeSamlToken changed;
    changed.xml = Replaced(AcquireAlices()->ToXml(), "alice@", "bob@");
    EXPECT_FALSE(MakeBearerService()->ValidateSubject(changed));
}

TEST_F(ValidateSubjectAtSts, RefusesSubjectThatIsGone)
{
    const TokenPtr token = AcquireAlices();
    state.Write("users.json", Replaced(state.Read("users.json"), "alice@", "carol@"));
    EXPECT_FALSE(MakeBearerService()->ValidateSubject(*token));
}

TEST_F(RenewTokenOverHttp, GivesTheTokenANewLife)
{
    const ServicePtr service = MakeService();
    TokenSpec spec = MakeSpec();
    spec.renewable = true;
    const TokenPtr renewed = service->RenewToken(*service->AcquireTokenByCertificate(spec), 900);
    ASSERT_NE(renewed, nullptr);
    EXPECT_EQ(GetLifetimeSec(*renewed), 900);
}
