#pragma once

#include <csignal>
#include <initializer_list>

namespace Quillon::System {

/**
 * Threads that start inside the scope take no signals from outside: the host's handlers stay on
 * the host's threads, and a broken connection raises no SIGPIPE. Signals that a thread raises by
 * its own fault stay open, because blocking them would keep the host's crash handler from running.
 */
class SignalBlock
{
public:
    SignalBlock() noexcept
    {
        sigset_t fromOutside;
        sigfillset(&fromOutside);
        for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGTRAP, SIGSYS, SIGABRT}) {
            sigdelset(&fromOutside, fault);
        }
        pthread_sigmask(SIG_SETMASK, &fromOutside, &_old);
    }
    ~SignalBlock() { pthread_sigmask(SIG_SETMASK, &_old, nullptr); }
    SignalBlock(const SignalBlock&) = delete;
    SignalBlock& operator=(const SignalBlock&) = delete;

private:
    sigset_t _old{};
};

} // namespace Quillon::System
