#include "ssoClient/client/grantChecking.h"

#include "support/Failure.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"
#include "support/TestData.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::HasSubstr;
using testing::StartsWith;

namespace {

constexpr char OtherToken[] = "SsoException: The service issued another token than was asked for: ";

/** A token in the narrow way, and what it is compared with. */
class Grant : public testing::Test
{
protected:
    Grant()
    {
        token.audience.clear();
        presented.audience.clear();
        spec.tokenLifetimeSec = 3600;
    }

    void BindTo(const std::string& name)
    {
        token.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
        token.certificate = GetTestCertificates(name).front();
    }

    void GiveIdentity()
    {
        identity = HolderOfKeyConfig{GetTestKey("client"), GetTestCertificates("client").front()};
    }

    std::string Check(const GrantRequest& asked) const
    {
        return GetFailure([&] { CheckGrant(token, asked, dialect, identity); });
    }

    std::string CheckUser(const std::string& name) const
    {
        return Check(GrantRequest::ByPassword(name, spec));
    }

    std::string CheckSpec() const { return Check(GrantRequest::ByNegotiation(spec)); }
    std::string CheckExchange() const { return Check(GrantRequest::ByToken(presented, spec)); }
    std::string CheckRenewal(long long lifetimeSec) const
    {
        return Check(GrantRequest::ByRenewal(presented, lifetimeSec));
    }

    FakeSamlToken token; // of jdoe, example.com; ends at 10:00
    FakeSamlToken presented;
    TokenSpec spec;
    ServiceDialect dialect;
    boost::optional<HolderOfKeyConfig> identity;
    FixedClock clock{"2011-07-05T09:00:00Z"};
};

std::string Other(const std::string& difference)
{
    return OtherToken + difference;
}

} // namespace

TEST_F(Grant, IsBoundToTheKeyOfTheCaller)
{
    GiveIdentity();
    EXPECT_EQ(CheckSpec(), Other("it is bound to no key"));
    BindTo("foreign");
    EXPECT_EQ(CheckSpec(), Other("it is bound to another key than the caller's"));
    BindTo("client");
    EXPECT_EQ(CheckSpec(), "none");
}

TEST_F(Grant, IsBoundToNoKeyIfNoneWasAskedFor)
{
    BindTo("client");
    EXPECT_EQ(CheckSpec(), Other("it is bound to a key"));
    GiveIdentity();
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    EXPECT_EQ(CheckSpec(), Other("it is bound to a key"));
    dialect.grantCheck.key = false;
    EXPECT_EQ(CheckSpec(), "none");
}

TEST_F(Grant, OfHalfAnIdentityIsABearerToken)
{
    GiveIdentity();
    identity->privateKey.reset();
    EXPECT_EQ(CheckSpec(), "none");
}

TEST_F(Grant, ForADelegateIsBoundToTheKeyOfTheDelegate)
{
    GiveIdentity();
    BindTo("foreign");
    spec.delegateTo = "proxy";
    token.delegationChain = {{PrincipalId("proxy", "example.com"), token.startDate}};
    EXPECT_EQ(CheckSpec(), "none");
}

TEST_F(Grant, IsOfTheUserWhoAuthenticated)
{
    EXPECT_EQ(CheckUser("JDoe"), "none");
    EXPECT_EQ(CheckUser("jdoe@EXAMPLE.com"), "none");
    EXPECT_EQ(CheckUser("CORP\\jdoe"), "none");
    EXPECT_EQ(
        CheckUser("root"),
        Other("its subject is {Name: jdoe; Domain:example.com}, and it was asked for by or for "
              "root"));
    EXPECT_THAT(CheckUser("jdoe@other.com"), StartsWith(OtherToken));
    EXPECT_THAT(CheckUser("CORP\\root"), StartsWith(OtherToken));
    dialect.grantCheck.subject = false;
    EXPECT_EQ(CheckUser("root"), "none");
}

TEST_F(Grant, IsOfTheSubjectOfThePresentedToken)
{
    GiveIdentity();
    BindTo("client");
    EXPECT_EQ(CheckExchange(), "none");
    EXPECT_EQ(CheckRenewal(3600), "none");
    presented.subject = PrincipalId("jdoe", "other.com");
    EXPECT_THAT(CheckExchange(), HasSubstr("{Name: jdoe; Domain:other.com}"));
    EXPECT_THAT(CheckRenewal(3600), HasSubstr("{Name: jdoe; Domain:other.com}"));
}

TEST_F(Grant, OnBehalfOfSomebodyIsThatOnesAndToActAsSomebodyIsNot)
{
    GiveIdentity();
    BindTo("client");
    presented.subject = PrincipalId("other", "example.com");
    dialect.presentedToken = PresentedTokenForm::ON_BEHALF_OF;
    EXPECT_THAT(CheckExchange(), StartsWith(OtherToken));
    dialect.presentedToken = PresentedTokenForm::ACT_AS;
    EXPECT_EQ(CheckExchange(), "none");
    EXPECT_THAT(CheckRenewal(3600), StartsWith(OtherToken));
}

TEST_F(Grant, IsForTheAudienceThatWasAskedFor)
{
    token.audience = {"urn:a"};
    EXPECT_EQ(CheckSpec(), "none");
    spec.audienceRestriction = {"urn:a"};
    EXPECT_EQ(CheckSpec(), "none");
    spec.audienceRestriction = {"urn:a", "urn:b"};
    EXPECT_EQ(CheckSpec(), Other("it is for urn:a, and was asked for urn:a, urn:b"));
    spec.audienceRestriction = {"urn:b"};
    EXPECT_THAT(CheckSpec(), StartsWith(OtherToken));
    token.audience.clear();
    EXPECT_EQ(CheckSpec(), Other("it is for everybody, and was asked for urn:b"));
    dialect.grantCheck.audience = false;
    EXPECT_EQ(CheckSpec(), "none");
}

TEST_F(Grant, IsForNobodyElseThanAsked)
{
    spec.audienceRestriction = {"urn:a"};
    token.audience = {"urn:a", "urn:b"};
    EXPECT_EQ(CheckSpec(), Other("it is for urn:a, urn:b, and was asked for urn:a"));
}

TEST_F(Grant, KeepsItsAudienceWhenItIsRenewed)
{
    BindTo("client");
    presented.audience = {"urn:a"};
    EXPECT_EQ(CheckRenewal(3600), Other("it is for everybody, and was asked for urn:a"));
    token.audience = {"urn:a"};
    EXPECT_EQ(CheckRenewal(3600), "none");
}

TEST_F(Grant, HasTheDelegateThatWasAskedForAndNoOther)
{
    const Delegate proxy{PrincipalId("proxy", "example.com"), token.startDate};
    token.delegationChain = {proxy};
    EXPECT_EQ(CheckSpec(), Other("it has 1 delegates that are not the ones asked for"));
    spec.delegateTo = "Proxy@example.com";
    EXPECT_EQ(CheckSpec(), "none");
    token.delegationChain = {{PrincipalId("x", "example.com"), token.startDate}, proxy};
    EXPECT_EQ(CheckSpec(), Other("it has 2 delegates that are not the ones asked for"));
    token.delegationChain = {proxy};
    spec.delegateTo = "other";
    EXPECT_EQ(
        CheckSpec(),
        Other("its delegate is {Name: proxy; Domain:example.com}, and asked for was other"));
    token.delegationChain.clear();
    EXPECT_EQ(CheckSpec(), Other("it has 0 delegates that are not the ones asked for"));
    dialect.grantCheck.delegation = false;
    EXPECT_EQ(CheckSpec(), "none");
}

TEST_F(Grant, KeepsTheDelegatesOfThePresentedToken)
{
    const Delegate first{PrincipalId("first", "example.com"), token.startDate};
    const Delegate second{PrincipalId("second", "example.com"), token.startDate};
    presented.delegationChain = {first};
    EXPECT_THAT(CheckExchange(), HasSubstr("it has 0 delegates"));
    token.delegationChain = {first};
    EXPECT_EQ(CheckExchange(), "none");
    spec.delegateTo = "second";
    token.delegationChain = {first, second};
    EXPECT_EQ(CheckExchange(), "none");
    token.delegationChain = {second, second};
    EXPECT_THAT(CheckExchange(), StartsWith(OtherToken));
}

TEST_F(Grant, IsDelegableOnlyIfThatWasAskedFor)
{
    token.delegable = true;
    EXPECT_EQ(CheckSpec(), Other("it is delegable"));
    spec.delegable = true;
    EXPECT_EQ(CheckSpec(), "none");
    token.delegable = false;
    EXPECT_EQ(CheckSpec(), Other("it is not delegable"));
    BindTo("client");
    token.delegable = true;
    EXPECT_EQ(CheckRenewal(3600), "none");
}

TEST_F(Grant, LivesNoLongerThanAskedForAndTheTolerance)
{
    spec.tokenLifetimeSec = 3000;
    EXPECT_EQ(CheckSpec(), "none");
    spec.tokenLifetimeSec = 2999;
    EXPECT_EQ(CheckSpec(), Other("it ends in 3600 seconds, and was asked for with 2999"));
    dialect.reading = TokenReading();
    dialect.reading->rules.clockToleranceSec = 601;
    EXPECT_EQ(CheckSpec(), "none");
    dialect.reading->rules.clockToleranceSec = 600;
    dialect.grantCheck.lifetime = false;
    EXPECT_EQ(CheckSpec(), "none");
}

TEST_F(Grant, LivesNoLongerThanAskedForWhenItIsRenewed)
{
    BindTo("client");
    EXPECT_EQ(CheckRenewal(3000), "none");
    EXPECT_EQ(CheckRenewal(2999), Other("it ends in 3600 seconds, and was asked for with 2999"));
}
