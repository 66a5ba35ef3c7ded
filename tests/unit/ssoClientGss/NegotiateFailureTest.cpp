#include "ssoClientGss/KerberosNegotiationHandlerImpl.h"

#include "Acceptor.h"
#include "Der.h"
#include "Realm.h"
#include "support/Failure.h"

#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <unistd.h>

#include <filesystem>

using namespace SsoClient;
using namespace SsoClient::Gss;

namespace {

const Leg KerberosOid{0x06, 0x09, 0x2a, 0x86, 0x48, 0x86, 0xf7, 0x12, 0x01, 0x02, 0x02};
const Leg OtherOid{0x06, 0x0a, 0x2b, 0x06, 0x01, 0x04, 0x01, 0x82, 0x37, 0x02, 0x02, 0x0a};

/** The values of `negState` [RFC 4178 4.2.2]. */
enum NegState : unsigned char
{
    ACCEPT_COMPLETED,
    ACCEPT_INCOMPLETE,
    REJECT,
    REQUEST_MIC
};

/** A `NegTokenResp` [RFC 4178 4.2.2] of a state and what is already an element. */
Leg MakeResponse(NegState state, const Leg& elements = {})
{
    return Der::Write(
        0xa1,
        Der::Write(0x30, Der::Concat({Der::Write(0xa0, Der::Write(0x0a, {state})), elements})));
}

Leg MakeMechanism(const Leg& oid)
{
    return Der::Write(0xa1, oid);
}
Leg MakeToken(const Leg& token)
{
    return Der::Write(0xa2, Der::Write(0x04, token));
}
Leg MakeMic(const Leg& mic)
{
    return Der::Write(0xa3, Der::Write(0x04, mic));
}

/** The elements of a `NegTokenInit` in its GSS frame [RFC 2743 3.1]. */
Leg ReadInit(const Leg& leg)
{
    return Der::Find(Der::Find(Der::Find(leg, 0x60), 0xa0), 0x30);
}
Leg GetMechanisms(const Leg& init)
{
    return Der::Find(init, 0xa0);
}
Leg GetToken(const Leg& init)
{
    return Der::Find(Der::Find(init, 0xa2), 0x04);
}

#define NO_CREDENTIALS                                                                             \
    "No credentials were supplied, or the credentials were unavailable or inaccessible: "

const std::string NotAcceptable =
    "NegotiationException: The leg of the service 'HTTP@localhost' is not acceptable: ";
const std::string BadToken = "Invalid token was supplied";
const std::string UnspecifiedFailure =
    "Unspecified GSS failure.  Minor code may provide more information: ";
const std::string Over = "NegotiationException: The negotiation with the service 'HTTP@localhost' "
                         "is over; a handler serves only one";

/** The realm as a host would see it whose KDC is down. */
class UnreachableRealm
{
public:
    explicit UnreachableRealm(const Testing::TestKdc& kdc)
        : _file(kdc.GetFile("unreachable.conf"))
        , _configuration("KRB5_CONFIG", _file)
    {
        // A bound port on which nobody listens: no one else can take it.
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        auto* const generic = reinterpret_cast<sockaddr*>(&address);
        EXPECT_EQ(0, bind(_socket, generic, size));
        EXPECT_EQ(0, getsockname(_socket, generic, &size));
        std::ofstream(_file) << "[libdefaults]\n default_realm = EXAMPLE.TEST\n"
                             << " udp_preference_limit = 1\n dns_lookup_kdc = false\n"
                             << " dns_canonicalize_hostname = false\n"
                             << "[realms]\n EXAMPLE.TEST = {\n  kdc = 127.0.0.1:"
                             << ntohs(address.sin_port) << "\n }\n";
    }

    ~UnreachableRealm() { close(_socket); }

    UnreachableRealm(const UnreachableRealm&) = delete;
    UnreachableRealm& operator=(const UnreachableRealm&) = delete;

private:
    std::string _file;
    EnvironmentScope _configuration;
    int _socket = socket(AF_INET, SOCK_STREAM, 0);
};

class NegotiateFailure : public Realm
{
protected:
    static KerberosOptions WithCache(const std::string& ccache)
    {
        KerberosOptions options;
        options.service = "HTTP@localhost";
        options.ccache = ccache;
        return options;
    }

    static KerberosOptions WithKeytab(const std::string& keytab, const std::string& principal)
    {
        KerberosOptions options;
        options.service = "HTTP@localhost";
        options.keytab = keytab;
        options.principal = principal;
        return options;
    }

    static KerberosOptions WithService(const std::string& service)
    {
        KerberosOptions options = WithCache(kdc->GetFile("alice"));
        options.service = service;
        return options;
    }

    static std::string BeginWith(const KerberosOptions& options)
    {
        return GetFailure([&] { CreateKerberosNegotiationHandler(options)->Negotiate(Leg()); });
    }

    /** What becomes of a leg that `makeAnswer` makes of the client's first and the genuine one. */
    template <class MakeAnswer>
    static std::string AnswerWith(const MakeAnswer& makeAnswer)
    {
        const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
        Acceptor acceptor(*kdc);
        const Leg first = *handler->Negotiate(Leg());
        const Leg answer = makeAnswer(acceptor.Accept(first));
        return GetFailure([&] { handler->Negotiate(answer); });
    }
};

} // namespace

TEST_F(NegotiateFailure, OfAServiceThatTheKdcDoesNotKnowNamesIt)
{
    EXPECT_EQ(
        "NegotiationException: Cannot negotiate with the service 'HTTP@nowhere.example.test' using "
        "the credential cache '"
            + kdc->GetFile("alice")
            + "': Unspecified GSS failure.  Minor code may provide more information: Server "
              "HTTP/nowhere.example.test@EXAMPLE.TEST not found in Kerberos database",
        BeginWith(WithService("HTTP@nowhere.example.test")));
}

TEST_F(NegotiateFailure, OfAnUnknownServiceWithKeytabNamesKeytabAndPrincipal)
{
    KerberosOptions options = WithKeytab(kdc->GetFile("alice.keytab"), "alice");
    options.service = "HTTP/nowhere.example.test";
    EXPECT_EQ(
        "NegotiationException: Cannot negotiate with the service 'HTTP/nowhere.example.test' using "
        "the keytab '"
            + options.keytab
            + "' of 'alice': Unspecified GSS failure.  Minor code may provide more information: "
              "Server HTTP/nowhere.example.test@EXAMPLE.TEST not found in Kerberos database",
        BeginWith(options));
}

TEST_F(NegotiateFailure, OfAServiceOfAnUnknownRealmNamesTheRealm)
{
    EXPECT_EQ(
        "NegotiationException: Cannot negotiate with the service 'HTTP/localhost@ELSEWHERE.TEST' "
        "using the credential cache '"
            + kdc->GetFile("alice")
            + "': Unspecified GSS failure.  Minor code may provide more information: Server "
              "krbtgt/ELSEWHERE.TEST@EXAMPLE.TEST not found in Kerberos database",
        BeginWith(WithService("HTTP/localhost@ELSEWHERE.TEST")));
}

TEST_F(NegotiateFailure, OfAMalformedServicePrincipalNamesIt)
{
    EXPECT_EQ(
        "NegotiationException: Cannot negotiate with the service 'HTTP/a@b@c' using the credential "
        "cache '"
            + kdc->GetFile("alice")
            + "': Unspecified GSS failure.  Minor code may provide more information: Malformed "
              "representation of principal",
        BeginWith(WithService("HTTP/a@b@c")));
}

TEST_F(NegotiateFailure, WithoutCacheNamesIt)
{
    EXPECT_EQ(
        "NegotiationException: Cannot use the credential cache '/no/such/cache': " NO_CREDENTIALS
        "No credentials cache found (filename: /no/such/cache)",
        BeginWith(WithCache("/no/such/cache")));
}

// GSS would fill the cache of that name with the tickets of whoever is in the keytab.
TEST_F(NegotiateFailure, WithoutCacheDoesNotTakeTheHostsKeytab)
{
    const EnvironmentScope keytab("KRB5_CLIENT_KTNAME", kdc->GetFile("mallory.keytab"));
    const std::string cache = kdc->GetFile("not-there");
    EXPECT_EQ(
        "NegotiationException: Cannot use the credential cache '" + cache
            + "': " NO_CREDENTIALS "No credentials cache found (filename: " + cache + ")",
        BeginWith(WithCache(cache)));
    EXPECT_FALSE(std::filesystem::exists(cache));
}

TEST_F(NegotiateFailure, WithACacheOfUnknownTypeNamesIt)
{
    EXPECT_EQ(
        "NegotiationException: Cannot use the credential cache 'NOTYPE:x': " NO_CREDENTIALS
        "Unknown credential cache type",
        BeginWith(WithCache("NOTYPE:x")));
}

TEST_F(NegotiateFailure, WithWhatIsNoCacheNamesIt)
{
    const std::string keytab = kdc->GetFile("alice.keytab");
    EXPECT_EQ(
        "NegotiationException: Cannot use the credential cache '" + keytab
            + "': " NO_CREDENTIALS "Bad format in credentials cache (filename: " + keytab + ")",
        BeginWith(WithCache(keytab)));
}

TEST_F(NegotiateFailure, WithoutDefaultCredentialsSaysWhereTheyWereLookedFor)
{
    EXPECT_EQ(
        "NegotiationException: Cannot use the default credentials: " NO_CREDENTIALS
        "No Kerberos credentials available (default cache: FILE:"
            + kdc->GetFile("no-default-ccache") + ")",
        BeginWith(WithCache("")));
}

TEST_F(NegotiateFailure, WithAnExpiredTicketSaysSo)
{
    const std::string cache = kdc->GetFile("expired");
    CopyCache(kdc->GetFile("alice"), cache, [](krb5_creds& ticket) {
        ticket.times.authtime = 1000000000;
        ticket.times.starttime = 1000000000;
        ticket.times.endtime = 1000000001;
    });
    EXPECT_EQ(
        "NegotiationException: Cannot negotiate with the service 'HTTP@localhost' using the "
        "credential cache '"
            + cache
            + "': Unspecified GSS failure.  Minor code may provide more information: Ticket "
              "expired",
        BeginWith(WithCache(cache)));
}

TEST_F(NegotiateFailure, WithoutKeytabNamesIt)
{
    EXPECT_EQ(
        "NegotiationException: Cannot log on as 'alice' with the keytab '/no/keytab': Key table "
        "file '/no/keytab' not found",
        BeginWith(WithKeytab("/no/keytab", "alice")));
}

TEST_F(NegotiateFailure, WithAKeytabOfUnknownTypeNamesIt)
{
    EXPECT_EQ(
        "NegotiationException: Cannot log on as 'alice' with the keytab 'NOTYPE:x': Unknown Key "
        "table type",
        BeginWith(WithKeytab("NOTYPE:x", "alice")));
}

TEST_F(NegotiateFailure, WithWhatIsNoKeytabNamesIt)
{
    const std::string file = kdc->GetFile("krb5.conf");
    EXPECT_EQ(
        "NegotiationException: Cannot log on as 'alice' with the keytab '" + file
            + "': Unsupported key table format version number",
        BeginWith(WithKeytab(file, "alice")));
}

TEST_F(NegotiateFailure, WithAPrincipalThatIsNotInTheKeytabNamesBothAndAsksNoKdc)
{
    const UnreachableRealm realm(*kdc);
    const std::string keytab = kdc->GetFile("mallory.keytab");
    EXPECT_EQ(
        "NegotiationException: Cannot log on as 'alice' with the keytab '" + keytab
            + "': No key table entry found for alice@EXAMPLE.TEST",
        BeginWith(WithKeytab(keytab, "alice")));
}

TEST_F(NegotiateFailure, WithAMalformedPrincipalNamesIt)
{
    const std::string keytab = kdc->GetFile("alice.keytab");
    EXPECT_EQ(
        "NegotiationException: Cannot log on as 'a@b@c' with the keytab '" + keytab
            + "': Malformed representation of principal",
        BeginWith(WithKeytab(keytab, "a@b@c")));
}

TEST_F(NegotiateFailure, WithoutKdcSaysThatItCannotBeContacted)
{
    const std::string cache = kdc->GetFile("without-service-ticket");
    kdc->LogOn("alice", cache);
    const UnreachableRealm realm(*kdc);
    EXPECT_EQ(
        "NegotiationException: Cannot log on as 'alice' with the keytab '"
            + kdc->GetFile("alice.keytab") + "': Cannot contact any KDC for realm 'EXAMPLE.TEST'",
        BeginWith(WithKeytab(kdc->GetFile("alice.keytab"), "alice")));
    EXPECT_EQ(
        "NegotiationException: Cannot negotiate with the service 'HTTP@localhost' using the "
        "credential cache '"
            + cache
            + "': Unspecified GSS failure.  Minor code may provide more information: Cannot "
              "contact any KDC for realm 'EXAMPLE.TEST'",
        BeginWith(WithCache(cache)));
}

TEST_F(NegotiateFailure, WithAnUnreadableConfigurationSaysSo)
{
    const std::string file = kdc->GetFile("broken.conf");
    std::ofstream(file) << "[libdefaults]\n = nothing\n";
    const EnvironmentScope configuration("KRB5_CONFIG", file);
    EXPECT_EQ(
        "NegotiationException: Cannot read the Kerberos configuration: Improper format of "
        "Kerberos configuration file",
        BeginWith(WithKeytab(kdc->GetFile("alice.keytab"), "alice")));
}

TEST_F(NegotiateFailure, OnALegAtTheStartIsRefused)
{
    const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    EXPECT_EQ(
        "NegotiationException: The negotiation with the service 'HTTP@localhost' begins with an "
        "empty leg",
        GetFailure([&] { handler->Negotiate(Leg{1}); }));
}

TEST_F(NegotiateFailure, OnAnEmptyLegBeforeCompletionIsRefused)
{
    EXPECT_EQ(
        "NegotiationException: The negotiation with the service 'HTTP@localhost' is not complete, "
        "but its leg is empty",
        AnswerWith([](const Leg&) { return Leg(); }));
}

TEST_F(NegotiateFailure, OnGarbageIsRefused)
{
    EXPECT_EQ(NotAcceptable + BadToken, AnswerWith([](const Leg&) { return Leg{'n', 'o'}; }));
}

TEST_F(NegotiateFailure, OnALegAboveTheLimitIsRefusedUnread)
{
    EXPECT_EQ(NotAcceptable + BadToken, AnswerWith([](const Leg&) { return Leg(65536, 0xa1); }));
    EXPECT_EQ(
        "NegotiationException: The leg of the service 'HTTP@localhost' has 65537 bytes; at most "
        "65536 are accepted",
        AnswerWith([](const Leg&) { return Leg(65537, 0xa1); }));
}

TEST_F(NegotiateFailure, OnEveryTruncationIsRefused)
{
    for (const std::size_t cut : {1, 10, 100}) {
        EXPECT_EQ(NotAcceptable + BadToken, AnswerWith([cut](Leg leg) {
                      leg.resize(leg.size() - cut);
                      return leg;
                  }))
            << cut;
    }
}

TEST_F(NegotiateFailure, OnAChangedProofIsRefused)
{
    EXPECT_EQ(
        NotAcceptable + UnspecifiedFailure + "Decrypt integrity check failed",
        AnswerWith([](Leg leg) {
            leg.back() ^= 1;
            return leg;
        }));
}

TEST_F(NegotiateFailure, OnTheLegOfAnotherNegotiationIsRefused)
{
    const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    const auto other = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    handler->Negotiate(Leg());
    const Leg answer = Acceptor(*kdc).Accept(*other->Negotiate(Leg()));
    EXPECT_EQ(NotAcceptable + UnspecifiedFailure + "Mutual authentication failed", GetFailure([&] {
                  handler->Negotiate(answer);
              }));
}

TEST_F(NegotiateFailure, OnTheEchoOfItsOwnLegIsRefused)
{
    const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    const Leg first = *handler->Negotiate(Leg());
    EXPECT_EQ(NotAcceptable + BadToken, GetFailure([&] { handler->Negotiate(first); }));
}

TEST_F(NegotiateFailure, OnARejectionSaysSo)
{
    EXPECT_EQ(
        NotAcceptable
            + "An unsupported mechanism was requested: SPNEGO failed to negotiate a mechanism",
        AnswerWith([](const Leg&) { return MakeResponse(REJECT); }));
}

// The service claims success, but has not shown that it has the key.
TEST_F(NegotiateFailure, OnAcceptanceWithoutProofIsRefused)
{
    const std::string refused =
        NotAcceptable + BadToken + ": SPNEGO acceptor did not return a valid token";
    for (const NegState state : {ACCEPT_COMPLETED, ACCEPT_INCOMPLETE, REQUEST_MIC}) {
        EXPECT_EQ(refused, AnswerWith([state](const Leg&) {
                      return MakeResponse(state, MakeMechanism(KerberosOid));
                  }));
    }
    EXPECT_EQ(refused, AnswerWith([](const Leg&) { return MakeResponse(ACCEPT_COMPLETED); }));
}

TEST_F(NegotiateFailure, OnAMechanismThatWasNotOfferedIsRefused)
{
    EXPECT_EQ(NotAcceptable + BadToken, AnswerWith([](const Leg&) {
                  return MakeResponse(ACCEPT_INCOMPLETE, MakeMechanism(OtherOid));
              }));
}

TEST_F(NegotiateFailure, OnceThereIsOneEndsTheNegotiation)
{
    const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    const Leg answer = Acceptor(*kdc).Accept(*handler->Negotiate(Leg()));
    EXPECT_EQ(NotAcceptable + BadToken, GetFailure([&] { handler->Negotiate(Leg{1}); }));
    EXPECT_EQ(Over, GetFailure([&] { handler->Negotiate(answer); }));
}

TEST_F(NegotiateFailure, AtTheStartEndsTheNegotiation)
{
    const auto handler = CreateKerberosNegotiationHandler(WithCache("/no/such/cache"));
    EXPECT_NE("none", GetFailure([&] { handler->Negotiate(Leg()); }));
    EXPECT_EQ(Over, GetFailure([&] { handler->Negotiate(Leg()); }));
}

TEST_F(NegotiateFailure, OnAnyOtherLegAfterCompletionIsRefused)
{
    Leg completed = MakeResponse(ACCEPT_COMPLETED);
    Leg longer = completed;
    longer.push_back(0);
    Leg shorter = completed;
    shorter.pop_back();
    for (const Leg& further : {Leg(), longer, shorter, MakeResponse(ACCEPT_INCOMPLETE)}) {
        const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
        handler->Negotiate(Acceptor(*kdc).Accept(*handler->Negotiate(Leg())));
        EXPECT_EQ(Over, GetFailure([&] { handler->Negotiate(further); }));
        EXPECT_EQ(Over, GetFailure([&] { handler->Negotiate(completed); }));
    }
}

TEST_F(NegotiateFailure, OnASecondAgreementOfTheServiceIsRefused)
{
    const Leg completed = MakeResponse(ACCEPT_COMPLETED);
    const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    handler->Negotiate(Acceptor(*kdc).Accept(*handler->Negotiate(Leg())));
    EXPECT_EQ(completed, *handler->Negotiate(completed));
    EXPECT_EQ(Over, GetFailure([&] { handler->Negotiate(completed); }));
}

TEST_F(NegotiateFailure, OnAnAgreementInPlaceOfTheProofIsRefused)
{
    const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    handler->Negotiate(Leg());
    EXPECT_NE("none", GetFailure([&] { handler->Negotiate(MakeResponse(ACCEPT_COMPLETED)); }));
}

namespace {

/** A service that protects the choice of the mechanism as well [RFC 4178 5]. */
class ProtectingService
{
public:
    explicit ProtectingService(const Testing::TestKdc& kdc)
        : _kerberos(kdc, gss_mech_krb5)
    {}

    /** Answers the first leg with a proof, a MIC of the mechanisms, and the wish for one. */
    Leg Answer(const Leg& leg)
    {
        const Leg init = ReadInit(leg);
        const Leg proof = _kerberos.Accept(GetToken(init));
        _mechanisms = GetMechanisms(init);
        return MakeResponse(
            REQUEST_MIC,
            Der::Concat({MakeMechanism(KerberosOid), MakeToken(proof), MakeMic(MakeOwnMic())}));
    }

    bool IsProtectedBy(const Leg& leg)
    {
        Leg mic = Der::Find(Der::Find(Der::Find(Der::Find(leg, 0xa1), 0x30), 0xa3), 0x04);
        gss_buffer_desc message{_mechanisms.size(), _mechanisms.data()};
        gss_buffer_desc code{mic.size(), mic.data()};
        OM_uint32 minor = 0;
        return gss_verify_mic(&minor, _kerberos.GetContext(), &message, &code, nullptr)
               == GSS_S_COMPLETE;
    }

private:
    Leg MakeOwnMic()
    {
        gss_buffer_desc message{_mechanisms.size(), _mechanisms.data()};
        GssBuffer mic;
        OM_uint32 minor = 0;
        RequireGss(
            gss_get_mic(&minor, _kerberos.GetContext(), GSS_C_QOP_DEFAULT, &message, mic.Get()),
            minor);
        return {mic.begin(), mic.end()};
    }

    Acceptor _kerberos;
    Leg _mechanisms;
};

class NegotiateWithMic : public NegotiateFailure
{};

} // namespace

TEST_F(NegotiateWithMic, MakesALegForIt)
{
    const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    ProtectingService service(*kdc);
    const Leg last = *handler->Negotiate(service.Answer(*handler->Negotiate(Leg())));
    EXPECT_TRUE(service.IsProtectedBy(last));
    EXPECT_NO_THROW(handler->Negotiate(MakeResponse(ACCEPT_COMPLETED)));
    EXPECT_EQ(Over, GetFailure([&] { handler->Negotiate(MakeResponse(ACCEPT_COMPLETED)); }));
}

TEST_F(NegotiateWithMic, RefusesAChangedOne)
{
    const auto handler = CreateKerberosNegotiationHandler(WithService("HTTP@localhost"));
    Leg answer = ProtectingService(*kdc).Answer(*handler->Negotiate(Leg()));
    answer.back() ^= 1;
    EXPECT_EQ(
        NotAcceptable + "A token had an invalid Message Integrity Check (MIC)",
        GetFailure([&] { handler->Negotiate(answer); }));
}

TEST_F(NegotiateWithMic, StopsAtTheLastLegThatIsAllowed)
{
    KerberosNegotiationHandlerImpl handler(WithService("HTTP@localhost"), 1);
    const Leg answer = ProtectingService(*kdc).Answer(*handler.Negotiate(Leg()));
    EXPECT_EQ(
        "NegotiationException: The negotiation with the service 'HTTP@localhost' has no end after "
        "1 legs",
        GetFailure([&] { handler.Negotiate(answer); }));
}
