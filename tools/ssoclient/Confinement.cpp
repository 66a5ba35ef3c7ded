#include "Confinement.h"

#ifdef SSOCLIENT_CONFINES

#include <seccomp.h>

#include <cerrno>
#include <memory>

#include <sys/ioctl.h>
#include <sys/mman.h>
#include <system_error>

namespace {

struct FilterDeleter
{
    void operator()(void* filter) const noexcept { seccomp_release(filter); }
};
using FilterOwner = std::unique_ptr<void, FilterDeleter>;

// What reading, writing, taking memory, waiting and ending are made of. Signals are the process's
// own, and getrandom is for blinding private keys.
constexpr int AllowedCalls[] = {
    SCMP_SYS(read),           SCMP_SYS(readv),        SCMP_SYS(write),
    SCMP_SYS(writev),         SCMP_SYS(close),        SCMP_SYS(lseek),
    SCMP_SYS(fstat),          SCMP_SYS(newfstatat),   SCMP_SYS(brk),
    SCMP_SYS(munmap),         SCMP_SYS(mremap),       SCMP_SYS(madvise),
    SCMP_SYS(futex),          SCMP_SYS(sched_yield),  SCMP_SYS(clock_gettime),
    SCMP_SYS(gettimeofday),   SCMP_SYS(time),         SCMP_SYS(getrandom),
    SCMP_SYS(getpid),         SCMP_SYS(gettid),       SCMP_SYS(rt_sigaction),
    SCMP_SYS(rt_sigprocmask), SCMP_SYS(rt_sigreturn), SCMP_SYS(restart_syscall),
    SCMP_SYS(wait4),          SCMP_SYS(exit),         SCMP_SYS(exit_group),
};

/** Memory must never become code, and terminals only tell what they are. */
int AllowWithConditions(void* filter)
{
    constexpr unsigned Protection = 2; // the place among the arguments, and that of a request
    constexpr unsigned Request = 1;
    const scmp_arg_cmp noCode{Protection, SCMP_CMP_MASKED_EQ, PROT_EXEC, 0};
    int error = 0;
    for (const int call : {SCMP_SYS(mmap), SCMP_SYS(mprotect)}) {
        error = error != 0 ? error : seccomp_rule_add(filter, SCMP_ACT_ALLOW, call, 1, noCode);
    }
    for (const unsigned request : {TCGETS, TIOCGWINSZ}) {
        const scmp_arg_cmp isRequest{Request, SCMP_CMP_EQ, request, 0};
        error = error != 0
                    ? error
                    : seccomp_rule_add(filter, SCMP_ACT_ALLOW, SCMP_SYS(ioctl), 1, isRequest);
    }
    return error;
}

/** @return 0, or what went wrong, as a negative number of errno. */
int Load(void* filter)
{
    int error = filter != nullptr ? 0 : -ENOMEM;
    for (const int call : AllowedCalls) {
        error = error != 0 ? error : seccomp_rule_add(filter, SCMP_ACT_ALLOW, call, 0);
    }
    error = error != 0 ? error : AllowWithConditions(filter);
    return error != 0 ? error : seccomp_load(filter);
}

} // namespace

std::string Confine() noexcept
{
    const FilterOwner filter(seccomp_init(SCMP_ACT_ERRNO(EPERM)));
    const int error = Load(filter.get());
    return error == 0 ? "" : std::generic_category().message(-error);
}

#else

// The sanitizers and gcov open files of their own when the process ends.
std::string Confine() noexcept
{
    return "this program was built without it";
}

#endif
