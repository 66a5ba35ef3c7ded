#include "ssoClientGss/KerberosNegotiationHandler.h"

#include "Acceptor.h"
#include "Der.h"
#include "Realm.h"
#include "ssoClientGss/Exceptions.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <thread>
#include <vector>

using namespace SsoClient;
using namespace SsoClient::Gss;

extern char** environ;

namespace {

/** What is sent when the client has nothing more to say; `openssl asn1parse` reads it below. */
const Leg AcceptCompleted{0xa1, 0x07, 0x30, 0x05, 0xa0, 0x03, 0x0a, 0x01, 0x00};

class Negotiate : public Realm
{
protected:
    static KerberosOptions WithCache(const std::string& ccache)
    {
        KerberosOptions options;
        options.url = "https://localhost/sts";
        options.ccache = ccache;
        return options;
    }

    static KerberosOptions WithCacheOfAlice() { return WithCache(kdc->GetFile("alice")); }

    static KerberosOptions WithKeytab(const std::string& principal)
    {
        KerberosOptions options;
        options.url = "https://localhost/sts";
        options.keytab = kdc->GetFile(principal + ".keytab");
        options.principal = principal;
        return options;
    }

    static KerberosOptions WithService(const std::string& service)
    {
        KerberosOptions options = WithCacheOfAlice();
        options.service = service;
        return options;
    }

    /** A whole negotiation: who the acceptor says was the client, and as what it was addressed. */
    static std::string GetParties(const KerberosOptions& options)
    {
        const auto handler = CreateKerberosNegotiationHandler(options);
        Acceptor acceptor(*kdc);
        const auto first = handler->Negotiate(Leg());
        const auto last = handler->Negotiate(acceptor.Accept(*first));
        EXPECT_EQ(AcceptCompleted, *last);
        return acceptor.GetClient() + " to " + acceptor.GetService();
    }
};

const char* const AliceToLocalhost = "alice@EXAMPLE.TEST to HTTP/localhost@EXAMPLE.TEST";

std::vector<std::string> GetEnvironment()
{
    std::vector<std::string> variables;
    for (char** variable = environ; *variable != nullptr; ++variable) {
        variables.emplace_back(*variable);
    }
    return variables;
}

std::vector<std::string> GetFiles(const std::filesystem::path& folder)
{
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(folder)) {
        names.push_back(entry.path().string());
    }
    return names;
}

int CountMechanisms(const std::string& wanted)
{
    OM_uint32 minor = 0;
    gss_OID_set mechanisms = GSS_C_NO_OID_SET;
    RequireGss(gss_indicate_mechs(&minor, &mechanisms), minor);
    int count = 0;
    for (std::size_t i = 0; i < mechanisms->count; ++i) {
        GssBuffer text;
        RequireGss(gss_oid_to_str(&minor, &mechanisms->elements[i], text.Get()), minor);
        // The text counts the zero at its end.
        count += std::string(text.begin(), text.end()).c_str() == wanted ? 1 : 0;
    }
    gss_release_oid_set(&minor, &mechanisms);
    return count;
}

std::string RunOpenSsl(const Leg& der)
{
    const std::string path = testing::TempDir() + "/leg-" + std::to_string(getpid()) + ".der";
    std::ofstream(path, std::ios::binary)
        .write(reinterpret_cast<const char*>(der.data()), std::streamsize(der.size()));
    FILE* const pipe = popen(("openssl asn1parse -inform DER -in " + path).c_str(), "r");
    std::string output;
    for (int c = 0; (c = fgetc(pipe)) != EOF;) {
        output += char(c);
    }
    EXPECT_EQ(0, pclose(pipe));
    std::filesystem::remove(path);
    return output;
}

} // namespace

TEST_F(Negotiate, WithCacheOfGivenPathOrTypeCompletes)
{
    const std::string path = kdc->GetFile("alice");
    std::filesystem::create_directory(kdc->GetFile("caches"));
    CopyCache(path, "DIR:" + kdc->GetFile("caches"));
    CopyCache(path, "MEMORY:of-alice");
    CopyCache(path, "FILE:" + path + ":with:colons");
    for (const std::string& cache :
         {path,
          "FILE:" + path,
          "DIR:" + kdc->GetFile("caches"),
          std::string("MEMORY:of-alice"),
          path + ":with:colons"}) {
        EXPECT_EQ(AliceToLocalhost, GetParties(WithCache(cache))) << cache;
    }
}

TEST_F(Negotiate, WithNoCredentialsGivenTakesTheDefaultCache)
{
    const std::string cache = kdc->GetFile("no-default-ccache");
    kdc->LogOn("mallory", cache);
    EXPECT_EQ("mallory@EXAMPLE.TEST to HTTP/localhost@EXAMPLE.TEST", GetParties(WithCache("")));
    std::filesystem::remove(cache);
}

TEST_F(Negotiate, WithCacheDoesNotCareForTheDefaultOne)
{
    kdc->LogOn("mallory", kdc->GetFile("mallory"));
    const EnvironmentScope elsewhere("KRB5CCNAME", kdc->GetFile("mallory"));
    EXPECT_EQ(AliceToLocalhost, GetParties(WithCacheOfAlice()));
}

TEST_F(Negotiate, WithKeytabAndPrincipalCompletes)
{
    EXPECT_EQ(AliceToLocalhost, GetParties(WithKeytab("alice")));
    KerberosOptions options = WithKeytab("alice");
    options.principal = "alice@EXAMPLE.TEST";
    options.keytab = "FILE:" + options.keytab;
    EXPECT_EQ(AliceToLocalhost, GetParties(options));
}

TEST_F(Negotiate, WithKeytabDoesNotCareForTheDefaultCache)
{
    const EnvironmentScope elsewhere("KRB5CCNAME", kdc->GetFile("alice"));
    EXPECT_EQ(
        "mallory@EXAMPLE.TEST to HTTP/localhost@EXAMPLE.TEST", GetParties(WithKeytab("mallory")));
}

TEST_F(Negotiate, WithKeytabLeavesNoFile)
{
    const std::vector<std::string> files = GetFiles(kdc->GetFolder());
    EXPECT_EQ(AliceToLocalhost, GetParties(WithKeytab("alice")));
    EXPECT_EQ(files, GetFiles(kdc->GetFolder()));
}

// [RFC 4559 4.1]
TEST_F(Negotiate, AddressesTheHostOfTheUrl)
{
    KerberosOptions options = WithCacheOfAlice();
    options.url = "http://127.0.0.1:8443/sts";
    EXPECT_EQ("alice@EXAMPLE.TEST to HTTP/127.0.0.1@EXAMPLE.TEST", GetParties(options));
}

TEST_F(Negotiate, AddressesTheGivenServiceInEveryForm)
{
    const std::string parties = "alice@EXAMPLE.TEST to HTTP/127.0.0.1@EXAMPLE.TEST";
    for (const char* service :
         {"HTTP@127.0.0.1", "HTTP/127.0.0.1", "HTTP/127.0.0.1@EXAMPLE.TEST"}) {
        EXPECT_EQ(parties, GetParties(WithService(service))) << service;
    }
}

// [RFC 4178 3.2]
TEST_F(Negotiate, OffersKerberosOnlyWhateverElseTheHostHas)
{
    ASSERT_EQ(1, CountMechanisms("{ 1 3 6 1 4 1 32473 1 }"));
    const Leg first = *CreateKerberosNegotiationHandler(WithCacheOfAlice())->Negotiate(Leg());
    const Leg kerberos{0x06, 0x09, 0x2a, 0x86, 0x48, 0x86, 0xf7, 0x12, 0x01, 0x02, 0x02};
    // GSS frame, negTokenInit [0], mechTypes [0] [RFC 4178 4.2.1]
    const Leg init = Der::Find(Der::Find(Der::Find(first, 0x60), 0xa0), 0x30);
    EXPECT_EQ(kerberos, Der::Find(Der::Find(init, 0xa0), 0x30));
}

TEST_F(Negotiate, AsksForMutualAuthenticationAndDelegatesNothing)
{
    const auto handler = CreateKerberosNegotiationHandler(WithCacheOfAlice());
    Acceptor acceptor(*kdc);
    acceptor.Accept(*handler->Negotiate(Leg()));
    EXPECT_EQ(GSS_C_MUTUAL_FLAG, acceptor.GetFlags() & (GSS_C_MUTUAL_FLAG | GSS_C_DELEG_FLAG));
}

TEST_F(Negotiate, OnCompletionReturnsAnAnswerThatSaysSo)
{
    const auto handler = CreateKerberosNegotiationHandler(WithCacheOfAlice());
    Acceptor acceptor(*kdc);
    const auto last = handler->Negotiate(acceptor.Accept(*handler->Negotiate(Leg())));
    // negTokenResp [1], negState [0], accept-completed (0) [RFC 4178 4.2]
    EXPECT_EQ(
        "    0:d=0  hl=2 l=   7 cons: cont [ 1 ]        \n"
        "    2:d=1  hl=2 l=   5 cons: SEQUENCE          \n"
        "    4:d=2  hl=2 l=   3 cons: cont [ 0 ]        \n"
        "    6:d=3  hl=2 l=   1 prim: ENUMERATED        :00\n",
        RunOpenSsl(*last));
    EXPECT_EQ(AcceptCompleted, *last);
}

TEST_F(Negotiate, LeavesTheEnvironmentAsItIs)
{
    const std::vector<std::string> before = GetEnvironment();
    GetParties(WithCacheOfAlice());
    GetParties(WithKeytab("alice"));
    EXPECT_EQ(before, GetEnvironment());
}

TEST_F(Negotiate, OnManyThreadsAtOnceKeepsHandlersApart)
{
    std::vector<std::string> parties(8);
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i < parties.size(); ++i) {
        threads.emplace_back([&parties, i] {
            for (int round = 0; round < 3; ++round) {
                parties[i] = GetParties(i % 2 == 0 ? WithCacheOfAlice() : WithKeytab("mallory"))
                             + ", not "
                             + GetParties(i % 2 == 0 ? WithKeytab("mallory") : WithCacheOfAlice());
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    const std::string alice = AliceToLocalhost;
    const std::string mallory = "mallory@EXAMPLE.TEST to HTTP/localhost@EXAMPLE.TEST";
    for (std::size_t i = 0; i < parties.size(); ++i) {
        EXPECT_EQ(i % 2 == 0 ? alice + ", not " + mallory : mallory + ", not " + alice, parties[i]);
    }
}
