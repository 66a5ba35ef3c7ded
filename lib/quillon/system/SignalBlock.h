#pragma once

#include <csignal>

namespace Quillon::System {

/**
 * Threads that start inside the scope take no signals: the host's handlers stay on the host's
 * threads, and a broken connection raises no SIGPIPE.
 */
class SignalBlock
{
public:
    SignalBlock() noexcept
    {
        sigset_t all;
        sigfillset(&all);
        pthread_sigmask(SIG_SETMASK, &all, &_old);
    }
    ~SignalBlock() { pthread_sigmask(SIG_SETMASK, &_old, nullptr); }
    SignalBlock(const SignalBlock&) = delete;
    SignalBlock& operator=(const SignalBlock&) = delete;

private:
    sigset_t _old{};
};

} // namespace Quillon::System
