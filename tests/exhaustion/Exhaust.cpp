#include "Exhaust.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string_view>
#include <thread>

#include <sys/wait.h>
#include <unistd.h>

namespace Exhaustion {

namespace {

/** No operation takes a fraction of it. */
constexpr unsigned LongestSeconds = 60;

/** Caches are filled and sessions of TLS are kept up to a number. */
constexpr int WarmUps = 24;

/** How long threads may go on after an operation; a short time where it is looked at again. */
constexpr std::chrono::milliseconds LongPatience{300};
constexpr std::chrono::milliseconds ShortPatience{10};

/** A process that does not show how it ended shows these. */
constexpr int NotReached = 0;
constexpr int InOrder = 2;
constexpr int Accepted = 3;
constexpr int NoStandardException = 4;
constexpr int DoesNotRecover = 5;
constexpr int MayNotRecover = 6;

std::array<char, 200> situation{};

void Print(std::string_view text) noexcept
{
    static_cast<void>(!::write(STDERR_FILENO, text.data(), text.size()));
}

[[noreturn]] void GiveUp(const char* what)
{
    Faults::Disarm();
    Print(what);
    Print(situation.data());
    Print(Faults::DescribeLatest());
    Print("  and now it is in\n");
    Print(Faults::DescribeHere());
    _exit(1);
}

[[noreturn]] void OnSignal(int number)
{
    GiveUp(number == SIGALRM ? "\nNo end of: " : "\nA crash of: ");
}

void WatchOver()
{
    std::set_terminate([] { GiveUp("\nstd::terminate of: "); });
    for (const int number : {SIGALRM, SIGSEGV, SIGABRT, SIGBUS, SIGFPE, SIGILL}) {
        std::signal(number, &OnSignal);
    }
}

unsigned long GetFromEnvironment(const char* name, unsigned long otherwise)
{
    const char* const text = std::getenv(name);
    return text != nullptr ? std::strtoul(text, nullptr, 10) : otherwise;
}

Faults::Plan MakePlan(const Run& run, unsigned long nth)
{
    Faults::Plan plan;
    plan.kind = run.kind;
    plan.nth = nth;
    plan.fromThereOn = run.fromThereOn;
    plan.error = run.error;
    plan.spared = run.spared;
    plan.only = run.only;
    return plan;
}

/** What came of one run. */
struct Outcome
{
    std::optional<std::string> result;
    bool isStandard = true;
    std::string error;
    unsigned long calls = 0;
};

Outcome Try(const Operation& operation, const Faults::Plan& plan)
{
    Outcome outcome;
    alarm(LongestSeconds);
    std::snprintf(
        situation.data(),
        situation.size(),
        "%s, call %lu of kind %d fails with %d%s\n",
        operation.name.c_str(),
        plan.nth,
        static_cast<int>(plan.kind),
        plan.error,
        plan.fromThereOn ? ", and all after it" : "");
    Faults::Arm(plan);
    try {
        std::string result = operation.run();
        outcome.calls = Faults::Disarm();
        outcome.result = std::move(result);
    } catch (const std::exception& error) {
        outcome.calls = Faults::Disarm();
        outcome.error = error.what();
    } catch (...) {
        outcome.calls = Faults::Disarm();
        outcome.isStandard = false;
    }
    alarm(0);
    return outcome;
}

/** Threads of the libraries may still be putting away what is left of an operation. */
template <class Count>
long Settle(const Count& count, long wanted, std::chrono::milliseconds atMost = LongPatience)
{
    const auto deadline = std::chrono::steady_clock::now() + atMost;
    long left = count();
    while (left > wanted && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
        left = count();
    }
    return left;
}

class Exhauster
{
public:
    Exhauster(const Operation& operation, const Run& run)
        : _operation(operation)
        , _run(run)
        , _stride(GetFromEnvironment("EXHAUSTION_STRIDE", run.stride))
    {}

    Report RunAll()
    {
        WatchOver();
        for (int i = 0; i < WarmUps; ++i) {
            const Outcome outcome = Try(_operation, MakePlan(_run, 0));
            _report.calls = outcome.calls;
            Expect(outcome, "without a failure", 0);
        }
        const long descriptors = Faults::CountDescriptors();
        unsigned long nth = GetFromEnvironment("EXHAUSTION_FROM", 1);
        bool isReached = true;
        for (; isReached && _report.findings.size() < 10; nth += _stride) {
            isReached = RunOne(nth);
        }
        const long left = Settle(&Faults::CountDescriptors, descriptors);
        if (left > descriptors) {
            Note(std::to_string(left - descriptors) + " descriptors are lost", 0);
        }
        return _report;
    }

private:
    bool RunOne(unsigned long nth)
    {
        const long before = Settle(&Faults::CountBlocks, _usual, ShortPatience);
        _usual = before;
        const Outcome outcome = Try(_operation, MakePlan(_run, nth));
        if (outcome.calls < nth) {
            return false;
        }
        const bool isSpared = Faults::DescribeLatest().empty();
        (isSpared ? _report.spared : _report.failed) += 1;
        Judge(outcome, nth);
        Expect(Try(_operation, Faults::Plan()), "afterwards", nth);
        if (Settle(&Faults::CountBlocks, before, ShortPatience) > before) {
            JudgeGrowth(nth);
        }
        return true;
    }

    void Judge(const Outcome& outcome, unsigned long nth)
    {
        if (!outcome.isStandard) {
            Note("no std::exception", nth);
        }
        if (outcome.result && outcome.result != _operation.result) {
            Note("another result: " + *outcome.result, nth);
        }
        if (_run.mustSurvive && !outcome.result && _operation.result) {
            Note("does not survive: " + outcome.error, nth);
        }
    }

    void Expect(const Outcome& outcome, const char* when, unsigned long nth)
    {
        if (outcome.result != _operation.result) {
            Note(
                std::string(when) + ": "
                    + (outcome.result ? "another result: " + *outcome.result : outcome.error),
                nth);
        }
    }

    /** What is kept once for all later calls is no leak; what is lost again each time is. */
    void JudgeGrowth(unsigned long nth)
    {
        constexpr int Repeats = 4;
        for (int i = 0; i < Repeats; ++i) {
            const long before = Faults::CountBlocks();
            Try(_operation, MakePlan(_run, nth));
            Try(_operation, Faults::Plan());
            if (Settle(&Faults::CountBlocks, before) <= before) {
                return;
            }
        }
        NoteLoss(nth);
    }

    void NoteLoss(unsigned long nth)
    {
        Faults::StartRecording();
        Try(_operation, MakePlan(_run, nth));
        const std::string failed = Faults::DescribeLatest();
        Try(_operation, Faults::Plan());
        Settle(&Faults::CountBlocks, 0);
        Note(
            "memory is lost:\n" + Faults::StopRecording() + "  after a failure in\n" + failed, nth);
    }

    void Note(const std::string& what, unsigned long nth)
    {
        _report.findings.push_back(
            _operation.name + ", call " + std::to_string(nth) + ": " + what + "\n"
            + (what.find('\n') == std::string::npos ? Faults::DescribeLatest() : ""));
    }

    const Operation& _operation;
    const Run& _run;
    const unsigned long _stride;
    Report _report;
    long _usual = 0; ///< how many blocks there are between two runs
};

/** In a process of its own. */
[[noreturn]] void TryAndExit(const Operation& operation, const Run& run, unsigned long nth)
{
    WatchOver();
    const Outcome outcome = Try(operation, MakePlan(run, nth));
    if (outcome.calls < nth) {
        _exit(NotReached);
    }
    if (outcome.result && outcome.result != operation.result) {
        _exit(Accepted);
    }
    if (!outcome.isStandard) {
        _exit(NoStandardException);
    }
    const std::string failed = Faults::DescribeLatest();
    const std::string happened = situation.data() + failed;
    const Outcome again = Try(operation, Faults::Plan());
    if (again.result != operation.result) {
        if (run.lasting != nullptr && failed.find(run.lasting) != std::string::npos) {
            _exit(MayNotRecover);
        }
        Print("\nAfterwards: " + again.error + "\n" + happened);
        _exit(DoesNotRecover);
    }
    _exit(InOrder);
}

} // namespace

Report Exhaust(const Operation& operation, const Run& run)
{
    return Exhauster(operation, run).RunAll();
}

Report ExhaustFreshProcesses(const Operation& operation, const Run& run)
{
    Report report;
    const unsigned long stride = GetFromEnvironment("EXHAUSTION_STRIDE", run.stride);
    for (unsigned long nth = GetFromEnvironment("EXHAUSTION_FROM", 1); report.findings.size() < 10;
         nth += stride) {
        const pid_t child = fork();
        if (child == 0) {
            TryAndExit(operation, run, nth);
        }
        int status = 0;
        waitpid(child, &status, 0);
        const int ending = WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
        if (ending == NotReached) {
            return report;
        }
        ++report.failed;
        report.calls = nth;
        report.lasted += ending == MayNotRecover ? 1 : 0;
        if (ending != InOrder && ending != MayNotRecover) {
            report.findings.push_back(
                operation.name + ", call " + std::to_string(nth) + ": the process ends with "
                + std::to_string(ending));
        }
    }
    return report;
}

} // namespace Exhaustion
