#include "Harness.h"

#include "quillon/crypto/Certificate.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"
#include "support/TestData.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using testing::HasSubstr;
using testing::Not;

namespace {

class AcquireTokenAtSts : public HttpsStsTest
{};
class AcquireTokenByCertificateAtSts : public HttpsStsTest
{};
class AcquireTokenByTokenAtSts : public HttpsStsTest
{
protected:
    /** A token of Alice for the service user, which may go further. */
    TokenPtr AcquireDelegated() const
    {
        TokenSpec spec = MakeSpec();
        spec.delegable = true;
        spec.delegateTo = ServiceName;
        return service->AcquireToken("alice@example.test", AlicesPassword, spec);
    }

    ServicePtr service = MakeService();
};
class AcquireTokenOverHttp : public HttpStsTest
{};

const std::vector<Advice> SomeAdvice{
    {"urn:example:source",
     {{"urn:example:name", {"first", "second"}}, {"urn:example:other", {"<&>"}}}},
    {"urn:example:empty", {{"urn:example:name", {}}}}};

TokenSpec MakeRichSpec()
{
    TokenSpec spec = MakeSpec(1800);
    spec.renewable = true;
    spec.delegable = true;
    spec.audienceRestriction = {"urn:example:a", "https://relying.example.test/?x=1&y=2"};
    spec.advice = SomeAdvice;
    return spec;
}

void ExpectRichToken(const SamlToken& token)
{
    EXPECT_EQ(GetLifetimeSec(token), 1800);
    EXPECT_EQ(token.GetStartDate(), Quillon::System::DateTime(Now));
    EXPECT_TRUE(token.IsRenewable());
    EXPECT_TRUE(token.IsDelegable());
    std::set<std::string> audience;
    token.GetAudience(audience);
    EXPECT_EQ(audience, MakeRichSpec().audienceRestriction);
    std::vector<Advice> advice;
    token.GetAdvice(advice);
    ASSERT_EQ(advice.size(), SomeAdvice.size());
    for (std::size_t i = 0; i < advice.size(); ++i) {
        EXPECT_EQ(advice[i].source, SomeAdvice[i].source);
        ASSERT_EQ(advice[i].attributes.size(), SomeAdvice[i].attributes.size());
        for (std::size_t j = 0; j < advice[i].attributes.size(); ++j) {
            EXPECT_EQ(advice[i].attributes[j].name, SomeAdvice[i].attributes[j].name);
            EXPECT_EQ(advice[i].attributes[j].values, SomeAdvice[i].attributes[j].values);
        }
    }
}

void ExpectModestToken(const SamlToken& token)
{
    EXPECT_EQ(GetLifetimeSec(token), 300);
    EXPECT_FALSE(token.IsRenewable());
    EXPECT_FALSE(token.IsDelegable());
    std::set<std::string> audience{"to be replaced"};
    token.GetAudience(audience);
    EXPECT_TRUE(audience.empty());
    std::vector<Advice> advice(1);
    token.GetAdvice(advice);
    EXPECT_TRUE(advice.empty());
    std::vector<Delegate> chain{{Alice(), Quillon::System::DateTime()}};
    token.GetDelegationChain(chain);
    EXPECT_TRUE(chain.empty());
}

void ExpectBearer(const SamlToken& token)
{
    EXPECT_EQ(token.GetConfirmationMethod(), SamlToken::CONFIRM_BEARER);
    EXPECT_EQ(token.GetConfirmationCertificate(), nullptr);
}

void ExpectBoundTo(const std::string& certificateName, const SamlToken& token)
{
    EXPECT_EQ(token.GetConfirmationMethod(), SamlToken::CONFIRM_HOLDER_OF_KEY);
    ASSERT_NE(token.GetConfirmationCertificate(), nullptr);
    EXPECT_EQ(
        token.GetConfirmationCertificate()->GetEncoded(),
        GetTestCertificates(certificateName).front()->GetEncoded());
}

/** The delegates of `token`, in order, each of whom became one at `Now`. */
std::vector<PrincipalId> GetDelegates(const SamlToken& token)
{
    std::vector<Delegate> chain;
    token.GetDelegationChain(chain);
    std::vector<PrincipalId> names;
    for (const Delegate& delegate : chain) {
        EXPECT_EQ(delegate.delegationDate, Quillon::System::DateTime(Now));
        names.push_back(delegate.subject);
    }
    return names;
}

} // namespace

TEST_F(AcquireTokenAtSts, GivesTheUserThatLoggedOn)
{
    const TokenPtr token =
        MakeBearerService()->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    EXPECT_FALSE(token->IsSolution());
    std::pair<std::string, std::string> name;
    token->GetFullName(name);
    EXPECT_EQ(name, std::make_pair(std::string("Alice"), std::string("Archer")));
    std::vector<PrincipalId> groups;
    token->GetGroups(groups);
    EXPECT_EQ(
        groups, (std::vector<PrincipalId>{{"Administrators", "EXAMPLE"}, {"Users", "EXAMPLE"}}));
}

TEST_F(AcquireTokenAtSts, GivesBearerTokenWithoutIdentity)
{
    const TokenPtr token =
        MakeBearerService()->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
    ASSERT_NE(token, nullptr);
    ExpectBearer(*token);
    ExpectModestToken(*token);
}

TEST_F(AcquireTokenAtSts, GivesTokenBoundToTheIdentity)
{
    const TokenPtr token =
        MakeService()->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
    ASSERT_NE(token, nullptr);
    ExpectBoundTo("client", *token);
    EXPECT_EQ(token->GetSubject(), Alice());
    ExpectModestToken(*token);
}

TEST_F(AcquireTokenAtSts, GivesBearerTokenIfTheSpecAsksForOne)
{
    TokenSpec spec = MakeSpec();
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    const TokenPtr token = MakeService()->AcquireToken("alice@example.test", AlicesPassword, spec);
    ASSERT_NE(token, nullptr);
    ExpectBearer(*token);
    EXPECT_THAT(server.ReceivedRequests().back().body, Not(HasSubstr("ds:Signature")));
}

TEST_F(AcquireTokenAtSts, GivesAllThatTheSpecAsksFor)
{
    const TokenPtr token =
        MakeBearerService()->AcquireToken("alice@example.test", AlicesPassword, MakeRichSpec());
    ASSERT_NE(token, nullptr);
    ExpectRichToken(*token);
}

TEST_F(AcquireTokenAtSts, GivesTokenBoundToTheKeyOfTheDelegate)
{
    TokenSpec spec = MakeSpec();
    spec.delegateTo = ServiceName;
    const TokenPtr token = MakeService()->AcquireToken("alice@example.test", AlicesPassword, spec);
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    EXPECT_EQ(GetDelegates(*token), std::vector<PrincipalId>{ServiceUser()});
    ExpectBoundTo("client", *token);
    EXPECT_THAT(server.ReceivedRequests().back().body, Not(HasSubstr("ds:Signature")));
}

TEST_F(AcquireTokenAtSts, GivesXmlThatVerifiesAgain)
{
    const TokenPtr token =
        MakeService()->AcquireToken("alice@example.test", AlicesPassword, MakeRichSpec());
    ASSERT_NE(token, nullptr);
    const TokenPtr again = CreateSamlToken(token->ToXml(), config.trustedCertificates);
    EXPECT_EQ(again->GetId(), token->GetId());
    EXPECT_THROW(
        CreateSamlToken(Replaced(token->ToXml(), "alice", "Alice"), config.trustedCertificates),
        InvalidSignatureException);
}

TEST_F(AcquireTokenAtSts, GivesAnotherTokenEachTime)
{
    const ServicePtr service = MakeBearerService();
    EXPECT_NE(
        service->AcquireToken("alice@example.test", AlicesPassword, MakeSpec())->GetId(),
        service->AcquireToken("alice@example.test", AlicesPassword, MakeSpec())->GetId());
}

TEST_F(AcquireTokenAtSts, WorksAfterTheConfigurationIsGone)
{
    const ServicePtr service = MakeBearerService();
    config = SecurityTokenServiceConfig();
    EXPECT_EQ(
        service->AcquireToken("alice@example.test", AlicesPassword, MakeSpec())->GetSubject(),
        Alice());
}

TEST_F(AcquireTokenAtSts, KeepsTheSslContextThatItsCallerDrops)
{
    const ServicePtr service = MakeBearerService();
    sslContext.reset();
    EXPECT_EQ(
        service->AcquireToken("alice@example.test", AlicesPassword, MakeSpec())->GetSubject(),
        Alice());
}

TEST_F(AcquireTokenByCertificateAtSts, GivesTheUserOfTheCertificate)
{
    const TokenPtr token = MakeService()->AcquireTokenByCertificate(MakeSpec());
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), ServiceUser());
    EXPECT_TRUE(token->IsSolution());
    ExpectBoundTo("client", *token);
    ExpectModestToken(*token);
}

TEST_F(AcquireTokenByCertificateAtSts, GivesAllThatTheSpecAsksFor)
{
    const TokenPtr token = MakeService()->AcquireTokenByCertificate(MakeRichSpec());
    ASSERT_NE(token, nullptr);
    ExpectRichToken(*token);
}

TEST_F(AcquireTokenByTokenAtSts, GivesTheSubjectOfTheToken)
{
    const TokenPtr presented =
        service->AcquireToken("alice@example.test", AlicesPassword, MakeRichSpec());
    const TokenPtr token = service->AcquireTokenByToken(*presented, MakeSpec());
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    EXPECT_NE(token->GetId(), presented->GetId());
    ExpectBoundTo("client", *token);
}

TEST_F(AcquireTokenByTokenAtSts, GivesAllThatTheSpecAsksFor)
{
    const TokenPtr presented =
        service->AcquireToken("alice@example.test", AlicesPassword, MakeRichSpec());
    const TokenPtr token = service->AcquireTokenByToken(*presented, MakeRichSpec());
    ASSERT_NE(token, nullptr);
    ExpectRichToken(*token);
}

TEST_F(AcquireTokenByTokenAtSts, GivesBearerTokenIfTheSpecAsksForOne)
{
    const TokenPtr presented =
        service->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
    TokenSpec spec = MakeSpec();
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    const TokenPtr token = service->AcquireTokenByToken(*presented, spec);
    ASSERT_NE(token, nullptr);
    ExpectBearer(*token);
}

TEST_F(AcquireTokenByTokenAtSts, TakesBearerTokenToo)
{
    const TokenPtr presented =
        MakeBearerService()->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
    const TokenPtr token = service->AcquireTokenByToken(*presented, MakeSpec());
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    ExpectBoundTo("client", *token);
}

TEST_F(AcquireTokenByTokenAtSts, KeepsTheDelegationChain)
{
    const TokenPtr token = service->AcquireTokenByToken(*AcquireDelegated(), MakeSpec());
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    EXPECT_EQ(GetDelegates(*token), std::vector<PrincipalId>{ServiceUser()});
}

TEST_F(AcquireTokenByTokenAtSts, GrowsTheDelegationChain)
{
    TokenSpec spec = MakeSpec();
    spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
    spec.delegateTo = "bob@example.test";
    const TokenPtr token = service->AcquireTokenByToken(*AcquireDelegated(), spec);
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    EXPECT_EQ(
        GetDelegates(*token), (std::vector<PrincipalId>{ServiceUser(), {"bob", "example.test"}}));
}

TEST_F(AcquireTokenOverHttp, NeedsNoSslContext)
{
    const ServicePtr service = MakeService();
    const TokenPtr token = service->AcquireToken("alice@example.test", AlicesPassword, MakeSpec());
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    ExpectBoundTo("client", *token);
}

TEST_F(AcquireTokenOverHttp, SendsTheHeadersOfSoap)
{
    MakeService()->AcquireTokenByCertificate(MakeSpec());
    const DevSts::ReceivedRequest request = server.ReceivedRequests().back();
    EXPECT_EQ(request.method, "POST");
    EXPECT_EQ(request.headers.find("Content-Type")->second, "text/xml");
    EXPECT_EQ(
        request.headers.find("SOAPAction")->second,
        "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue\"");
}
