#include "ScriptedService.h"
#include "VirtualEnvironment.h"

#include "support/FakeSamlToken.h"
#include "support/FixedClock.h"
#include "support/PoolSupport.h"
#include "support/TestData.h"

#include "ssoClientRuntime/DelegatedTokens.h"
#include "ssoClientRuntime/TokenSource.h"
#include "ssoClientRuntime/TokenVerifier.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

using namespace SsoClient;
using namespace std::chrono_literals;
using Testing::ScriptedService;
using Testing::VirtualEnvironment;

namespace {

using Events = std::vector<std::string>;

class Recorder final : public OperationObserver
{
public:
    void OnRefreshBegin(const ObservedRefresh& refresh) noexcept override
    {
        Note(refresh.isRenewal ? "renewal begins" : "acquisition begins");
    }
    void OnRefreshEnd(
        const ObservedRefresh& refresh, const OperationOutcome& outcome) noexcept override
    {
        Note(
            std::string(refresh.isRenewal ? "renewal" : "acquisition")
            + (outcome.succeeded ? " done" : " failed: ") + outcome.exceptionClass + " after "
            + std::to_string(outcome.durationMicroseconds));
    }
    void OnCacheHit(const ObservedCache& cache) noexcept override { Note(cache.name + " hit"); }
    void OnCacheMiss(const ObservedCache& cache) noexcept override { Note(cache.name + " miss"); }

    Events Take()
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return std::exchange(_events, {});
    }

private:
    void Note(const std::string& event)
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _events.push_back(event);
    }

    std::mutex _mutex;
    Events _events;
};

class Observing : public testing::Test
{
protected:
    Observing()
    {
        sourceOptions.environment = environment;
        sourceOptions.operationObserver = recorder;
        service->holder = GetTestCertificates("client").front();
        sourceOptions.identity = service->holder;
        service->before = [this] { environment->Move(5us); };
    }

    boost::shared_ptr<TokenSource> MakeSource() const
    {
        return CreateCertificateTokenSource(service, TokenSpec(), sourceOptions);
    }

    boost::shared_ptr<VirtualEnvironment> environment = boost::make_shared<VirtualEnvironment>();
    boost::shared_ptr<ScriptedService> service = boost::make_shared<ScriptedService>(environment);
    boost::shared_ptr<Recorder> recorder = boost::make_shared<Recorder>();
    TokenSourceOptions sourceOptions;
};

} // namespace

TEST_F(Observing, TellsOfARefreshHowItWasMade)
{
    const auto source = MakeSource();
    EXPECT_EQ(Events(), recorder->Take());
    source->GetToken();
    EXPECT_EQ((Events{"acquisition begins", "acquisition done after 5"}), recorder->Take());
    source->GetToken();
    EXPECT_EQ(Events(), recorder->Take());
    environment->Pass(43min);
    EXPECT_EQ((Events{"renewal begins", "renewal done after 5"}), recorder->Take());
}

TEST_F(Observing, TellsOfARefusedRenewalAndOfTheAcquisitionThatFollows)
{
    const auto source = MakeSource();
    source->GetToken();
    recorder->Take();
    service->before = [this] {
        if (service->calls.back().substr(0, 5) == "renew") {
            throw SsoException("not renewable");
        }
    };
    source->Refresh();
    environment->Settle();
    EXPECT_EQ(
        (Events{
            "renewal begins",
            "renewal failed: SsoException after 0",
            "acquisition begins",
            "acquisition done after 0"}),
        recorder->Take());
}

TEST_F(Observing, TellsTheBeginningBeforeTheService)
{
    Events before;
    service->before = [&] { before = recorder->Take(); };
    MakeSource()->GetToken();
    EXPECT_EQ(Events{"acquisition begins"}, before);
}

TEST_F(Observing, TellsATokenThatCannotBeHandedOutAsAFailure)
{
    service->lifetime = 30s;
    EXPECT_THROW(MakeSource()->GetToken(), NoTokenException);
    EXPECT_EQ(
        (Events{"acquisition begins", "acquisition failed: InvalidTokenException after 5"}),
        recorder->Take());
}

TEST_F(Observing, TellsTheEndAlsoWhenTheSourceIsGone)
{
    boost::shared_ptr<TokenSource> source = MakeSource();
    service->before = [&] { source.reset(); };
    EXPECT_THROW(source->GetToken(), NoTokenException);
    EXPECT_EQ((Events{"acquisition begins", "acquisition done after 0"}), recorder->Take());
}

TEST_F(Observing, TellsHitsAndMissesOfDelegatedTokens)
{
    DelegatedTokensOptions options;
    options.environment = environment;
    options.observer = recorder;
    const auto tokens = CreateDelegatedTokens(options);
    FakeSamlToken user;
    user.endDate = Quillon::System::DateTime("2011-07-06T09:00:00Z");
    user.xml = "<user/>";
    tokens->GetToken(service, user, TokenSpec());
    EXPECT_EQ(Events{"DelegatedTokens miss"}, recorder->Take());
    tokens->GetToken(service, user, TokenSpec());
    EXPECT_EQ(Events{"DelegatedTokens hit"}, recorder->Take());
    user.xml = "<other/>";
    service->before = [] { throw SsoException("refused"); };
    EXPECT_THROW(tokens->GetToken(service, user, TokenSpec()), SsoException);
    EXPECT_EQ(Events{"DelegatedTokens miss"}, recorder->Take());
}

TEST_F(Observing, CountsAnExchangeOfSomebodyElseAsAHit)
{
    DelegatedTokensOptions options;
    options.environment = environment;
    options.observer = recorder;
    const auto tokens = CreateDelegatedTokens(options);
    FakeSamlToken user;
    user.endDate = Quillon::System::DateTime("2011-07-06T09:00:00Z");
    user.xml = "<user/>";
    Testing::Gate gate;
    service->before = gate.MakeWaiter();
    std::thread first([&] { tokens->GetToken(service, user, TokenSpec()); });
    while (tokens->GetStatus().underWay == 0) {
        std::this_thread::yield();
    }
    std::thread second([&] { tokens->GetToken(service, user, TokenSpec()); });
    while (tokens->GetStatus().hits == 0) {
        std::this_thread::yield();
    }
    gate.Open();
    first.join();
    second.join();
    Events events = recorder->Take();
    std::sort(events.begin(), events.end());
    EXPECT_EQ((Events{"DelegatedTokens hit", "DelegatedTokens miss"}), events);
}

TEST_F(Observing, TellsHitsAndMissesOfVerifiedTokens)
{
    const FixedClock clock("2026-06-15T12:00:00Z");
    TokenVerifierOptions options;
    options.observer = recorder;
    const auto verifier = CreateTokenVerifier(GetTestCertificates("sts"), options);
    const std::string xml = ReadTestData("tokens/accepted/bearer.xml");
    verifier->Verify(xml);
    EXPECT_EQ(Events{"TokenVerifier miss"}, recorder->Take());
    verifier->Verify(xml);
    EXPECT_EQ(Events{"TokenVerifier hit"}, recorder->Take());
    EXPECT_THROW(verifier->Verify("<nothing/>"), Quillon::Exception);
    EXPECT_EQ(Events{"TokenVerifier miss"}, recorder->Take());
}
