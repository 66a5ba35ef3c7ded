#include "ssoClient/SecurityTokenService.h"

#include "serviceFakes.h"
#include "ssoClient/GssNegotiationContext.h"
#include "ssoClient/client/GssNegotiationContextImpl.h"
#include "ssoClient/client/SecurityTokenServiceImpl.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Failure.h"
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
            dialect};
    }

    ServiceDialect dialect = ServiceDialect::ApacheCxf();
    boost::optional<HolderOfKeyConfig> identity;
    TokenSpec spec;
    boost::shared_ptr<FakeTransport> transport = boost::make_shared<FakeTransport>();
    FixedClock clock{"2024-05-06T12:00:00Z"};
};

class DialectReading : public Dialect
{};

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
        dialect);
    EXPECT_EQ(context.NegotiateToken(Leg{1}).token->GetSubject().GetName(), "alice");
}
