#include "ssoClient/SecurityTokenService.h"

#include "serviceFakes.h"
#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/client/GssNegotiationContextImpl.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Failure.h"
#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::HasSubstr;
using testing::StartsWith;

namespace {

/** A service that speaks a dialect, and answers with an assertion of the test data. */
class Dialect : public testing::Test
{
protected:
    Dialect() { spec.tokenLifetimeSec = 3600; }

    void Answer(const std::string& assertion)
    {
        transport->reply = "<E><Body><RequestSecurityTokenResponse><RequestedSecurityToken>"
                           + ReadTestData("assertions/accepted/" + assertion + ".xml")
                           + "</RequestedSecurityToken></RequestSecurityTokenResponse></Body></E>";
    }

    SecurityTokenServiceImpl GetService() const
    {
        return {
            boost::make_shared<RequestBuilderImpl>(identity, RequestForm{dialect, "", boost::none}),
            transport,
            boost::make_shared<ResponseHandlerImpl>(ReplyForm{dialect, FaultObserver()}),
            GetTestCertificates("sts"),
            dialect,
            identity};
    }

    ServiceDialect dialect = ServiceDialect::ApacheCxf();
    boost::optional<HolderOfKeyConfig> identity;
    TokenSpec spec;
    boost::shared_ptr<FakeTransport> transport = boost::make_shared<FakeTransport>();
    FixedClock clock{"2024-05-06T12:00:00Z"};
};

class DialectReading : public Dialect
{};
class DialectGrant : public Dialect
{
protected:
    DialectGrant() { identity = MakeIdentity("client"); }

    static HolderOfKeyConfig MakeIdentity(const std::string& name)
    {
        return {GetTestKey(name), GetTestCertificates(name).front()};
    }

    std::string GetCertificateFailure() const
    {
        return GetFailure([this] { GetService().AcquireTokenByCertificate(spec); });
    }
};

constexpr char IssuedAnother[] =
    "SsoException: The service issued another token than was asked for: ";

} // namespace

TEST_F(DialectReading, ReadsTheTokenByItsRulesAndMapping)
{
    Answer("cxf-bearer-rsa");
    const auto token = GetService().AcquireToken("alice", "s3cret", spec);
    EXPECT_EQ(token->GetSubject(), PrincipalId("alice", "http://cxf.apache.org/sts"));
    ASSERT_NE(GetAssertion(*token), nullptr);
}

TEST_F(DialectReading, RefusesWhatItsRulesRefuse)
{
    Answer("cxf-bearer-rsa");
    dialect.reading->rules.audience = "https://other.example.com/";
    EXPECT_THAT(
        GetFailure([this] { GetService().AcquireToken("alice", "s3cret", spec); }),
        StartsWith("SsoException: "));
}

TEST_F(DialectReading, RefusesASubjectThatNoRuleFits)
{
    Answer("cxf-bearer-rsa");
    dialect.reading->mapping.subjects.front().nameQualifier = "urn:other";
    EXPECT_THAT(
        GetFailure([this] { GetService().AcquireToken("alice", "s3cret", spec); }),
        StartsWith("SsoException: No rule fits the subject: "));
}

TEST_F(DialectReading, IsNarrowIfTheDialectDoesNotSayHow)
{
    Answer("cxf-bearer-rsa");
    dialect.reading = boost::none;
    EXPECT_THAT(
        GetFailure([this] { GetService().AcquireToken("alice", "s3cret", spec); }),
        StartsWith("SsoException: "));
}

TEST_F(DialectReading, IsThatOfStepwiseNegotiationsToo)
{
    transport->reply = "<E><Body><RequestSecurityTokenResponse Context=\"urn:c\">"
                       "<TokenType>urn:oasis:names:tc:SAML:2.0:assertion</TokenType>"
                       "<RequestedSecurityToken>"
                       + ReadTestData("assertions/accepted/cxf-bearer-rsa.xml")
                       + "</RequestedSecurityToken></RequestSecurityTokenResponse></Body></E>";
    InternalApi::GssNegotiationContextImpl context(
        spec,
        boost::make_shared<RequestBuilderImpl>(boost::none),
        transport->CreateSession(),
        boost::make_shared<ResponseHandlerImpl>(),
        GetTestCertificates("sts"),
        dialect,
        identity);
    EXPECT_EQ(context.NegotiateToken(Leg{1}).token->GetSubject().GetName(), "alice");
}

// Whoever answers with somebody else's token makes the caller act as that one.
TEST_F(DialectGrant, RefusesTheTokenOfAnotherUser)
{
    Answer("cxf-bearer-rsa");
    identity = boost::none;
    const auto acquire = [this](const char* user) {
        return GetFailure([&] { GetService().AcquireToken(user, "s3cret", spec); });
    };
    EXPECT_EQ(acquire("alice"), "none");
    EXPECT_THAT(acquire("bob"), StartsWith(IssuedAnother + std::string("its subject is ")));
    dialect.grantCheck.subject = false;
    EXPECT_EQ(acquire("bob"), "none");
}

TEST_F(DialectGrant, RefusesABearerTokenInThePlaceOfOneThatIsBound)
{
    Answer("cxf-bearer-rsa");
    EXPECT_EQ(GetCertificateFailure(), IssuedAnother + std::string("it is bound to no key"));
}

TEST_F(DialectGrant, RefusesATokenThatIsBoundToAnotherKey)
{
    Answer("cxf-holder-of-key-rsa");
    dialect.grantCheck.subject = false;
    EXPECT_EQ(GetCertificateFailure(), "none");
    identity = MakeIdentity("foreign");
    EXPECT_EQ(
        GetCertificateFailure(),
        IssuedAnother + std::string("it is bound to another key than the caller's"));
    dialect.grantCheck.key = false;
    EXPECT_EQ(GetCertificateFailure(), "none");
}

TEST_F(DialectGrant, ComparesTheNameOfTheCertificate)
{
    Answer("cxf-holder-of-key-rsa");
    EXPECT_EQ(
        GetCertificateFailure(),
        IssuedAnother
            + std::string("its subject is {Name: CN=service,O=Example; "
                          "Domain:http://cxf.apache.org/sts}, and it was asked for by or for "
                          "CN=solution-user,O=Example"));
}

// They were read in two ways, so that equal people may have different names.
TEST_F(DialectGrant, IsNotComparedWithTheSubjectOfANarrowToken)
{
    Answer("cxf-holder-of-key-rsa");
    FakeSamlToken presented;
    presented.xml = ReadTestData("tokens/accepted/holder-of-key.xml");
    EXPECT_EQ(GetFailure([&] { GetService().AcquireTokenByToken(presented, spec); }), "none");
}

TEST_F(DialectGrant, IsNotComparedWithoutADialect)
{
    transport->reply = "<E><Body><RequestSecurityTokenResponseCollection>"
                       "<RequestSecurityTokenResponse><RequestedSecurityToken>"
                       + ReadTestData("tokens/accepted/bearer.xml")
                       + "</RequestedSecurityToken></RequestSecurityTokenResponse>"
                         "</RequestSecurityTokenResponseCollection></Body></E>";
    const FixedClock then(WhenTokensAreValid);
    const auto acquire = [&](const boost::optional<ServiceDialect>& spoken) {
        const SecurityTokenServiceImpl service(
            boost::make_shared<RequestBuilderImpl>(identity),
            transport,
            boost::make_shared<ResponseHandlerImpl>(),
            GetTestCertificates("sts"),
            spoken,
            identity);
        return GetFailure([&] { service.AcquireTokenByCertificate(spec); });
    };
    EXPECT_EQ(acquire(boost::none), "none");
    EXPECT_EQ(
        acquire(ServiceDialect::Default()), IssuedAnother + std::string("it is bound to no key"));
}

TEST_F(DialectGrant, IsComparedInStepwiseNegotiationsToo)
{
    transport->reply = "<E><Body><RequestSecurityTokenResponse Context=\"urn:c\">"
                       "<TokenType>urn:oasis:names:tc:SAML:2.0:assertion</TokenType>"
                       "<RequestedSecurityToken>"
                       + ReadTestData("assertions/accepted/cxf-bearer-rsa.xml")
                       + "</RequestedSecurityToken></RequestSecurityTokenResponse></Body></E>";
    InternalApi::GssNegotiationContextImpl context(
        spec,
        boost::make_shared<RequestBuilderImpl>(identity),
        transport->CreateSession(),
        boost::make_shared<ResponseHandlerImpl>(),
        GetTestCertificates("sts"),
        dialect,
        identity);
    EXPECT_EQ(
        GetFailure([&] { context.NegotiateToken(Leg{1}); }),
        IssuedAnother + std::string("it is bound to no key"));
}
