#include "Harness.h"

#include "quillon/system/ThreadPool.h"
#include "ssoClient/Exceptions.h"
#include "support/Awaited.h"
#include "support/TestServer.h"

#include <gmock/gmock.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <future>
#include <latch>
#include <set>
#include <vector>

using namespace SsoClient;

namespace {

std::string Describe(const Quillon::Exception* error)
{
    return error == nullptr ? "" : Quillon::GetClassName(*error) + ": " + error->what();
}

TokenPtr GetToken(AwaitedToken& awaited)
{
    const Told<TokenPtr> told = awaited.Get();
    EXPECT_EQ(told.Describe(), "success");
    return told.result;
}

class AsyncAtSts : public HttpsStsTest
{};

} // namespace

TEST_F(AsyncAtSts, RunsEveryOperation)
{
    const ServicePtr service = MakeService();
    TokenSpec spec = MakeSpec();
    spec.renewable = true;

    AwaitedToken byPassword;
    service->AcquireTokenAsync(AlicesName, AlicesPassword, spec, byPassword.GetCompletion());
    EXPECT_EQ(GetToken(byPassword)->GetSubject(), Alice());

    AwaitedToken byCertificate;
    service->AcquireTokenByCertificateAsync(spec, byCertificate.GetCompletion());
    const TokenPtr own = GetToken(byCertificate);
    ASSERT_NE(own, nullptr);
    EXPECT_EQ(own->GetSubject(), ServiceUser());

    AwaitedToken byToken;
    service->AcquireTokenByTokenAsync(own, MakeSpec(100), byToken.GetCompletion());
    EXPECT_EQ(GetToken(byToken)->GetSubject(), ServiceUser());

    AwaitedToken renewed;
    service->RenewTokenAsync(own, 200, renewed.GetCompletion());
    EXPECT_EQ(GetLifetimeSec(*GetToken(renewed)), 200);

    std::promise<boost::optional<bool>> verdict;
    service->ValidateSubjectAsync(
        own, [&](const boost::optional<bool>& result, const Quillon::Exception*) {
            verdict.set_value(result);
        });
    EXPECT_TRUE(verdict.get_future().get().value());
}

TEST_F(AsyncAtSts, DeliversRefusedCredentials)
{
    AwaitedToken awaited;
    MakeService()->AcquireTokenAsync(AlicesName, "wrong", MakeSpec(), awaited.GetCompletion());
    const Told<TokenPtr> told = awaited.Get();
    EXPECT_EQ(told.result, nullptr);
    EXPECT_THAT(told.Describe(), testing::StartsWith("InvalidCredentialsException: "));
}

TEST_F(AsyncAtSts, DeliversATransportFailureAsItIs)
{
    AnswerNext(404, "", "text/plain");
    AwaitedToken awaited;
    MakeService()->AcquireTokenAsync(
        AlicesName, AlicesPassword, MakeSpec(), awaited.GetCompletion());
    EXPECT_EQ(
        awaited.Get().Describe(), "CommunicationException: Server returned error: 404 Not Found");
}

TEST_F(AsyncAtSts, CompletesAfterTheServiceObjectIsGone)
{
    server.SetDelay(std::chrono::milliseconds(50));
    AwaitedToken awaited;
    MakeService()->AcquireTokenAsync(
        AlicesName, AlicesPassword, MakeSpec(), awaited.GetCompletion());
    EXPECT_NE(GetToken(awaited), nullptr);
}

TEST_F(AsyncAtSts, MayBeStartedFromACompletion)
{
    const ServicePtr service = MakeService();
    AwaitedToken awaited;
    service->AcquireTokenByCertificateAsync(
        MakeSpec(), [&](const TokenPtr& token, const Quillon::Exception*) {
            service->AcquireTokenByTokenAsync(token, MakeSpec(100), awaited.GetCompletion());
        });
    EXPECT_NE(GetToken(awaited), nullptr);
}

// A service that takes its time must cost waiting, not tokens.
TEST_F(AsyncAtSts, CompletesAThousandAcquisitionsOnceEach)
{
    constexpr int Count = 1000;
    server.SetDelay(std::chrono::milliseconds(100));
    std::vector<std::atomic<int>> calls(Count);
    std::mutex mutex;
    std::set<std::string> ids;
    std::set<std::string> errors;
    std::size_t mostThreads = 0;
    std::latch done(Count);
    const auto note = [&](const TokenPtr& token, const Quillon::Exception* error, int lifetime) {
        const std::lock_guard<std::mutex> lock(mutex);
        mostThreads = std::max(mostThreads, Quillon::System::GetThreadPool()->GetThreadCount());
        if (token != nullptr && GetLifetimeSec(*token) == lifetime) {
            ids.insert(token->GetId());
        } else {
            errors.insert("wrong token or " + Describe(error));
        }
    };
    const auto began = std::chrono::steady_clock::now();
    {
        const ServicePtr service = MakeBearerService();
        for (int index = 0; index < Count; ++index) {
            service->AcquireTokenAsync(
                AlicesName,
                AlicesPassword,
                MakeSpec(300 + index),
                [&, index](const TokenPtr& token, const Quillon::Exception* error) {
                    ++calls[static_cast<std::size_t>(index)];
                    note(token, error, 300 + index);
                    done.count_down();
                });
        }
    }
    done.wait();
    const auto took = std::chrono::steady_clock::now() - began;
    EXPECT_THAT(errors, testing::IsEmpty());
    EXPECT_EQ(ids.size(), static_cast<std::size_t>(Count));
    for (const std::atomic<int>& count : calls) {
        EXPECT_EQ(count, 1);
    }
    EXPECT_EQ(mostThreads, Quillon::System::ThreadPool::DefaultLimit);
    RecordProperty(
        "milliseconds",
        static_cast<int>(std::chrono::duration_cast<std::chrono::milliseconds>(took).count()));
    RecordProperty("threads", static_cast<int>(mostThreads));
}

// ------------------------------------------------------------------ the end of the process

namespace {

/** The service object of a process that is about to end, and a server that never answers. */
struct EndingProcess
{
    std::promise<void> asked;
    std::once_flag isAsked;
    Testing::TestServer server{[this](Testing::ServerConnection& connection) {
        connection.ReadRequest();
        std::call_once(isAsked, [this] { asked.set_value(); });
        connection.WaitForClose();
    }};
    ServicePtr service = MakeService();

    ServicePtr MakeService() const
    {
        SecurityTokenServiceConfig config;
        config.url = "http://127.0.0.1:" + std::to_string(server.GetPort()) + "/sts";
        return CreateSecurityTokenService(config);
    }

    /** Has operations of every kind of progress: under way, waiting for a thread. */
    void StartAcquisitions(int count)
    {
        for (int index = 0; index < count; ++index) {
            service->AcquireTokenAsync(
                AlicesName,
                AlicesPassword,
                MakeSpec(),
                [](const TokenPtr&, const Quillon::Exception* error) {
                    if (error == nullptr) {
                        std::abort(); // no token can have arrived
                    }
                });
        }
        asked.get_future().wait();
    }
};

[[noreturn]] void ExitWithOperationsInFlight()
{
    static EndingProcess process; // older than the threads, and so there until they have ended
    process.StartAcquisitions(200);
    std::exit(0);
}

[[noreturn]] void ExitFromACompletion()
{
    static EndingProcess process;
    process.StartAcquisitions(10);
    // Its lifetime is refused before anything is sent.
    process.service->AcquireTokenAsync(
        AlicesName, AlicesPassword, MakeSpec(0), [](const TokenPtr&, const Quillon::Exception*) {
            std::exit(0);
        });
    std::promise<void>().get_future().wait();
    std::abort();
}

class AsyncAtTheEnd : public testing::Test
{
protected:
    AsyncAtTheEnd() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

} // namespace

TEST_F(AsyncAtTheEnd, TheProcessExitsWithOperationsInFlight)
{
    EXPECT_EXIT(ExitWithOperationsInFlight(), testing::ExitedWithCode(0), "^$");
}

TEST_F(AsyncAtTheEnd, TheProcessExitsFromACompletion)
{
    EXPECT_EXIT(ExitFromACompletion(), testing::ExitedWithCode(0), "^$");
}
