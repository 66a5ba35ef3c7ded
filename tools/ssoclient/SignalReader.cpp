#include "SignalReader.h"

#include "ExitCode.h"

#include <sys/signalfd.h>
#include <unistd.h>

SignalReader::SignalReader()
{
    sigset_t read;
    sigemptyset(&read);
    for (const int signal : {SIGHUP, SIGINT, SIGTERM, SIGCHLD}) {
        sigaddset(&read, signal);
    }
    std::signal(SIGCHLD, SIG_DFL); // whoever ignores it is not told how children end
    ::pthread_sigmask(SIG_BLOCK, &read, &_before);
    _descriptor = FileDescriptor(::signalfd(-1, &read, SFD_CLOEXEC | SFD_NONBLOCK));
    if (!_descriptor.IsOpen()) {
        ThrowSystemError("cannot read signals");
    }
}

int SignalReader::Read() const
{
    signalfd_siginfo signal = {};
    const ssize_t count =
        RetryInterrupted([&] { return ::read(_descriptor.Get(), &signal, sizeof signal); });
    return count == sizeof signal ? static_cast<int>(signal.ssi_signo) : 0;
}
