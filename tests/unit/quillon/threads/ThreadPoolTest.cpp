#include "quillon/system/ThreadPool.h"

#include "support/PoolSupport.h"
#include "support/TestData.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <cstdlib>
#include <latch>
#include <memory>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

using namespace Quillon;
using namespace Quillon::System;
using namespace Testing;

// In a child that was forked from a process with threads, what only a thread's stack refers to
// looks like a leak.
static bool leakCheckIsOff = false;

extern "C" int __lsan_is_turned_off() // NOLINT(bugprone-reserved-identifier): the sanitizer's
{
    return leakCheckIsOff ? 1 : 0;
}

// There is one pool in a process, so each test runs in a fresh one: a "death test" that ends with
// exit code 0.

namespace {

class ThreadPoolProcess : public testing::Test
{
protected:
    ThreadPoolProcess() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

void Require(bool condition)
{
    if (!condition) {
        std::abort();
    }
}

std::size_t CountCores()
{
    return std::max(std::thread::hardware_concurrency(), 1U);
}

/** Checks something after the pool has ended, because it is made before the pool starts. */
template <class Check>
class AfterTheEnd
{
public:
    explicit AfterTheEnd(const Check& check)
        : _check(check)
    {}
    ~AfterTheEnd() { Require(_check()); }
    AfterTheEnd(const AfterTheEnd&) = delete;
    AfterTheEnd& operator=(const AfterTheEnd&) = delete;

private:
    const Check _check;
};

/** Queues `count` pieces of work that have begun on return and never finish. */
void Block(std::ptrdiff_t count)
{
    static std::latch begun(count);
    for (std::ptrdiff_t index = 0; index < count; ++index) {
        GetThreadPool()->Queue([] {
            begun.count_down();
            for (;;) {
                pause(); // no signal comes
            }
        });
    }
    begun.wait();
}

TEST(ThreadPoolTimes, AreTheDocumentedOnes)
{
    EXPECT_EQ(64U, ThreadPool::DefaultLimit);
    EXPECT_EQ(10, ThreadPool::IdleTimeSec);
    EXPECT_EQ(2, ThreadPool::PatienceSec);
}

TEST_F(ThreadPoolProcess, LetsTheHostHandleAFaultOfItsWork)
{
    EXPECT_EXIT(
        {
            std::signal(SIGSEGV, [](int) { std::_Exit(7); });
            RunOn(*GetThreadPool(), [] { return std::raise(SIGSEGV); });
            std::_Exit(1);
        },
        testing::ExitedWithCode(7),
        "^$");
}

TEST_F(ThreadPoolProcess, StartsWithAThreadForEachCore)
{
    EXPECT_EXIT(
        {
            Require(GetThreadPool() != nullptr && GetThreadPool() == GetThreadPool());
            Require(GetThreadPool()->GetThreadCount() == 0);
            GetThreadPool()->Queue([] {});
            Require(GetThreadPool()->GetThreadCount() == std::min<std::size_t>(CountCores(), 64));
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ThreadPoolProcess, GrowsTo64Threads)
{
    EXPECT_EXIT(
        {
            Block(64);
            GetThreadPool()->Queue(&std::abort);
            Require(GetThreadPool()->GetThreadCount() == 64);
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ThreadPoolProcess, TakesALimitBeforeItStarts)
{
    EXPECT_EXIT(
        {
            SetThreadPoolLimit(1);
            Block(1);
            GetThreadPool()->Queue(&std::abort);
            Require(GetThreadPool()->GetThreadCount() == 1);
            Require(
                GetMessage<InvalidStateException>([] { SetThreadPoolLimit(2); })
                == "The thread pool has started; its limit must be set before the first work.");
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ThreadPoolProcess, MayExitUnused)
{
    EXPECT_EXIT(
        {
            Require(GetThreadPool()->GetThreadCount() == 0);
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ThreadPoolProcess, MayExitOnAThreadOfThePool)
{
    EXPECT_EXIT(
        {
            GetThreadPool()->Queue([] { std::exit(0); });
            std::promise<void>().get_future().wait();
            std::abort();
        },
        testing::ExitedWithCode(0),
        "^$");
}

/** Starts work that finishes when the end of the pool has begun, and not before. */
void StartWorkUntilTheEnd()
{
    static std::atomic<bool> isDone{false};
    static const AfterTheEnd check([] { return isDone.load(); });
    static std::promise<void> begun;
    GetThreadPool()->Queue([] {
        begun.set_value();
        AwaitEnd(*GetThreadPool());
        isDone = true;
    });
    begun.get_future().wait();
}

TEST_F(ThreadPoolProcess, WaitsForWorkWhenItExits)
{
    EXPECT_EXIT(
        {
            StartWorkUntilTheEnd();
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ThreadPoolProcess, WaitsForOtherWorkWhenWorkExits)
{
    EXPECT_EXIT(
        {
            StartWorkUntilTheEnd();
            GetThreadPool()->Queue([] { std::exit(0); });
            std::promise<void>().get_future().wait();
            std::abort();
        },
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ThreadPoolProcess, EndsWithoutWorkThatBlocksForEver)
{
    EXPECT_EXIT(
        {
            Block(3);
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

/** Ends the process with work queued that aborts it if it runs or is destroyed. */
[[noreturn]] void ExitWithWorkQueued()
{
    SetThreadPoolLimit(2);
    static std::latch begun(2);
    for (int index = 0; index < 2; ++index) {
        GetThreadPool()->Queue([] {
            begun.count_down();
            AwaitEnd(*GetThreadPool());
        });
    }
    begun.wait();
    for (int index = 0; index < 8; ++index) {
        const std::shared_ptr<void> bound(nullptr, [](void*) { std::abort(); });
        GetThreadPool()->Queue([bound] { std::abort(); });
    }
    std::exit(0);
}

TEST_F(ThreadPoolProcess, NeitherRunsNorDestroysQueuedWorkWhenItExits)
{
    EXPECT_EXIT(ExitWithWorkQueued(), testing::ExitedWithCode(0), "^$");
}

TEST_F(ThreadPoolProcess, TakesNoWorkAfterItsEnd)
{
    EXPECT_EXIT(
        {
            static const AfterTheEnd check([] {
                return GetMessage<InvalidStateException>([] { GetThreadPool()->Queue([] {}); })
                       == "The process is about to end; the thread pool takes no more work.";
            });
            GetThreadPool()->Queue([] {});
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

/** Signs and verifies, with keys read anew, until the pool takes no more work. */
void Sign(const std::string& key, const std::string& certificate, std::latch& begun, bool isFirst)
{
    const auto privateKey = Crypto::CreatePrivateKey(key);
    const auto publicKey = Crypto::ParsePemCertificates(certificate).front();
    const unsigned char digest[32] = {1, 2, 3};
    const auto signature = privateKey->SignDigest(Crypto::HashAlgorithm::SHA256, digest);
    for (int index = 0; index < 10; ++index) {
        Require(publicKey->GetPublicKey().VerifyDigest(
            Crypto::HashAlgorithm::SHA256, digest, signature.data(), signature.size()));
    }
    if (isFirst) {
        begun.count_down();
    }
    try {
        GetThreadPool()->Queue([&, key, certificate] { Sign(key, certificate, begun, false); });
    } catch (const InvalidStateException&) {
        return; // the end has begun
    }
}

/** Ends the process while OpenSSL, which only work has used, is busy on every thread. */
[[noreturn]] void ExitWhileSigning()
{
    constexpr int Count = 8;
    static std::latch begun(Count);
    const std::string key = ReadTestData("keys/sts-key.pem");
    const std::string certificate = ReadTestData("keys/sts-cert.pem");
    for (int index = 0; index < Count; ++index) {
        GetThreadPool()->Queue([=] { Sign(key, certificate, begun, true); });
    }
    begun.wait();
    std::exit(0);
}

TEST_F(ThreadPoolProcess, LeavesOpenSslAloneWhenItExits)
{
    for (int round = 0; round < 5; ++round) {
        EXPECT_EXIT(ExitWhileSigning(), testing::ExitedWithCode(0), "^$");
    }
}

/** Whether `check` holds in a forked child that exits afterwards. */
template <class Check>
bool HoldsInChild(const Check& check)
{
    const pid_t child = fork();
    if (child == 0) {
        leakCheckIsOff = true;
        std::exit(check() ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

TEST_F(ThreadPoolProcess, TellsAChildThatForkedTooLate)
{
    EXPECT_EXIT(
        {
            Block(1); // the child does not wait for it
            Require(HoldsInChild([] {
                return GetMessage<InvalidStateException>([] { GetThreadPool()->Queue([] {}); })
                       == "The process has forked after its first work on the thread pool; the "
                          "child cannot queue any. Fork first.";
            }));
            Require(HoldsInChild([] {
                return GetThreadPool()->GetThreadCount() == 0
                       && GetMessage<InvalidStateException>([] { SetThreadPoolLimit(2); })
                              == "The thread pool has started; its limit must be set before the "
                                 "first work.";
            }));
            Require(RunOn(*GetThreadPool(), [] { return 7; }) == 7);
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

TEST_F(ThreadPoolProcess, MayForkBeforeItsFirstWork)
{
    EXPECT_EXIT(
        {
            const auto isUsable = [] { return RunOn(*GetThreadPool(), [] { return 7; }) == 7; };
            Require(HoldsInChild(isUsable));
            Require(isUsable());
            std::exit(0);
        },
        testing::ExitedWithCode(0),
        "^$");
}

} // namespace
