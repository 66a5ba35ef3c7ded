#include "Operations.h"

#include "quillon/system/Clock.h"
#include "support/TestKdc.h"

#include <gmock/gmock.h>

#include <atomic>
#include <cerrno>
#include <iostream>
#include <tuple>

using namespace Exhaustion;
using Faults::Kind;

namespace {

struct Failure
{
    const char* name;
    Kind kind;
    int error;
    bool mustSurvive = false;
    const char* spared = nullptr;
    const char* only = nullptr;
};

std::ostream& operator<<(std::ostream& out, const Failure& failure)
{
    return out << failure.name;
}

const std::vector<Failure> Failures{
    {"ReadWithEio", Kind::READ, EIO},
    {"ReadWithEintr", Kind::READ, EINTR, true},
    {"WriteWithEio", Kind::WRITE, EIO},
    {"WriteWithEintr", Kind::WRITE, EINTR, true},
    {"SendWithEconnreset", Kind::SEND, ECONNRESET},
    {"SendWithEnomem", Kind::SEND, ENOMEM},
    {"SendWithEintr", Kind::SEND, EINTR, true},
    // For the channel that wakes the I/O thread up it means that this is being woken up.
    {"SendWithEagain", Kind::SEND, EAGAIN, true, "curl_multi_wakeup"},
    {"WakingUpWithEnomem", Kind::SEND, ENOMEM, true, nullptr, "curl_multi_wakeup"},
    {"ReceiveWithEconnreset", Kind::RECEIVE, ECONNRESET},
    {"ReceiveWithEnomem", Kind::RECEIVE, ENOMEM},
    {"ReceiveWithEintr", Kind::RECEIVE, EINTR, true},
    {"ReceiveWithEagain", Kind::RECEIVE, EAGAIN, true},
    {"SocketWithEmfile", Kind::SOCKET, EMFILE},
    {"SocketWithEnomem", Kind::SOCKET, ENOMEM},
    {"ConnectWithEnetunreach", Kind::CONNECT, ENETUNREACH},
    {"ConnectWithEnomem", Kind::CONNECT, ENOMEM},
    {"PollWithEnomem", Kind::POLL, ENOMEM},
    {"PollWithEintr", Kind::POLL, EINTR, true},
    {"ThreadWithEagain", Kind::THREAD, EAGAIN},
    {"RandomWithEio", Kind::RANDOM, EIO},
    {"OpenWithEmfile", Kind::OPEN, EMFILE},
    {"OpenWithEacces", Kind::OPEN, EACCES},
};

class FailedCall : public testing::TestWithParam<Failure>
{
protected:
    static Exhaustion::Run MakeRun()
    {
        Exhaustion::Run run;
        run.kind = GetParam().kind;
        run.error = GetParam().error;
        run.mustSurvive = GetParam().mustSurvive;
        run.spared = GetParam().spared;
        run.only = GetParam().only;
        return run;
    }

    static void ExpectNoFinding(const Operation& operation, const Report& report)
    {
        std::cout << operation.name << ": " << report.failed << " of " << report.calls
                  << " calls failed" << std::endl;
        for (const std::string& finding : report.findings) {
            ADD_FAILURE() << finding;
        }
    }
};

std::string GetName(const testing::TestParamInfo<Failure>& info)
{
    return info.param.name;
}

INSTANTIATE_TEST_SUITE_P(Each, FailedCall, testing::ValuesIn(Failures), &GetName);

/** Jumps by hours, forth and back, each time that it is read. */
class JumpingClock final : public Quillon::System::Clock
{
public:
    JumpingClock() { Quillon::System::ReplaceClock(this); }
    JumpingClock(const JumpingClock&) = delete;
    JumpingClock& operator=(const JumpingClock&) = delete;
    ~JumpingClock() { Quillon::System::ReplaceClock(nullptr); }

    Quillon::System::DateTime Now() const override
    {
        constexpr long long Hour = 3'600'000'000;
        const long long jump = (readings++ % 2 == 0 ? 5 : -7) * Hour;
        const auto now = std::chrono::system_clock::now().time_since_epoch();
        const auto micros = std::chrono::duration_cast<std::chrono::microseconds>(now).count();
        return Quillon::System::DateTimeFromUtc(micros + jump, false);
    }

    mutable std::atomic<unsigned> readings{0};
};

} // namespace

TEST_P(FailedCall, EndsAnOperation)
{
    const Client client;
    for (const Operation& operation :
         {client.GetOperations().front(), client.GetAsyncOperations().front()}) {
        ExpectNoFinding(operation, Exhaust(operation, MakeRun()));
    }
}

// Not after another test in the same process: it forks.
TEST_P(FailedCall, EndsTheFirstOperationOfAProcess)
{
    const Client client({}, "localhost");
    const Operation operation = client.GetFirstAcquisition();
    ExpectNoFinding(operation, ExhaustFreshProcesses(operation, MakeRun()));
}

TEST_P(FailedCall, EndsALookUpOfAName)
{
    const Client client({"--http"}, "localhost");
    const Operation operation = client.GetOperations().front();
    ExpectNoFinding(operation, Exhaust(operation, MakeRun()));
}

TEST(FirstOperation, EndsForLackOfMemory)
{
    const Client client({}, "localhost");
    Exhaustion::Run run;
    run.stride = 499;
    // OpenSSL asks its providers once for the algorithms of a kind, and does without those that
    // there was no memory for.
    run.lasting = "libcrypto";
    const Operation operation = client.GetFirstAcquisition();
    const Report report = ExhaustFreshProcesses(operation, run);
    std::cout << report.failed << " of " << report.calls << " allocations failed, " << report.lasted
              << " for good" << std::endl;
    EXPECT_GT(report.failed, 0U);
    EXPECT_THAT(report.findings, testing::IsEmpty());
}

TEST(JumpingClock, EndsNoOperationOtherwiseThanByAnException)
{
    const Client client;
    const std::vector<Operation> operations = client.GetOperations();
    const JumpingClock clock;
    for (const Operation& operation : operations) {
        const unsigned before = clock.readings;
        try {
            EXPECT_EQ(operation.run(), operation.result);
        } catch (const Quillon::Exception& error) {
            EXPECT_STRNE(error.what(), "");
        }
        EXPECT_GT(clock.readings, before) << operation.name;
    }
}
