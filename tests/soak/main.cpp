#include "Saboteur.h"
#include "Workload.h"

#include "quillon/http/HttpException.h"
#include "quillon/system/ThreadPool.h"
#include "support/TestKdc.h"

#include <barrier>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iostream>
#include <latch>
#include <malloc.h>
#include <memory>
#include <optional>
#include <spawn.h>
#include <stdexcept>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

// The library under load, beside a service that fails. Prints what it finds; ends with 1 if that is
// not in order.

using namespace Soak;
using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

extern char** environ;

namespace {

constexpr unsigned Threads = 8;
constexpr int Tenths = 10;
constexpr long long TimeoutMs = 5'000;

struct Options
{
    std::string form = "soak"; ///< or "flood", "hang", "brief"
    double seconds = 10;
    unsigned count = 0; ///< of operations, for the other forms
    unsigned seed = 1;
    std::string url; ///< of "brief"
    std::string authorities;
};

/** What must not grow. */
struct Usage
{
    long heapKilobytes = 0;
    long residentKilobytes = 0;
    long descriptors = 0;
    long threads = 0;
};

long CountEntries(const char* folder)
{
    const std::filesystem::directory_iterator entries(folder);
    return static_cast<long>(std::distance(begin(entries), end(entries))) - 1;
}

Usage Measure()
{
    Usage usage;
    usage.heapKilobytes = static_cast<long>((mallinfo2().uordblks + mallinfo2().hblkhd) / 1024);
    long pages = 0;
    std::ifstream("/proc/self/statm") >> pages >> pages;
    usage.residentKilobytes = pages * (sysconf(_SC_PAGESIZE) / 1024);
    usage.descriptors = CountEntries("/proc/self/fd");
    usage.threads = CountEntries("/proc/self/task");
    return usage;
}

void Print(const std::string& when, const Usage& usage)
{
    std::cout << when << ": heap " << usage.heapKilobytes << " KB, resident "
              << usage.residentKilobytes << " KB, " << usage.descriptors << " descriptors, "
              << usage.threads << " threads" << std::endl;
}

int Judge(const Ledger& ledger)
{
    std::cout << ledger.CountBegun() << " operations, of which " << ledger.CountSucceeded()
              << " succeeded and brought " << ledger.CountTokens()
              << " tokens; failed: " << ledger.DescribeFailures() << std::endl;
    int problems = 0;
    for (const std::string& problem : ledger.GetProblems()) {
        std::cout << "NOT IN ORDER: " << problem << std::endl;
        ++problems;
    }
    if (!ledger.IsBalanced()) {
        std::cout << "NOT IN ORDER: operations were lost or ended twice" << std::endl;
        ++problems;
    }
    return problems;
}

int Require(bool holds, const std::string& what)
{
    if (!holds) {
        std::cout << "NOT IN ORDER: " << what << std::endl;
    }
    return holds ? 0 : 1;
}

/** The sanitizers keep what is freed for a while. */
bool IsSanitized()
{
    const char* const sanitizers = std::getenv("SOAK_SANITIZED");
    return sanitizers != nullptr && *sanitizers != '\0';
}

/** From the end of the first tenth to the last. Two services keep up to eight connections each. */
int JudgeGrowth(const Usage& first, const Usage& last)
{
    constexpr long HeapSlack = 1024;
    constexpr long ResidentSlack = 16 * 1024;
    constexpr long KeptConnections = 16;
    constexpr long MostLibraryThreads = Quillon::System::ThreadPool::DefaultLimit + 8;
    return Require(last.heapKilobytes <= first.heapKilobytes + HeapSlack, "the heap grows")
           + Require(
               last.residentKilobytes <= first.residentKilobytes + ResidentSlack || IsSanitized(),
               "resident memory grows")
           + Require(
               last.descriptors <= first.descriptors + KeptConnections, "descriptors are lost")
           + Require(last.threads <= Threads + MostLibraryThreads, "threads are lost");
}

// -------------------------------------------------------------------------- processes that end

/** Starts this program again, in the form that ends in the midst of its work. */
pid_t StartBriefProcess(const Options& options, const std::string& url, unsigned seed)
{
    const std::string file = options.authorities;
    const std::string number = std::to_string(seed);
    const char* const arguments[] = {
        "soak",
        "brief",
        "--url",
        url.c_str(),
        "--ca",
        file.c_str(),
        "--seed",
        number.c_str(),
        nullptr};
    pid_t pid = 0;
    if (posix_spawn(
            &pid, "/proc/self/exe", nullptr, nullptr, const_cast<char**>(arguments), environ)
        != 0) {
        throw std::runtime_error("no process is to be had");
    }
    return pid;
}

/** A host that loads a module with the library, and unloads it while threads of the library go on.
 */
pid_t StartHost(const std::string& url, unsigned seed)
{
    const std::string number = std::to_string(seed);
    const char* const arguments[] = {
        "soak_host", SOAK_MODULE, url.c_str(), number.c_str(), nullptr};
    pid_t pid = 0;
    if (posix_spawn(&pid, SOAK_HOST, nullptr, nullptr, const_cast<char**>(arguments), environ)
        != 0) {
        throw std::runtime_error("no process is to be had");
    }
    return pid;
}

/** A child of a process with threads is told that it cannot send, and ends. */
pid_t ForkMidway(const ServicePtr& service)
{
    const pid_t pid = fork();
    if (pid == 0) {
        alarm(10);
        try {
            service->AcquireTokenByCertificate(MakeSpec());
        } catch (const Quillon::Http::HttpException&) {
            _exit(0);
        } catch (const std::exception& error) {
            std::cerr << Quillon::GetClassName(error) << ": " << error.what() << std::endl;
        }
        _exit(1);
    }
    return pid;
}

/** Ends after some milliseconds, with asynchronous operations under way. */
[[noreturn]] void RunBriefly(const Options& options)
{
    std::ifstream file(options.authorities);
    const std::string authorities{std::istreambuf_iterator<char>(file), {}};
    // Never destroyed: completions may still use them while the process ends.
    static auto& services =
        *new std::vector<ServicePtr>{MakeService(options.url, authorities, TimeoutMs)};
    static Ledger& ledger = *new Ledger;
    static Workload& workload = *new Workload(services, {}, ledger, options.seed);
    const auto end = Clock::now() + milliseconds(options.seed % 300);
    while (Clock::now() < end) {
        workload.StartAcquisition();
    }
    std::exit(0);
}

/** @return how many processes did not end as they should. */
int AwaitEnds(const std::vector<pid_t>& processes)
{
    int problems = 0;
    for (const pid_t pid : processes) {
        int status = 0;
        waitpid(pid, &status, 0);
        problems += Require(status == 0, "a process ended with " + std::to_string(status));
    }
    return problems;
}

// ---------------------------------------------------------------------------------- the forms

class Soaking
{
public:
    explicit Soaking(const Options& options)
        : _options(options)
        , _server(DEVSTS_PROGRAM, {"--keytab", _kdc.GetFile("service.keytab")})
        , _plainServer(DEVSTS_PROGRAM, {"--http"})
        , _saboteur(_server.GetUrl(), Sabotage::RANDOM, options.seed)
        , _plainSaboteur(_plainServer.GetUrl(), Sabotage::RANDOM, options.seed + 1)
    {
        AddUsers(_server);
        AddUsers(_plainServer);
        const std::string authorities = _server.Read("ca.pem");
        for (const bool reuses : {false, true}) {
            _services.push_back(MakeService(_saboteur.GetUrl(), authorities, TimeoutMs, reuses));
            _services.push_back(
                MakeService(_plainSaboteur.GetUrl(), authorities, TimeoutMs, reuses));
        }
        _options.authorities = _server.GetFolder() / "ca.pem";
        // The first exchange: a process that forks from now on is told so.
        MakeService(_server.GetUrl(), authorities, TimeoutMs)
            ->AcquireTokenByCertificate(MakeSpec());
    }

    int Run()
    {
        std::vector<std::thread> threads;
        for (unsigned i = 0; i < Threads; ++i) {
            threads.emplace_back([this, i] { Work(i); });
        }
        int problems = 0;
        std::optional<Usage> first;
        Usage last;
        for (int tenth = 1; tenth <= Tenths; ++tenth) {
            problems += PassTenth();
            _allRest.arrive_and_wait(); // nothing is under way from here
            last = Measure();
            first = first ? first : last;
            Print("tenth " + std::to_string(tenth), last);
            _allGoOn.arrive_and_wait();
        }
        for (std::thread& thread : threads) {
            thread.join();
        }
        return problems + Judge(_ledger) + JudgeGrowth(*first, last)
               + Require(
                   _ledger.CountSucceeded() * 2 > _ledger.CountBegun(), "too little succeeds");
    }

private:
    void Work(unsigned index)
    {
        const Kerberos kerberos{index == 0 ? _kdc.GetFile("alice.keytab") : "", _server.GetUrl()};
        std::vector<ServicePtr> services = _services;
        if (index == 0) { // the one that negotiates; the other server has no keys for it
            services = {_services[0], _services[2]};
        }
        Workload workload(services, kerberos, _ledger, _options.seed * Threads + index);
        for (int tenth = 1; tenth <= Tenths; ++tenth) {
            while (_tenth < tenth) {
                workload.RunOne();
            }
            workload.AwaitAsync();
            _allRest.arrive_and_wait();
            _allGoOn.arrive_and_wait();
        }
    }

    /** Lets the threads work, and other processes begin and end beside them. */
    int PassTenth()
    {
        const auto end = Clock::now() + milliseconds(static_cast<long>(_options.seconds * 100));
        int problems = 0;
        do {
            const unsigned seed = _options.seed + 7919 * ++_children;
            for (const ServicePtr& service : _services) {
                problems += AwaitEnds({ForkMidway(service)});
            }
            problems += AwaitEnds(
                {StartBriefProcess(_options, _saboteur.GetUrl(), seed),
                 StartHost(_plainSaboteur.GetUrl(), seed)});
            std::this_thread::sleep_until(std::min(end, Clock::now() + milliseconds(500)));
        } while (Clock::now() < end);
        ++_tenth;
        return problems;
    }

    Options _options;
    Testing::TestKdc _kdc;
    Testing::DevStsProcess _server;
    Testing::DevStsProcess _plainServer;
    Saboteur _saboteur;
    Saboteur _plainSaboteur;
    std::vector<ServicePtr> _services;
    Ledger _ledger;
    unsigned _children = 0;
    std::atomic<int> _tenth{0};
    std::barrier<> _allRest{Threads + 1};
    std::barrier<> _allGoOn{Threads + 1};
};

/** As many acquisitions at once as there are, each of which ends once and for the right user. */
int Flood(const Options& options)
{
    const Testing::DevStsProcess server(DEVSTS_PROGRAM, {"--http"});
    AddUsers(server);
    const ServicePtr service =
        MakeService(server.GetUrl(), server.Read("ca.pem"), 1000 * TimeoutMs);
    Ledger ledger;
    std::latch done(options.count);
    std::vector<std::atomic<int>> ends(options.count);
    const auto began = Clock::now();
    for (unsigned i = 0; i < options.count; ++i) {
        ledger.Begin();
        service->AcquireTokenAsync(
            GetUser(i % Users) + "@example.test",
            GetPassword(i % Users),
            MakeSpec(),
            [&, i](const TokenPtr& token, const Quillon::Exception* error) {
                if (error != nullptr) {
                    ledger.NoteFailure(Quillon::GetClassName(*error));
                } else {
                    ledger.NoteToken(
                        token->GetId(), token->GetSubject().GetName(), GetUser(i % Users));
                    ledger.NoteSuccess();
                }
                ++ends[i];
                done.count_down();
            });
    }
    Print("all are under way", Measure());
    done.wait();
    Print("all have ended", Measure());
    const std::chrono::duration<double> took = Clock::now() - began;
    std::cout << "took " << took.count() << " s" << std::endl;
    int problems = Judge(ledger);
    for (const std::atomic<int>& count : ends) {
        problems += Require(count == 1, "an acquisition ended " + std::to_string(count) + " times");
    }
    return problems + Require(ledger.CountTokens() == options.count, "not all succeeded");
}

/** Every second connection hangs; those who wait for the others are served. */
int Hang(const Options& options)
{
    const Testing::DevStsProcess server(DEVSTS_PROGRAM, {"--http"});
    AddUsers(server);
    const Saboteur saboteur(server.GetUrl(), Sabotage::HALF_HANGS, options.seed);
    constexpr long long ShortTimeoutMs = 2'000;
    const ServicePtr service =
        MakeService(saboteur.GetUrl(), server.Read("ca.pem"), ShortTimeoutMs);
    Ledger ledger;
    std::vector<std::thread> threads;
    std::latch start(options.count);
    const auto began = Clock::now();
    for (unsigned i = 0; i < options.count; ++i) {
        threads.emplace_back([&, i] {
            start.arrive_and_wait();
            ledger.Begin();
            try {
                const TokenPtr token = service->AcquireToken(
                    GetUser(i % Users) + "@example.test", GetPassword(i % Users), MakeSpec());
                ledger.NoteToken(token->GetId(), token->GetSubject().GetName(), GetUser(i % Users));
                ledger.NoteSuccess();
            } catch (const Quillon::Http::TimeoutException&) {
                ledger.NoteFailure("TimeoutException");
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    const std::chrono::duration<double> took = Clock::now() - began;
    std::cout << "took " << took.count() << " s" << std::endl;
    return Judge(ledger)
           + Require(ledger.CountSucceeded() * 2 == options.count, "not half of all succeeded")
           + Require(took < 5 * milliseconds(ShortTimeoutMs), "it takes too long");
}

Options ReadOptions(int count, char** words)
{
    Options options;
    options.form = count > 1 ? words[1] : "soak";
    for (int i = 2; i + 1 < count; i += 2) {
        const std::string name = words[i];
        const char* const value = words[i + 1];
        if (name == "--seconds") {
            options.seconds = std::atof(value);
        } else if (name == "--count") {
            options.count = static_cast<unsigned>(std::atoi(value));
        } else if (name == "--seed") {
            options.seed = static_cast<unsigned>(std::atol(value));
        } else if (name == "--url") {
            options.url = value;
        } else if (name == "--ca") {
            options.authorities = value;
        } else {
            throw std::runtime_error("unknown option " + name);
        }
    }
    return options;
}

int RunForm(const Options& options)
{
    std::cout << options.form << " with seed " << options.seed << std::endl;
    if (options.form == "flood") {
        return Flood(options);
    }
    return options.form == "hang" ? Hang(options) : Soaking(options).Run();
}

} // namespace

int main(int count, char** words)
{
    try {
        const Options options = ReadOptions(count, words);
        if (options.form == "brief") {
            RunBriefly(options);
        }
        return RunForm(options) == 0 ? 0 : 1;
    } catch (const std::exception& error) {
        std::cerr << "soak: " << error.what() << std::endl;
        return 2;
    }
}
