#include "NegotiationHarness.h"
#include "Requests.h"
#include "SignedRequests.h"

#include <filesystem>

namespace DevStsTests {

namespace {

using RefusedNegotiation = NegotiationTest;

const std::string Unspecified = "The negotiation has failed: Unspecified GSS failure.  Minor code "
                                "may provide more information: ";
const std::string OtherMechanism =
    "The negotiation has failed: Only SPNEGO with Kerberos inside is negotiated: ";

TEST_F(RefusedNegotiation, UnknownPrincipalIsNamed)
{
    Initiator mallory(Realm::Shared().Tickets("mallory"), ServicePrincipal);
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(mallory.Step())), "wst:FailedAuthentication"),
        "The principal 'mallory@EXAMPLE.TEST' belongs to no known user");
}

TEST_F(RefusedNegotiation, TicketForAnotherServiceIsRefused)
{
    Initiator alice(Realm::Shared().Tickets("alice"), "mallory@EXAMPLE.TEST");
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(alice.Step())), "wst:FailedAuthentication"),
        Unspecified
            + "Request ticket server mallory@EXAMPLE.TEST not found in keytab (ticket kvno 2)");
}

TEST_F(RefusedNegotiation, ReplayedFirstLegIsRefused)
{
    Initiator alice = Alice();
    const std::string request = FirstRequest(alice.Step());
    EXPECT_EQ(PostIssue(request).status, 200);
    EXPECT_EQ(
        FaultText(PostIssue(request), "wst:FailedAuthentication"),
        Unspecified + "Request is a replay");
}

TEST_F(RefusedNegotiation, ReplaysAreRememberedInTheStateDirectory)
{
    Initiator alice = Alice();
    PostIssue(FirstRequest(alice.Step()));
    const std::filesystem::path replays = NegotiationState() / "kerberos.replays";
    EXPECT_TRUE(std::filesystem::is_regular_file(replays));
    EXPECT_EQ(
        std::filesystem::status(replays).permissions(),
        std::filesystem::perms::owner_read | std::filesystem::perms::owner_write);
}

TEST_F(RefusedNegotiation, ChangedTicketIsRefused)
{
    Initiator alice = Alice();
    std::string leg = alice.Step();
    leg[leg.size() / 2] = static_cast<char>(leg[leg.size() / 2] ^ 1);
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(leg)), "wst:FailedAuthentication"),
        Unspecified
            + "Request ticket server HTTP/127.0.0.1@EXAMPLE.TEST kvno 2 enctype aes256-cts found "
              "in keytab but cannot decrypt ticket");
}

TEST_F(RefusedNegotiation, CutLegIsRefused)
{
    Initiator alice = Alice();
    std::string leg = alice.Step();
    leg.resize(leg.size() / 2);
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(leg)), "wst:FailedAuthentication"),
        Unspecified + "Token header is malformed or corrupt");
}

TEST_F(RefusedNegotiation, GarbageIsRefused)
{
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest("garbage")), "wst:FailedAuthentication"),
        "The negotiation has failed: Invalid token was supplied");
}

TEST_F(RefusedNegotiation, KerberosWithoutSpnegoIsRefused)
{
    Initiator alice(
        Realm::Shared().Tickets("alice"), ServicePrincipal, GSS_C_MUTUAL_FLAG, Mechanism::KERBEROS);
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(alice.Step())), "wst:FailedAuthentication"),
        OtherMechanism
            + "No credentials were supplied, or the credentials were unavailable or inaccessible");
}

TEST_F(RefusedNegotiation, NtlmIsRefused)
{
    const std::string negotiate("NTLMSSP\0\1\0\0\0\7\2\0\0", 16);
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(negotiate)), "wst:FailedAuthentication"),
        OtherMechanism + "An unsupported mechanism was requested");
}

TEST_F(RefusedNegotiation, OfferOfNtlmAloneIsRefused)
{
    const std::string spnego = "\x06\x06\x2b\x06\x01\x05\x05\x02";
    const std::string ntlm = "\x06\x0a\x2b\x06\x01\x04\x01\x82\x37\x02\x02\x0a";
    const std::string offer = "\x60\x1c" + spnego + "\xa0\x12\x30\x10\xa0\x0e\x30\x0c" + ntlm;
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(offer)), "wst:FailedAuthentication"),
        OtherMechanism + "An unsupported mechanism was requested");
}

TEST_F(RefusedNegotiation, OfferOfIakerbAloneIsRefused)
{
    const std::string spnego = "\x06\x06\x2b\x06\x01\x05\x05\x02";
    const std::string iakerb = "\x06\x06\x2b\x06\x01\x05\x02\x05";
    const std::string offer = "\x60\x18" + spnego + "\xa0\x0e\x30\x0c\xa0\x0a\x30\x08" + iakerb;
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(offer)), "wst:FailedAuthentication"),
        OtherMechanism + "An unsupported mechanism was requested");
}

TEST_F(RefusedNegotiation, PasswordInTheHeaderIsRefused)
{
    Initiator alice = Alice();
    const HttpResult reply = PostIssue(
        Envelope(UsernameToken("alice@example.test", "alice-secret"), FirstBody(alice.Step())));
    EXPECT_EQ(
        FaultText(reply, "wst:InvalidRequest"),
        "A negotiation carries no password and no token in its header");
}

TEST_F(RefusedNegotiation, TokenInTheHeaderIsRefused)
{
    Initiator alice = Alice();
    const std::string assertion = AssertionIn(PostIssue(PasswordRequest()).body);
    EXPECT_EQ(
        FaultText(PostIssue(Envelope(assertion, FirstBody(alice.Step()))), "wst:InvalidRequest"),
        "A negotiation carries no password and no token in its header");
}

TEST_F(RefusedNegotiation, CertificateWithoutSignatureIsRefused)
{
    Initiator alice = Alice();
    EXPECT_EQ(
        FaultText(
            PostIssue(Envelope(BinaryToken(Client()), FirstBody(alice.Step()))),
            "wst:InvalidRequest"),
        "The header carries a certificate but no signature");
}

const char* const OnlyTimestamp =
    "A continued negotiation carries nothing but a timestamp in its header";

TEST_F(RefusedNegotiation, SignedContinuedRequestIsRefused)
{
    const HttpResult first = BeginToWait();
    const std::string body =
        "<wst:RequestSecurityTokenResponse xmlns:wst=\"" + std::string(Ns::Wst) + "\" "
        + NextBody(ContextOf(first), "leg")
              .substr(std::string("<wst:RequestSecurityTokenResponse ").size());
    EXPECT_EQ(
        FaultText(
            PostNext(Sign(CertificateTemplate("", body)), CookieOf(first)), "wst:InvalidRequest"),
        OnlyTimestamp);
}

TEST_F(RefusedNegotiation, PasswordInTheHeaderOfContinuedRequestIsRefused)
{
    const HttpResult first = BeginToWait();
    const std::string request = Envelope(
        UsernameToken("alice@example.test", "alice-secret"), NextBody(ContextOf(first), "leg"));
    EXPECT_EQ(FaultText(PostNext(request, CookieOf(first)), "wst:InvalidRequest"), OnlyTimestamp);
}

TEST_F(RefusedNegotiation, CertificateInTheHeaderOfContinuedRequestIsRefused)
{
    const HttpResult first = BeginToWait();
    const std::string request = Envelope(BinaryToken(Client()), NextBody(ContextOf(first), "leg"));
    EXPECT_EQ(FaultText(PostNext(request, CookieOf(first)), "wst:InvalidRequest"), OnlyTimestamp);
}

TEST_F(RefusedNegotiation, PasswordRequestsAreAnsweredBesides)
{
    EXPECT_EQ(PostIssue(PasswordRequest()).status, 200);
}

using ServerWithoutKeytab = ServerTest;

const char* const NoKeytab = "This token service negotiates only if it is started with --keytab";

TEST_F(ServerWithoutKeytab, FirstLegIsRefused)
{
    EXPECT_EQ(
        FaultText(PostIssue(FirstRequest(OfferOfKerberos())), "wst:InvalidRequest"), NoKeytab);
}

TEST_F(ServerWithoutKeytab, FurtherLegIsRefused)
{
    const HttpResult reply = Post(
        std::string(Ns::Wst) + "/RSTR/Issue",
        NextRequest("urn:uuid:5a3c1f6e-0d4b-4c57-9d3e-2f8a7b6c5d4e", "leg"));
    EXPECT_EQ(FaultText(reply, "wst:InvalidRequest"), NoKeytab);
}

std::string KeytabError(const std::filesystem::path& keytab)
{
    DevSts::Options options;
    options.stateDir = SharedState();
    options.keytab = keytab;
    try {
        const DevSts::Server server(options);
    } catch (const std::runtime_error& error) {
        return error.what();
    }
    return "no error";
}

TEST(ServerWithBadKeytab, MissingFileIsReported)
{
    const TempDir dir;
    const std::string keytab = (dir.Path() / "keytab").string();
    EXPECT_EQ(
        KeytabError(keytab),
        "The keytab " + keytab
            + " cannot be used: No credentials were supplied, or the credentials were unavailable "
              "or inaccessible: Keytab FILE:"
            + keytab + " is nonexistent or empty");
}

TEST(ServerWithBadKeytab, OtherFileIsReported)
{
    const TempDir dir;
    const std::filesystem::path keytab = dir.Path() / "keytab";
    WriteText(keytab, "no keytab");
    EXPECT_EQ(
        KeytabError(keytab).substr(0, 15 + keytab.string().size()),
        "The keytab " + keytab.string() + " can");
}

} // namespace

} // namespace DevStsTests
