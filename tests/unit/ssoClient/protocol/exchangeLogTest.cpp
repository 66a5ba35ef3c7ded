#include "ssoClient/protocol/exchangeLog.h"

#include "quillon/service/Logger.h"
#include "ssoClient/protocol/HttpsClient.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "support/Failure.h"
#include "support/TestServer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <mutex>

using namespace SsoClient;
using namespace Testing;
using Quillon::Http::ExchangeFacts;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::MatchesRegex;

namespace {

/** Collects what is logged, with the operations' logger and perhaps that of the exchanges on. */
class ExchangeLog : public testing::Test
{
protected:
    ExchangeLog()
    {
        _facility.SetSink([this](const std::string& logger, int level, const std::string& text) {
            const std::lock_guard<std::mutex> lock(_mutex);
            _lines.push_back(logger + "[" + std::to_string(level) + "]: " + text);
        });
        _facility.GetLogger("SsoClient")->SetLevel(64);
        SetLevel(64);
    }
    ~ExchangeLog() override
    {
        SetLevel(8);
        _facility.GetLogger("SsoClient")->SetLevel(8);
        _facility.SetSink({});
    }

    void SetLevel(int level) { _facility.GetLogger("SsoClient.Exchange")->SetLevel(level); }

    std::vector<std::string> TakeLines()
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return std::exchange(_lines, {});
    }

    /** The lines of an exchange that `observer` is told of as well. */
    std::vector<std::string> GetLinesOfExchange(
        const Quillon::Http::ExchangeObserver& observer = {})
    {
        ExchangeOptions options;
        options.observer = observer;
        const HttpsClient client(_server.GetUrl("/sts"), nullptr, "", options);
        Request request;
        request.soapAction = "urn:test";
        Quillon::Ref<Quillon::Reader> reply;
        client.CreateSession()->SendRequest(request, reply);
        return TakeLines();
    }

    std::vector<std::string> GetLinesOfFault(const std::string& text)
    {
        const std::string reply = "<E><Body><Fault><faultcode>Server</faultcode><faultstring>"
                                  + text + "</faultstring></Fault></Body></E>";
        std::string token;
        EXPECT_EQ(
            GetFailure([&] {
                ResponseHandlerImpl().HandleAcquireTokenResponse(
                    Quillon::CreateStringReader(reply).get(), token);
            }),
            "SsoException: Unexpected SOAP fault: Server; request failed.");
        return TakeLines();
    }

private:
    Quillon::Service::LogFacility& _facility = Quillon::Service::GetApp()->GetLogFacility();
    std::mutex _mutex;
    std::vector<std::string> _lines;
    const TestServer _server{AnswerAll(MakeReply("299 Fine", "<x/>"))};
};

} // namespace

TEST_F(ExchangeLog, TellsPathServerAddressStatusAndTimes)
{
    EXPECT_THAT(
        GetLinesOfExchange(),
        ElementsAre(MatchesRegex(
            "SsoClient.Exchange\\[64\\]: POST /sts to 127.0.0.1 port [0-9]+ "
            "\\(127.0.0.1:[0-9]+\\): HTTP status 299(, [a-zA-Z ]+ after [0-9]+ ms){4,5}")));
}

TEST_F(ExchangeLog, IsSilentUnlessItsOwnLoggerIsOn)
{
    SetLevel(63);
    EXPECT_THAT(GetLinesOfExchange(), IsEmpty());
    EXPECT_THAT(GetLinesOfFault("secret"), IsEmpty());
}

TEST_F(ExchangeLog, LeavesTheCallersObserverInItsPlace)
{
    for (const int level : {8, 64}) {
        SetLevel(level);
        int status = 0;
        GetLinesOfExchange([&](const ExchangeFacts& facts) { status = facts.status; });
        EXPECT_EQ(status, 299);
    }
}

TEST_F(ExchangeLog, TellsAFailureAndWhatTlsSaidUntilThen)
{
    ExchangeFacts facts;
    facts.path = "/sts";
    facts.server = "sts.test port 443";
    facts.tlsVersion = "TLSv1.3";
    facts.tlsCipher = "TLS_AES_256_GCM_SHA384";
    facts.times.nameLookup = 1'999;
    facts.times.end = 3'000;
    LogExchange(facts);
    EXPECT_THAT(
        TakeLines(),
        ElementsAre(
            "SsoClient.Exchange[64]: POST /sts to sts.test port 443 (no address): no reply, name "
            "looked up after 1 ms, ended after 3 ms",
            "SsoClient.Exchange[64]: TLSv1.3 with TLS_AES_256_GCM_SHA384, no certificate shown"));
}

// A query may carry what lets its reader in.
TEST_F(ExchangeLog, TellsOfAQueryOnlyThatThereIsOne)
{
    ExchangeFacts facts;
    facts.path = "/sts?key=secret";
    facts.server = "sts.test port 80";
    LogExchange(facts);
    EXPECT_THAT(
        TakeLines(),
        ElementsAre("SsoClient.Exchange[64]: POST /sts?... to sts.test port 80 (no address): no "
                    "reply"));
}

TEST_F(ExchangeLog, TellsAFault)
{
    EXPECT_THAT(
        GetLinesOfFault("disk full"),
        ElementsAre("SsoClient.Exchange[64]: SOAP fault with code `Server', text `disk full'"));
}

TEST_F(ExchangeLog, CutsALongFault)
{
    EXPECT_THAT(
        GetLinesOfFault(std::string(100'000, 'x')),
        ElementsAre(HasSubstr("text `" + std::string(500, 'x') + "...'")));
}

TEST(HttpsClientOptions, LimitTheConnection)
{
    constexpr long long Short = 50'000;
    const TestServer mute([](ServerConnection& connection) { connection.WaitForClose(); });
    const auto context = Quillon::Ssl::CreateSSLContext({});
    ExchangeOptions options;
    options.connectTimeoutMicroseconds = Short;
    const std::string port = std::to_string(mute.GetPort());
    const HttpsClient client("https://127.0.0.1:" + port + "/sts", context.get(), "", options);
    Quillon::Ref<Quillon::Reader> reply;
    EXPECT_EQ(
        GetFailure([&] { client.CreateSession()->SendRequest(Request(), reply); }),
        "TimeoutException: There was no connection to 127.0.0.1 port " + port
            + " within 0.05 seconds.");
}
