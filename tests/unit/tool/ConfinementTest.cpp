#include "Confinement.h"

#include <gtest/gtest.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

#ifdef SSOCLIENT_CONFINES

/** One thing that a process may try to do. */
struct Attempt
{
    const char* name;
    bool (*succeeds)();
};

std::ostream& operator<<(std::ostream& out, const Attempt& attempt)
{
    return out << attempt.name;
}

std::string GetName(const testing::TestParamInfo<Attempt>& info)
{
    return info.param.name;
}

bool Execute()
{
    return execl("/bin/sh", "sh", "-c", "exit 1", nullptr) == 0; // as if it returned true
}

bool MapCode()
{
    constexpr std::size_t Size = 4096;
    return mmap(nullptr, Size, PROT_READ | PROT_EXEC, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0)
           != MAP_FAILED;
}

bool TurnMemoryIntoCode()
{
    constexpr std::size_t Size = 4096;
    void* const memory =
        mmap(nullptr, Size, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    return memory != MAP_FAILED && mprotect(memory, Size, PROT_READ | PROT_EXEC) == 0;
}

bool TakeMemory()
{
    constexpr std::size_t Large = 64U << 20U;
    void* const memory = std::malloc(Large);
    std::free(memory);
    return memory != nullptr;
}

bool Fork()
{
    const pid_t child = fork();
    if (child == 0) {
        _exit(0);
    }
    return child > 0;
}

bool IsSignalAllowed()
{
    return kill(getppid(), 0) == 0;
}

const std::vector<Attempt> Denied{
    {"Open", [] { return open("/dev/null", O_RDONLY) >= 0; }},
    {"OpenForWriting", [] { return open("/dev/null", O_WRONLY) >= 0; }},
    {"Remove", [] { return unlink("/dev/null/nothing") == 0 || errno != EPERM; }},
    {"Connect", [] { return socket(AF_INET, SOCK_STREAM, 0) >= 0; }},
    {"ConnectLocally", [] { return socket(AF_UNIX, SOCK_STREAM, 0) >= 0; }},
    {"Execute", &Execute},
    {"Fork", &Fork},
    {"Signal", &IsSignalAllowed},
    {"MapCode", &MapCode},
    {"TurnMemoryIntoCode", &TurnMemoryIntoCode},
};

const std::vector<Attempt> Allowed{
    {"Write", [] { return write(STDOUT_FILENO, "", 0) == 0 || errno != EPERM; }},
    {"Read", [] { return read(STDIN_FILENO, nullptr, 0) == 0 || errno != EPERM; }},
    {"TakeMemory", &TakeMemory},
    {"AskForTheTerminal", [] { return isatty(STDIN_FILENO) == 1 || errno != EPERM; }},
    {"Throw",
     [] {
         try {
             throw std::runtime_error("");
         } catch (const std::exception&) {
             return true;
         }
     }},
};

constexpr int Succeeded = 1;
constexpr int Failed = 2;
constexpr int NotConfined = 3;

/** Makes the attempt in a process of its own. @return how that ends. */
int Try(const Attempt& attempt, bool isConfined)
{
    const pid_t child = fork();
    if (child == 0) {
        if (isConfined && !Confine().empty()) {
            _exit(NotConfined);
        }
        _exit(attempt.succeeds() ? Succeeded : Failed);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

class DeniedAttempt : public testing::TestWithParam<Attempt>
{};
INSTANTIATE_TEST_SUITE_P(Each, DeniedAttempt, testing::ValuesIn(Denied), &GetName);

class AllowedAttempt : public testing::TestWithParam<Attempt>
{};
INSTANTIATE_TEST_SUITE_P(Each, AllowedAttempt, testing::ValuesIn(Allowed), &GetName);

#endif

} // namespace

#ifdef SSOCLIENT_CONFINES

TEST_P(DeniedAttempt, SucceedsOnlyOutside)
{
    EXPECT_EQ(Try(GetParam(), false), Succeeded);
    const int inside = Try(GetParam(), true);
    if (inside == NotConfined) {
        GTEST_SKIP() << "this host filters no system calls";
    }
    EXPECT_EQ(inside, Failed);
}

TEST_P(AllowedAttempt, SucceedsInside)
{
    const int inside = Try(GetParam(), true);
    if (inside == NotConfined) {
        GTEST_SKIP() << "this host filters no system calls";
    }
    EXPECT_EQ(inside, Succeeded);
}

#else

TEST(Confine, SaysThatItIsNotThere)
{
    EXPECT_EQ(Confine(), "this program was built without it");
}

#endif
