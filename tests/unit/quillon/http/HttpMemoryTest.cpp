#include "HttpClient.h"
#include "support/FreedMemory.h"

#include <gtest/gtest.h>

#include <atomic>
#include <string_view>
#include <sys/wait.h>
#include <thread>

using namespace Quillon::Http;
using namespace Testing;
using Quillon::Ref;

// What needs a hand in the heap of the whole program.

namespace {

constexpr std::string_view Secret = "Sw0rdfish-that-nothing-else-in-here-is-called";

/** Writes the secret, which no string of the test ever holds, between other text. */
void WriteSecret(ClientRequest& request)
{
    const std::string filler(1000, 'x');
    request.GetBodyWriter()->Write(Secret.data(), Secret.size());
    for (int count = 0; count < 8; ++count) { // so that the body is moved in memory
        request.GetBodyWriter()->Write(filler.data(), filler.size());
    }
}

TEST(ClientRequest, LeavesNothingOfItsBodyInFreedMemory)
{
    const FreedMemory freed(Secret);
    Ref<ClientRequest> request;
    CreateHttpRequest(HttpMethod::POST, "/", request);
    WriteSecret(*request);
    EXPECT_FALSE(freed.HeldTheText());
    request.reset();
    EXPECT_FALSE(freed.HeldTheText());
}

TEST(ClientRequest, LeavesNothingOfItsBodyInFreedMemoryWhenItWasCalledOff)
{
    // The server shares the heap, so it reads nothing.
    const TestServer server([](ServerConnection&) {});
    HttpClient client(server);
    const FreedMemory freed(Secret);
    {
        Ref<ClientRequest> request;
        CreateHttpRequest(HttpMethod::POST, "/", request);
        WriteSecret(*request);
        EXPECT_NE("", client.PostAndFail(request));
    }
    EXPECT_FALSE(freed.HeldTheText());
}

/** Where the thread is that makes an agent. */
enum class Stage
{
    RUNNING,
    STOPPED,
    RESUMED,
    ENDED
};

constexpr int Never = -1;

std::atomic<Stage> stage{Stage::RUNNING};
thread_local int allocationsBeforeTheStop = Never;

void StopIfDue()
{
    if (allocationsBeforeTheStop == Never || allocationsBeforeTheStop-- > 0) {
        return;
    }
    stage = Stage::STOPPED;
    stage.notify_all();
    stage.wait(Stage::STOPPED);
}

enum ChildResult
{
    MADE = 0,
    TOLD = 1,
    HUNG = -1
};

/** Makes an agent in a forked child. */
int MakeAgentInChild(const Ref<ConnectionSpec>& spec)
{
    const pid_t child = fork();
    if (child == 0) {
        alarm(10); // a child that hangs ends here
        ChildResult result = MADE;
        try {
            HttpClient client(spec);
        } catch (const HttpException&) {
            result = TOLD;
        }
        std::_Exit(result);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : HUNG;
}

/** Forks at each allocation of a thread that makes an agent; one of them is inside the lock. */
[[noreturn]] void ForkAtEachAllocation()
{
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec("127.0.0.1", 80, false, spec);
    beforeAllocation = &StopIfDue;
    int told = 0;
    bool hasHung = false;
    for (int number = 0; stage != Stage::ENDED && !hasHung; ++number) {
        stage = Stage::RUNNING;
        std::thread maker([&] {
            allocationsBeforeTheStop = number;
            {
                Ref<UserAgent> agent;
                CreateHttpUserAgent(spec.get(), nullptr, nullptr, agent);
            }
            const bool wasStopped = allocationsBeforeTheStop == Never;
            allocationsBeforeTheStop = Never;
            stage = wasStopped ? Stage::RUNNING : Stage::ENDED;
            stage.notify_all();
        });
        stage.wait(Stage::RUNNING);
        if (stage == Stage::STOPPED) {
            const int result = MakeAgentInChild(spec);
            told += result == TOLD ? 1 : 0;
            hasHung = result == HUNG;
            stage = Stage::RESUMED;
            stage.notify_all();
        }
        maker.join();
    }
    std::_Exit(told == 1 && !hasHung ? 0 : 1);
}

TEST(CreateHttpUserAgent, TellsAChildThatWasForkedInsideTheLock)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(ForkAtEachAllocation(), testing::ExitedWithCode(0), "^$");
}

} // namespace
