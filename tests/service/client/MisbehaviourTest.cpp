#include "Harness.h"

#include "ExitCode.h"
#include "devsts/misbehaviour/MisbehavingServer.h"
#include "ssoClient/CallOptions.h"
#include "ssoClient/ExchangeOptions.h"
#include "support/Failure.h"
#include "support/TestData.h"
#include "unit/ssoClient/client/negotiationFakes.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <nlohmann/json.hpp>

#include <chrono>

// Whatever a server does wrong ends in one clear error, in time: the rows of the table with which
// the development STS misbehaves.

using namespace SsoClient;

namespace {

using Json = nlohmann::json;

/** Far above what any row takes that does not wait for its time-out. */
constexpr double UsualSeconds = 20;

/** What a loaded machine may add. */
constexpr double ToleratedSeconds = 20;

struct Situation
{
    Json row;
    std::string name; ///< that of the row, with the parameter
    bool isOverTls;
};

std::ostream& operator<<(std::ostream& out, const Situation& situation)
{
    return out << situation.name << (situation.isOverTls ? " over TLS" : "");
}

std::string GetTestName(const testing::TestParamInfo<Situation>& situation)
{
    std::string name = situation.param.name + (situation.param.isOverTls ? "_over_TLS" : "");
    for (char& letter : name) {
        letter = letter == '-' || letter == ':' ? '_' : letter;
    }
    return name;
}

std::vector<std::string> ListNames(const Json& row)
{
    const std::string name = row.at("name");
    if (!row.contains("every")) {
        return {name};
    }
    std::vector<std::string> names;
    const Json& every = row["every"];
    for (long at = every.at("first"); at <= every.at("last"); at += every.at("step").get<long>()) {
        names.push_back(name + ":" + std::to_string(at));
    }
    return names;
}

std::vector<Situation> ListSituations()
{
    std::ifstream file(MISBEHAVIOURS);
    std::vector<Situation> situations;
    for (const Json& row : Json::parse(file)) {
        for (const std::string& name : ListNames(row)) {
            const DevSts::Misbehaviour misbehaviour = DevSts::FindMisbehaviour(name);
            if (misbehaviour.isOverHttp) {
                situations.push_back({row, name, false});
            }
            if (misbehaviour.isOverHttps) {
                situations.push_back({row, name, true});
            }
        }
    }
    return situations;
}

/**
 * Whether a text is what the table expects, where {server} is the server, {number} any number and
 * {words} anything.
 */
bool Matches(std::string_view text, std::string_view expected, const std::string& server)
{
    const std::size_t end = std::min(expected.find('{'), expected.size());
    if (text.substr(0, end) != expected.substr(0, end)) {
        return false;
    }
    if (end == expected.size()) {
        return text.size() == end;
    }
    const std::size_t close = expected.find('}') + 1;
    const std::string_view name = expected.substr(end, close - end);
    const std::string_view rest = expected.substr(close);
    text.remove_prefix(end);
    if (name == "{server}") {
        return text.substr(0, server.size()) == server
               && Matches(text.substr(server.size()), rest, server);
    }
    if (name == "{number}") {
        const std::size_t digits = std::min(text.find_first_not_of("0123456789"), text.size());
        return digits > 0 && Matches(text.substr(digits), rest, server);
    }
    return text.size() > rest.size()
           && Matches(text.substr(text.size() - rest.size()), rest, server);
}

/** Describes how an operation has ended. */
struct End
{
    std::string className = "none";
    std::string text;
    int exitCode = 0;
};

template <class Operation>
End GetEnd(const Operation& operation)
{
    try {
        operation();
    } catch (const std::exception& error) {
        return {Quillon::GetClassName(error), error.what(), static_cast<int>(GetExitCode(error))};
    }
    return {};
}

/** Answers the legs when the server has done all that it does by itself. */
class SlowHandler final : public NegotiationHandler
{
public:
    explicit SlowHandler(DevSts::MisbehavingServer& server)
        : _server(server)
    {}

    boost::shared_ptr<Leg> Negotiate(const Leg& serverLeg) override
    {
        if (!serverLeg.empty()) {
            _server.AwaitQuiet();
        }
        return _answers.Negotiate(serverLeg);
    }

private:
    DevSts::MisbehavingServer& _server;
    ScriptedHandler _answers{{"first", "second"}};
};

/** The server of one row, and a client of it. */
class MisbehavingServerTest : public testing::TestWithParam<Situation>
{
protected:
    MisbehavingServerTest()
        : server(
            MakeServerOptions(state, !GetParam().isOverTls),
            DevSts::FindMisbehaviour(GetParam().name))
    {
        server.Start();
        config.url = server.Url();
        config.trustedCertificates = GetTestCertificates("sts");
        if (GetParam().isOverTls) {
            sslContext = CreateSSLContext(MakeTlsOptions());
            config.sslContext = sslContext.get();
        }
    }

    Quillon::Ssl::SSLContextOptions MakeTlsOptions() const
    {
        Quillon::Ssl::SSLContextOptions options;
        options.useSystemAuthorities = false;
        options.authorities = Quillon::Crypto::ParsePemCertificates(state.Read("ca.pem"));
        if (GetParam().row.value("asks", "") == "withCertificate") {
            options.clientCertificates = GetTestCertificates("client");
            options.clientKey = GetTestKey("client");
        }
        return options;
    }

    double GetSeconds() const { return GetParam().row.value("atMost", UsualSeconds); }

    ServicePtr MakeService() const
    {
        ExchangeOptions options;
        options.timeoutMicroseconds = static_cast<long long>(GetSeconds() * 1'000'000);
        options.connectTimeoutMicroseconds = options.timeoutMicroseconds;
        CallOptions calls;
        calls.connectionReuse = ConnectionReuse();
        return WithOptions(CreateSecurityTokenService(config, options), calls);
    }

    /** The end of what the row asks for; where it asks twice, the first time succeeds. */
    End Ask()
    {
        const ServicePtr service = MakeService();
        const std::string kind = GetParam().row.value("asks", "once");
        if (kind == "negotiates") {
            ScriptedHandler handler({"first", "second"});
            return GetEnd([&] { service->AcquireTokenByGSS(MakeSpec(), handler); });
        }
        if (kind == "negotiatesSlowly") {
            SlowHandler handler(server);
            return GetEnd([&] { service->AcquireTokenByGSS(MakeSpec(), handler); });
        }
        const auto acquire = [&] {
            EXPECT_EQ(
                service->AcquireToken(AlicesName, AlicesPassword, MakeSpec())->GetSubject(),
                Alice());
        };
        if (kind == "twice") {
            acquire();
            server.AwaitQuiet();
        }
        return GetEnd(acquire);
    }

    std::string DescribeServer() const
    {
        const std::string url = server.Url();
        const std::size_t colon = url.rfind(':');
        return "127.0.0.1 port " + url.substr(colon + 1, url.rfind('/') - colon - 1);
    }

    Json GetExpected() const
    {
        const Json& row = GetParam().row;
        const Json none = {{"class", "none"}, {"text", ""}, {"exit", 0}};
        return row.value(
            GetParam().isOverTls && row.contains("endOverTls") ? "endOverTls" : "end", none);
    }

    StateDir state;
    FixedClock clock{Now};
    DevSts::MisbehavingServer server;
    SecurityTokenServiceConfig config;
    Quillon::Ref<Quillon::Ssl::SSLContext> sslContext;
};

} // namespace

TEST_P(MisbehavingServerTest, IsOneClearErrorInTime)
{
    const auto start = std::chrono::steady_clock::now();
    const End end = Ask();
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - start;
    const Json expected = GetExpected();
    EXPECT_EQ(expected.at("class"), end.className);
    EXPECT_EQ(expected.at("exit"), end.exitCode);
    EXPECT_TRUE(Matches(end.text, expected.at("text").get<std::string>(), DescribeServer()))
        << end.className << ": " << end.text.substr(0, 1000);
    EXPECT_LE(taken.count(), GetSeconds() + ToleratedSeconds);
}

INSTANTIATE_TEST_SUITE_P(
    All, MisbehavingServerTest, testing::ValuesIn(ListSituations()), GetTestName);
