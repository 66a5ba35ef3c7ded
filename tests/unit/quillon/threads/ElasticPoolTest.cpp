#include "threads/ElasticPool.h"

#include "support/PoolSupport.h"

#include "quillon/service/Logger.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <csignal>
#include <latch>
#include <memory>
#include <numeric>
#include <pthread.h>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

using namespace Quillon;
using namespace Quillon::System;
using namespace Testing;
using namespace std::chrono_literals;

namespace {

constexpr auto Never = std::chrono::hours(1);

ElasticPoolOptions MakeOptions(
    std::size_t initial, std::size_t limit, std::chrono::milliseconds idleTime = Never)
{
    return {initial, limit, idleTime};
}

/** Queues `count` pieces of work that have all begun on return, and hold until `gate` opens. */
void Occupy(ElasticPool& pool, const Gate& gate, std::ptrdiff_t count)
{
    const auto begun = std::make_shared<std::latch>(count);
    for (std::ptrdiff_t index = 0; index < count; ++index) {
        pool.Queue([begun, wait = gate.MakeWaiter()] {
            begun->count_down();
            wait();
        });
    }
    begun->wait();
}

std::thread::id GetThreadId(ElasticPool& pool)
{
    return RunOn(pool, [] { return std::this_thread::get_id(); });
}

} // namespace

TEST(QueueWork, RunsOnAnotherThread)
{
    ElasticPool pool(MakeOptions(1, 1));
    EXPECT_NE(std::this_thread::get_id(), GetThreadId(pool));
}

TEST(QueueWork, BeginsInOrderOnOneThread)
{
    constexpr int Count = 200;
    std::vector<int> order;
    ElasticPool pool(MakeOptions(1, 1));
    Gate gate;
    Occupy(pool, gate, 1);
    for (int index = 0; index < Count; ++index) {
        pool.Queue([&order, index] { order.push_back(index); });
    }
    gate.Open();
    std::vector<int> expected(Count);
    std::iota(expected.begin(), expected.end(), 0);
    EXPECT_EQ(expected, RunOn(pool, [&order] { return order; }));
}

TEST(QueueWork, MayBeCalledByWork)
{
    ElasticPool pool(MakeOptions(1, 1));
    std::promise<int> result;
    pool.Queue([&] { pool.Queue([&] { result.set_value(7); }); });
    EXPECT_EQ(7, result.get_future().get());
}

TEST(QueueWork, StartsTheInitialThreadsWithTheFirstWork)
{
    ElasticPool pool(MakeOptions(3, 8));
    EXPECT_EQ(0U, pool.GetThreadCount());
    pool.Queue([] {});
    EXPECT_EQ(3U, pool.GetThreadCount());
}

TEST(QueueWork, StartsNoMoreThreadsThanTheLimit)
{
    ElasticPool pool(MakeOptions(8, 2));
    pool.Queue([] {});
    EXPECT_EQ(2U, pool.GetThreadCount());
}

TEST(QueueWork, GrowsToTheLimitAndNoFurther)
{
    std::atomic<bool> hasRun{false};
    ElasticPool pool(MakeOptions(1, 4));
    Gate gate;
    Occupy(pool, gate, 4);
    EXPECT_EQ(4U, pool.GetThreadCount());
    pool.Queue([&] { hasRun = true; });
    EXPECT_EQ(4U, pool.GetThreadCount());
    EXPECT_FALSE(hasRun);
    gate.Open();
    Gate secondGate;
    Occupy(pool, secondGate, 4); // on all threads, so what began before is over
    EXPECT_TRUE(hasRun);
    EXPECT_EQ(4U, pool.GetThreadCount());
}

TEST(QueueWork, DoesNotWaitForBlockedWorkBelowTheLimit)
{
    ElasticPool pool(MakeOptions(2, 3));
    Gate gate;
    Occupy(pool, gate, 2);
    EXPECT_EQ(7, RunOn(pool, [] { return 7; }));
    EXPECT_EQ(3U, pool.GetThreadCount());
}

TEST(QueueWork, CountsAnIdleThreadOnce)
{
    for (int round = 0; round < 100; ++round) {
        ElasticPool pool(MakeOptions(1, 2));
        GetThreadId(pool);
        Gate gate;
        Occupy(pool, gate, 2); // returns only if the second has a thread of its own
    }
}

TEST(QueueWork, UsesIdleThreadsBeforeItGrows)
{
    ElasticPool pool(MakeOptions(4, 8));
    Gate gate;
    Occupy(pool, gate, 4);
    EXPECT_EQ(4U, pool.GetThreadCount());
    Occupy(pool, gate, 1);
    EXPECT_EQ(5U, pool.GetThreadCount());
}

TEST(QueueWork, RefusesEmptyWork)
{
    ElasticPool pool(MakeOptions(1, 1));
    EXPECT_EQ(
        "Invalid argument : the work for the thread pool is empty",
        GetMessage<InvalidArgumentException>([&] { pool.Queue(Functor()); }));
    EXPECT_EQ(0U, pool.GetThreadCount());
}

TEST(QueueWork, RunsEverythingThatManyThreadsQueue)
{
    constexpr int Producers = 4;
    constexpr int Count = 300;
    std::atomic<int> runs{0};
    std::latch done(Producers * Count);
    ElasticPool pool(MakeOptions(1, 3, 0ms));
    std::vector<std::thread> producers;
    for (int index = 0; index < Producers; ++index) {
        producers.emplace_back([&] {
            for (int work = 0; work < Count; ++work) {
                pool.Queue([&] {
                    ++runs;
                    done.count_down();
                });
            }
        });
    }
    for (std::thread& producer : producers) {
        producer.join();
    }
    done.wait();
    EXPECT_EQ(Producers * Count, runs);
    EXPECT_LE(pool.GetThreadCount(), 3U);
}

TEST(ThreadsOfThePool, GoWhenTheyAreIdleButForTheInitialOnes)
{
    ElasticPool pool(MakeOptions(2, 5, 1ms));
    for (int round = 0; round < 2; ++round) {
        Gate gate;
        Occupy(pool, gate, 5);
        EXPECT_EQ(5U, pool.GetThreadCount());
        gate.Open();
        while (pool.GetThreadCount() > 2) {
            std::this_thread::yield();
        }
    }
    GetThreadId(pool);
    EXPECT_LE(2U, pool.GetThreadCount());
}

TEST(ThreadsOfThePool, GoEvenIfTheOthersAreKeptBusy)
{
    ElasticPool pool(MakeOptions(1, 8, 1ms));
    {
        Gate gate;
        Occupy(pool, gate, 8);
    }
    while (pool.GetThreadCount() > 4) {
        GetThreadId(pool);
    }
}

TEST(ThreadsOfThePool, StayUntilTheyHaveBeenIdleLongEnough)
{
    static thread_local bool isKnown = false;
    std::atomic<int> known{0};
    ElasticPool pool(MakeOptions(1, 4));
    for (int round = 0; round < 2; ++round) {
        Gate gate;
        const auto begun = std::make_shared<std::latch>(4);
        for (int index = 0; index < 4; ++index) {
            pool.Queue([&known, begun, wait = gate.MakeWaiter()] {
                known += isKnown ? 1 : 0;
                isKnown = true;
                begun->count_down();
                wait();
            });
        }
        begun->wait();
        EXPECT_EQ(4 * round, known);
    }
}

TEST(ThreadsOfThePool, TakeNoSignalsButThoseOfTheirOwnFaults)
{
    sigset_t before;
    pthread_sigmask(SIG_SETMASK, nullptr, &before);
    ElasticPool pool(MakeOptions(1, 1));
    const sigset_t mask = RunOn(pool, [] {
        sigset_t own;
        pthread_sigmask(SIG_SETMASK, nullptr, &own);
        return own;
    });
    sigset_t after;
    pthread_sigmask(SIG_SETMASK, nullptr, &after);
    const std::set<int> open{
        SIGKILL, SIGSTOP, SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGTRAP, SIGSYS, SIGABRT};
    for (int signal = 1; signal <= SIGSYS; ++signal) {
        EXPECT_EQ(!open.contains(signal), sigismember(&mask, signal) == 1) << signal;
        EXPECT_EQ(sigismember(&before, signal), sigismember(&after, signal)) << signal;
    }
}

// What work throws.

namespace {

/** Gathers the lines of all loggers while it lives. */
class Capture
{
public:
    Capture()
    {
        Service::GetApp()->GetLogFacility().SetSink(
            [this](const std::string& logger, int level, const std::string& text) {
                const std::lock_guard<std::mutex> lock(_mutex);
                _lines.push_back(logger + "|" + std::to_string(level) + "|" + text);
            });
    }
    ~Capture() { Service::GetApp()->GetLogFacility().SetSink(Service::LogSink()); }
    Capture(const Capture&) = delete;
    Capture& operator=(const Capture&) = delete;

    std::vector<std::string> GetLines() const
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return _lines;
    }

private:
    mutable std::mutex _mutex;
    std::vector<std::string> _lines;
};

/** The lines that `work` causes, which must leave the one thread of a pool alive. */
std::vector<std::string> GetLinesOf(const Functor& work)
{
    const Capture capture;
    ElasticPool pool(MakeOptions(1, 1));
    const std::thread::id before = GetThreadId(pool);
    pool.Queue(work);
    EXPECT_EQ(before, GetThreadId(pool));
    EXPECT_EQ(1U, pool.GetThreadCount());
    return capture.GetLines();
}

using Lines = std::vector<std::string>;

/** Throws when it is destroyed on a thread other than the one that made it. */
template <std::size_t Size>
class ThrowsInDestructor
{
public:
    void operator()() const {}
    ThrowsInDestructor() = default;
    ThrowsInDestructor(const ThrowsInDestructor& other) = default;
    ~ThrowsInDestructor() noexcept(false)
    {
        if (std::this_thread::get_id() != _maker) {
            throw std::logic_error("cannot be released");
        }
    }

private:
    std::thread::id _maker = std::this_thread::get_id();
    std::shared_ptr<int> _member = std::make_shared<int>(1);
    std::array<char, Size> _size{};
};

} // namespace

TEST(ExceptionOfWork, IsLoggedIfItIsOneOfTheLibrary)
{
    EXPECT_EQ(
        Lines{"Quillon|8|A piece of work on the thread pool raised InvalidStateException: no way"},
        GetLinesOf([] { throw InvalidStateException("no way"); }));
}

TEST(ExceptionOfWork, IsLoggedIfItIsStandard)
{
    EXPECT_EQ(
        Lines{"Quillon|8|A piece of work on the thread pool raised runtime_error: too late"},
        GetLinesOf([] { throw std::runtime_error("too late"); }));
}

TEST(ExceptionOfWork, IsLoggedIfItIsAnythingElse)
{
    EXPECT_EQ(
        Lines{"Quillon|8|A piece of work on the thread pool raised something that is not an "
              "exception."},
        GetLinesOf([] { throw 42; }));
}

TEST(ExceptionOfWork, IsLoggedIfTheCompletionIsEmpty)
{
    EXPECT_THAT(
        GetLinesOf([completion = Functor()] { completion(); }),
        testing::ElementsAre(testing::AllOf(
            testing::StartsWith("Quillon|8|A piece of work on the thread pool raised "),
            testing::HasSubstr("bad_function_call"),
            testing::EndsWith(": call to empty boost::function"))));
}

TEST(ExceptionOfDestructor, IsLoggedForSmallWork)
{
    EXPECT_EQ(
        Lines{"Quillon|8|Releasing a piece of work on the thread pool raised logic_error: cannot "
              "be released"},
        GetLinesOf(ThrowsInDestructor<1>()));
}

TEST(ExceptionOfDestructor, IsLoggedForLargeWork)
{
    EXPECT_EQ(
        Lines{"Quillon|8|Releasing a piece of work on the thread pool raised logic_error: cannot "
              "be released"},
        GetLinesOf(ThrowsInDestructor<200>()));
}

TEST(Work, MayEndItsThread)
{
    const Capture capture;
    ElasticPool pool(MakeOptions(1, 1));
    const auto bound = std::make_shared<int>();
    for (int round = 0; round < 3; ++round) {
        pool.Queue([bound] { pthread_exit(nullptr); });
    }
    EXPECT_EQ(4, RunOn(pool, [] { return 4; }));
    EXPECT_EQ(1, bound.use_count());
    EXPECT_EQ(1U, pool.GetThreadCount());
    EXPECT_EQ(Lines(), capture.GetLines());
}

// What work owns.

TEST(Work, IsReleasedOnThePoolsThread)
{
    std::promise<std::thread::id> releasedOn;
    ElasticPool pool(MakeOptions(1, 1));
    const std::thread::id thread = GetThreadId(pool);
    Gate gate;
    Occupy(pool, gate, 1);
    {
        const std::shared_ptr<void> bound(
            nullptr, [&](void*) { releasedOn.set_value(std::this_thread::get_id()); });
        pool.Queue([bound] {});
    }
    gate.Open();
    EXPECT_EQ(thread, releasedOn.get_future().get());
}

TEST(Work, IsReleasedBeforeTheNextBegins)
{
    const Capture capture;
    ElasticPool pool(MakeOptions(1, 1));
    Gate gate;
    Occupy(pool, gate, 1);
    std::weak_ptr<int> watch;
    {
        const auto bound = std::make_shared<int>(1);
        watch = bound;
        pool.Queue([bound] { throw std::runtime_error(std::to_string(*bound)); });
    }
    gate.Open();
    EXPECT_TRUE(RunOn(pool, [&] { return watch.expired(); }));
}

TEST(Work, IsReleasedBeforeItsThreadWaits)
{
    std::promise<void> released;
    ElasticPool pool(MakeOptions(1, 1));
    pool.Queue([bound = std::shared_ptr<void>(nullptr, [&](void*) { released.set_value(); })] {});
    released.get_future().wait();
}

// The limit.

TEST(SetLimit, HoldsForTheFirstWork)
{
    ElasticPool pool(MakeOptions(2, 4));
    pool.SetLimit(1);
    pool.Queue([] {});
    EXPECT_EQ(1U, pool.GetThreadCount());
}

TEST(SetLimit, MayRaiseTheLimit)
{
    ElasticPool pool(MakeOptions(1, 1));
    pool.SetLimit(3);
    Gate gate;
    Occupy(pool, gate, 3);
    EXPECT_EQ(3U, pool.GetThreadCount());
}

TEST(SetLimit, RefusesNone)
{
    ElasticPool pool(MakeOptions(1, 1));
    EXPECT_EQ(
        "Invalid argument : the thread pool needs at least one thread",
        GetMessage<InvalidArgumentException>([&] { pool.SetLimit(0); }));
}

TEST(SetLimit, RefusesAStartedPool)
{
    ElasticPool pool(MakeOptions(1, 4));
    pool.Queue([] {});
    EXPECT_EQ(
        "The thread pool has started; its limit must be set before the first work.",
        GetMessage<InvalidStateException>([&] { pool.SetLimit(2); }));
}

// A system that gives no threads.

namespace {

/** Lets no thread start while it lives: none gets a stack of that size. */
class NoMoreThreads
{
public:
    NoMoreThreads()
    {
        pthread_getattr_default_np(&_old);
        pthread_attr_t huge;
        pthread_attr_init(&huge);
        pthread_attr_setstacksize(&huge, std::size_t{1} << 47);
        if (pthread_setattr_default_np(&huge) != 0) {
            ADD_FAILURE() << "The default size of stacks cannot be set.";
        }
        pthread_attr_destroy(&huge);
    }
    ~NoMoreThreads()
    {
        pthread_setattr_default_np(&_old);
        pthread_attr_destroy(&_old);
    }
    NoMoreThreads(const NoMoreThreads&) = delete;
    NoMoreThreads& operator=(const NoMoreThreads&) = delete;

private:
    pthread_attr_t _old{};
};

} // namespace

TEST(QueueWork, FailsIfNoThreadCanBeStarted)
{
    std::atomic<bool> hasRun{false};
    ElasticPool pool(MakeOptions(2, 4));
    const auto bound = std::make_shared<int>();
    {
        const NoMoreThreads none;
        EXPECT_EQ(
            "The thread pool cannot start a thread: Resource temporarily unavailable",
            GetMessage<InvalidStateException>(
                [&] { pool.Queue([&hasRun, bound] { hasRun = true; }); }));
    }
    EXPECT_EQ(0U, pool.GetThreadCount());
    EXPECT_EQ(1, bound.use_count());
    GetThreadId(pool);
    EXPECT_FALSE(hasRun);
    EXPECT_EQ(2U, pool.GetThreadCount());
}

TEST(QueueWork, WaitsIfNoFurtherThreadCanBeStarted)
{
    std::promise<void> ran;
    ElasticPool pool(MakeOptions(1, 4));
    Gate gate;
    Occupy(pool, gate, 1);
    {
        const NoMoreThreads none;
        pool.Queue([&] { ran.set_value(); });
    }
    EXPECT_EQ(1U, pool.GetThreadCount());
    gate.Open();
    ran.get_future().wait();
}

// The end.

TEST(EndOfPool, WaitsForWorkThatHasBegun)
{
    std::promise<void> begun;
    std::atomic<bool> isDone{false};
    ElasticPool pool(MakeOptions(1, 4));
    pool.Queue([&] {
        begun.set_value();
        AwaitEnd(pool);
        isDone = true;
    });
    begun.get_future().wait();
    pool.End(Never);
    EXPECT_TRUE(isDone);
}

TEST(EndOfPool, DoesNotWaitForEver)
{
    ElasticPool pool(MakeOptions(1, 4));
    Gate gate;
    Occupy(pool, gate, 2);
    pool.End(1ms);
    EXPECT_EQ(2U, pool.GetThreadCount());
}

TEST(EndOfPool, DoesNotWaitForIdleThreads)
{
    ElasticPool pool(MakeOptions(3, 4));
    GetThreadId(pool);
    pool.End(Never);
    EXPECT_EQ(3U, pool.GetThreadCount());
}

TEST(EndOfPool, KeepsWhatHasNotBegun)
{
    std::atomic<bool> hasRun{false};
    std::weak_ptr<int> watch;
    {
        ElasticPool pool(MakeOptions(1, 1));
        Gate gate;
        Occupy(pool, gate, 1);
        {
            const auto bound = std::make_shared<int>();
            watch = bound;
            pool.Queue([&hasRun, bound] { hasRun = true; });
        }
        pool.End(0ms);
        gate.Open();
        pool.End(Never);
        EXPECT_FALSE(hasRun);
        EXPECT_FALSE(watch.expired());
    }
    EXPECT_FALSE(hasRun);
    EXPECT_TRUE(watch.expired());
}

TEST(EndOfPool, DoesNotWaitForTheWorkThatCallsIt)
{
    ElasticPool pool(MakeOptions(1, 4));
    std::promise<void> ended;
    pool.Queue([&] {
        pool.End(Never);
        ended.set_value();
    });
    ended.get_future().wait();
}

TEST(EndOfPool, WaitsForOtherWorkWhenWorkCallsIt)
{
    std::promise<void> begun;
    std::atomic<bool> isDone{false};
    ElasticPool pool(MakeOptions(1, 4));
    pool.Queue([&] {
        begun.set_value();
        AwaitEnd(pool);
        isDone = true;
    });
    begun.get_future().wait();
    EXPECT_TRUE(RunOn(pool, [&] {
        pool.End(Never);
        return isDone.load();
    }));
}

TEST(EndOfPool, RefusesWorkFromThenOn)
{
    ElasticPool pool(MakeOptions(1, 4));
    pool.End(Never);
    const auto bound = std::make_shared<int>();
    EXPECT_EQ(
        "The process is about to end; the thread pool takes no more work.",
        GetMessage<InvalidStateException>([&] { pool.Queue([bound] {}); }));
    EXPECT_EQ(1, bound.use_count());
    EXPECT_EQ(0U, pool.GetThreadCount());
}

TEST(EndOfPool, MayComeWhileThreadsGo)
{
    for (int round = 0; round < 20; ++round) {
        ElasticPool pool(MakeOptions(1, 4, 0ms));
        {
            Gate gate;
            Occupy(pool, gate, 4);
        }
        pool.End(Never);
        EXPECT_LE(pool.GetThreadCount(), 4U);
    }
}

TEST(DestroyPool, WaitsForWorkThatHasBegunAndDropsTheRest)
{
    std::atomic<bool> isDone{false};
    std::atomic<bool> hasRun{false};
    std::weak_ptr<int> watch;
    std::promise<void> begun;
    std::promise<void> opened;
    std::thread opener;
    {
        ElasticPool pool(MakeOptions(1, 1));
        pool.Queue([&] {
            begun.set_value();
            opened.get_future().wait();
            isDone = true;
        });
        begun.get_future().wait();
        {
            const auto bound = std::make_shared<int>();
            watch = bound;
            pool.Queue([&hasRun, bound] { hasRun = true; });
        }
        pool.End(0ms);
        opener = std::thread([&] { opened.set_value(); });
    }
    EXPECT_TRUE(isDone);
    EXPECT_FALSE(hasRun);
    EXPECT_TRUE(watch.expired());
    opener.join();
}

// Preparations.

namespace {

std::atomic<int> preparations{0};

} // namespace

TEST(PreparePool, HappensOnceBeforeTheFirstThread)
{
    preparations = 0;
    ElasticPoolOptions options = MakeOptions(1, 2);
    options.prepare = [] { return ++preparations == 1; };
    ElasticPool pool(options);
    EXPECT_EQ(0, preparations);
    {
        const NoMoreThreads none;
        EXPECT_THROW(pool.Queue([] {}), InvalidStateException);
    }
    EXPECT_EQ(1, preparations);
    GetThreadId(pool);
    GetThreadId(pool);
    EXPECT_EQ(1, preparations);
}

TEST(PreparePool, MayFindThatTheEndHasBegun)
{
    ElasticPoolOptions options = MakeOptions(1, 2);
    options.prepare = [] { return false; };
    ElasticPool pool(options);
    EXPECT_EQ(
        "The process is about to end; the thread pool takes no more work.",
        GetMessage<InvalidStateException>([&] { pool.Queue([] {}); }));
    EXPECT_EQ(0U, pool.GetThreadCount());
}
