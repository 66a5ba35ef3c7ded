#include "Harness.h"

#include "ssoClient/Exceptions.h"
#include "ssoClient/GssNegotiationContext.h"
#include "ssoClientGss/Exceptions.h"
#include "ssoClientGss/KerberosNegotiationHandler.h"
#include "support/Failure.h"
#include "support/Initiator.h"
#include "support/TestData.h"
#include "support/TestKdc.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gmock/gmock.h>

#include <future>

// A Kerberos ticket becomes a token: a real KDC, the Kerberos library on both sides, and HTTPS
// between them.

using namespace SsoClient;
using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

namespace {

class Negotiation : public testing::Test
{
protected:
    static void SetUpTestSuite() { kdc = std::make_unique<Testing::TestKdc>(); }
    static void TearDownTestSuite() { kdc.reset(); }

    static DevSts::Options MakeOptions(const StateDir& state)
    {
        DevSts::Options options = MakeServerOptions(state, false);
        options.keytab = kdc->GetFile("service.keytab");
        return options;
    }

    Negotiation()
        : server(MakeOptions(state))
    {
        server.Start();
        config.url = server.Url();
        config.trustedCertificates = GetTestCertificates("sts");
        Quillon::Ssl::SSLContextOptions options;
        options.useSystemAuthorities = false;
        options.authorities = Quillon::Crypto::ParsePemCertificates(state.Read("ca.pem"));
        sslContext = CreateSSLContext(options);
        config.sslContext = sslContext.get();
    }

    ServicePtr MakeService(bool hasIdentity = false) const
    {
        SecurityTokenServiceConfig own = config;
        if (hasIdentity) {
            own.holderOfKeyConfig = MakeIdentity();
        }
        return CreateSecurityTokenService(own);
    }

    boost::shared_ptr<NegotiationHandler> MakeHandler(const std::string& principal) const
    {
        Gss::KerberosOptions options;
        options.url = config.url;
        options.keytab = kdc->GetFile(principal + ".keytab");
        options.principal = principal;
        return CreateKerberosNegotiationHandler(options);
    }

    static std::unique_ptr<Testing::TestKdc> kdc;

    StateDir state;
    FixedClock clock{Now};
    DevSts::Server server;
    SecurityTokenServiceConfig config;
    Quillon::Ref<Quillon::Ssl::SSLContext> sslContext;
};

std::unique_ptr<Testing::TestKdc> Negotiation::kdc;

/**
 * A client that wants Kerberos in the style of DCE, in which it answers the service's leg once
 * more before the service is satisfied.
 */
class ThreeLegHandler final : public NegotiationHandler
{
public:
    explicit ThreeLegHandler(const std::string& ccache)
        : _client(ccache, "HTTP/127.0.0.1@EXAMPLE.TEST", GSS_C_MUTUAL_FLAG | GSS_C_DCE_STYLE)
    {}

    boost::shared_ptr<Leg> Negotiate(const Leg& serverLeg) override
    {
        ++calls;
        const std::string leg = _client.Step({serverLeg.begin(), serverLeg.end()});
        return boost::make_shared<Leg>(leg.begin(), leg.end());
    }

    int calls = 0;

private:
    Testing::Initiator _client;
};

std::string GetHeader(const DevSts::ReceivedRequest& request, const std::string& name)
{
    const auto header = request.headers.find(name);
    return header == request.headers.end() ? "" : header->second;
}

} // namespace

TEST_F(Negotiation, TurnsATicketIntoAToken)
{
    const TokenPtr token = MakeService()->AcquireTokenByGSS(MakeSpec(), *MakeHandler("alice"));
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    EXPECT_EQ(GetLifetimeSec(*token), 300);
    EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::CONFIRM_BEARER);
}

TEST_F(Negotiation, TakesTheTicketFromACache)
{
    Gss::KerberosOptions options;
    options.url = config.url;
    options.ccache = kdc->GetFile("alice.ccache");
    kdc->LogOn("alice", options.ccache);
    const TokenPtr token =
        MakeService()->AcquireTokenByGSS(MakeSpec(), *CreateKerberosNegotiationHandler(options));
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
}

TEST_F(Negotiation, GivesAHolderOfKeyTokenToAServiceWithAnIdentity)
{
    const TokenPtr token = MakeService(true)->AcquireTokenByGSS(MakeSpec(), *MakeHandler("alice"));
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::CONFIRM_HOLDER_OF_KEY);
    EXPECT_EQ(
        token->GetConfirmationCertificate()->GetEncoded(),
        MakeIdentity().certificate->GetEncoded());
}

TEST_F(Negotiation, EndsWithoutAWarning)
{
    LogRecorder log;
    MakeService()->AcquireTokenByGSS(MakeSpec(), *MakeHandler("alice"));
    EXPECT_THAT(
        log.TakeLines(), AllOf(testing::SizeIs(4), testing::Each(StartsWith("SsoClient[64]: "))));
}

TEST_F(Negotiation, GoesOnForAsManyLegsAsItTakes)
{
    const std::string ccache = kdc->GetFile("legs.ccache");
    kdc->LogOn("alice", ccache);
    ThreeLegHandler handler(ccache);
    const TokenPtr token = MakeService(true)->AcquireTokenByGSS(MakeSpec(), handler);
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
    EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::CONFIRM_HOLDER_OF_KEY);
    EXPECT_GE(handler.calls, 2);

    // The service took the second request for the first one's client by its cookie.
    const std::vector<DevSts::ReceivedRequest> requests = server.ReceivedRequests();
    ASSERT_EQ(requests.size(), 2U);
    EXPECT_EQ(GetHeader(requests[0], "Cookie"), "");
    EXPECT_NE(GetHeader(requests[1], "Cookie"), "");
    EXPECT_THAT(GetHeader(requests[0], "SOAPAction"), HasSubstr("/RST/Issue"));
    EXPECT_THAT(GetHeader(requests[1], "SOAPAction"), HasSubstr("/RSTR/Issue"));
}

TEST_F(Negotiation, NoticesAForgedLastLeg)
{
    server.OnNextReply([](const DevSts::ReceivedRequest&, DevSts::Reply& reply) {
        const std::string before = "</wst:BinaryExchange>";
        const std::size_t end = reply.body.find(before);
        ASSERT_NE(end, std::string::npos);
        const std::size_t last = reply.body.find_last_not_of('=', end - 1);
        reply.body[last - 8] = reply.body[last - 8] == 'A' ? 'B' : 'A';
    });
    EXPECT_THROW(
        MakeService()->AcquireTokenByGSS(MakeSpec(), *MakeHandler("alice")),
        Gss::NegotiationException);
}

TEST_F(Negotiation, RunsAsynchronously)
{
    std::promise<TokenPtr> promise;
    MakeService()->AcquireTokenByGssAsync(
        MakeSpec(), MakeHandler("alice"), [&](const TokenPtr& token, const Quillon::Exception*) {
            promise.set_value(token);
        });
    const TokenPtr token = promise.get_future().get();
    ASSERT_NE(token, nullptr);
    EXPECT_EQ(token->GetSubject(), Alice());
}

TEST_F(Negotiation, RunsOneLegAtATime)
{
    const auto context = InternalApi::CreateGssNegotiationContext(config, MakeSpec());
    const auto handler = MakeHandler("alice");
    InternalApi::NegotiationResult result;
    result.leg = boost::make_shared<Leg>();
    while (result.token == nullptr) {
        result = context->NegotiateToken(*handler->Negotiate(*result.leg));
    }
    EXPECT_EQ(result.token->GetSubject(), Alice());
    EXPECT_FALSE(result.leg->empty());
    EXPECT_NO_THROW(handler->Negotiate(*result.leg));
}

TEST_F(Negotiation, ReportsAClientThatTheServiceDoesNotKnow)
{
    EXPECT_THAT(
        GetFailure([&] { MakeService()->AcquireTokenByGSS(MakeSpec(), *MakeHandler("mallory")); }),
        AllOf(
            StartsWith("InvalidCredentialsException: Authentication failed: "),
            HasSubstr("mallory@EXAMPLE.TEST")));
}

TEST_F(Negotiation, ReportsAServiceNameThatTheKdcDoesNotKnow)
{
    Gss::KerberosOptions options;
    options.url = config.url;
    options.service = "nosuch@127.0.0.1";
    options.keytab = kdc->GetFile("alice.keytab");
    options.principal = "alice";
    EXPECT_THAT(
        GetFailure([&] {
            MakeService()->AcquireTokenByGSS(
                MakeSpec(), *CreateKerberosNegotiationHandler(options));
        }),
        AllOf(
            StartsWith("NegotiationException: "),
            HasSubstr("nosuch@127.0.0.1"),
            HasSubstr("Server nosuch/127.0.0.1@EXAMPLE.TEST not found in Kerberos database")));
    EXPECT_TRUE(server.ReceivedRequests().empty());
}

TEST_F(Negotiation, ReportsThatThereIsNoTicket)
{
    Gss::KerberosOptions options;
    options.url = config.url;
    options.ccache = kdc->GetFile("nothing");
    EXPECT_THAT(
        GetFailure([&] {
            MakeService()->AcquireTokenByGSS(
                MakeSpec(), *CreateKerberosNegotiationHandler(options));
        }),
        AllOf(StartsWith("NegotiationException: "), HasSubstr("No credentials cache found")));
}

TEST_F(Negotiation, ReportsThatTheServiceDoesNotNegotiate)
{
    DevSts::Server other(MakeServerOptions(state, false));
    other.Start();
    SecurityTokenServiceConfig own = config;
    own.url = other.Url();
    EXPECT_THAT(
        GetFailure([&] {
            CreateSecurityTokenService(own)->AcquireTokenByGSS(MakeSpec(), *MakeHandler("alice"));
        }),
        "SsoException: Unexpected SOAP fault: wst:InvalidRequest; request failed.");
}
