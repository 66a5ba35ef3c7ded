#include "Secret.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "FileDescriptor.h"

#include "quillon/MessageFormatter.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <string_view>

#include <fcntl.h>
#include <poll.h>
#include <termios.h>
#include <unistd.h>

using Quillon::MessageFormatter;
using Quillon::Wiped;

namespace {

constexpr std::size_t MaxSecretBytes = 4096;

[[noreturn]] void ThrowReadError(const SecretKind& kind, const std::string& source)
{
    ThrowSystemError(MessageFormatter::ASPrint("cannot read the %1 from %2", kind.name, source));
}

/**
 * Reads up to the end of the line, one byte at a time: what follows is left to others. `readByte`
 * gives what `read` gives for one byte.
 */
template <class ReadByte>
void ReadLine(const SecretKind& kind, ReadByte readByte, const std::string& source, Wiped& line)
{
    for (;;) {
        char c = 0;
        const ssize_t count = readByte(c);
        if (count < 0) {
            ThrowReadError(kind, source);
        }
        if (count == 0 || c == '\n') {
            break;
        }
        if (line.Get().size() == MaxSecretBytes) {
            throw UsageError(MessageFormatter::ASPrint(
                "the %1 from %2 is longer than %3 bytes", kind.name, source, MaxSecretBytes));
        }
        line.Append({&c, 1});
    }
    if (!line.Get().empty() && line.Get().back() == '\r') {
        line.RemoveLast();
    }
}

constexpr std::array<int, 5> TerminalSignals = {SIGHUP, SIGINT, SIGQUIT, SIGTERM, SIGTSTP};

volatile std::sig_atomic_t caughtSignal = 0;

void CatchSignal(int signal)
{
    caughtSignal = signal;
}

/**
 * Holds back the signals that would leave the terminal without echo, for as long as it lives: they
 * are caught while `WaitForInput` waits, and at no other moment.
 */
class SignalGuard
{
public:
    SignalGuard()
    {
        caughtSignal = 0;
        struct sigaction action = {};
        action.sa_handler = CatchSignal;
        sigset_t held;
        sigemptyset(&held);
        for (std::size_t i = 0; i < TerminalSignals.size(); ++i) {
            sigaddset(&held, TerminalSignals[i]);
            ::sigaction(TerminalSignals[i], &action, &_actionsBefore[i]);
        }
        ::sigprocmask(SIG_BLOCK, &held, &_maskBefore);
    }
    SignalGuard(const SignalGuard&) = delete;
    SignalGuard& operator=(const SignalGuard&) = delete;
    ~SignalGuard()
    {
        for (std::size_t i = 0; i < TerminalSignals.size(); ++i) {
            ::sigaction(TerminalSignals[i], &_actionsBefore[i], nullptr);
        }
        ::sigprocmask(SIG_SETMASK, &_maskBefore, nullptr);
    }

    /** @return false if one of the signals came first. */
    bool WaitForInput(int descriptor) const
    {
        pollfd input = {descriptor, POLLIN, 0};
        while (::ppoll(&input, 1, nullptr, &_maskBefore) < 0 && errno == EINTR
               && caughtSignal == 0) {
        }
        return caughtSignal == 0;
    }

private:
    std::array<struct sigaction, TerminalSignals.size()> _actionsBefore = {};
    sigset_t _maskBefore = {};
};

/** Keeps a terminal from echoing what is typed, for as long as it lives. */
class EchoSwitch
{
public:
    EchoSwitch(const SecretKind& kind, int terminal)
        : _terminal(terminal)
    {
        if (::tcgetattr(terminal, &_before) != 0) {
            ThrowReadError(kind, "the terminal");
        }
        termios silent = _before;
        silent.c_lflag &= ~static_cast<tcflag_t>(ECHO);
        silent.c_lflag |= static_cast<tcflag_t>(ECHONL);
        ::tcsetattr(terminal, TCSAFLUSH, &silent);
    }
    EchoSwitch(const EchoSwitch&) = delete;
    EchoSwitch& operator=(const EchoSwitch&) = delete;
    ~EchoSwitch() { ::tcsetattr(_terminal, TCSAFLUSH, &_before); }

private:
    int _terminal;
    termios _before = {};
};

void WritePrompt(const SecretKind& kind, int terminal)
{
    const std::string_view prompt = kind.prompt;
    if (RetryInterrupted([&] { return ::write(terminal, prompt.data(), prompt.size()); }) < 0) {
        ThrowReadError(kind, "the terminal");
    }
}

/** One prompt. @return the signal that interrupted it, with the terminal as it was; 0 for none. */
int AskOnce(const SecretKind& kind, int terminal, Wiped& secret)
{
    const SignalGuard signals;
    const EchoSwitch silence(kind, terminal);
    WritePrompt(kind, terminal);
    // A signal ends the line; what was typed of it is thrown away by the caller.
    const auto readByte = [&](char& c) -> ssize_t {
        return signals.WaitForInput(terminal) ? ::read(terminal, &c, 1) : 0;
    };
    ReadLine(kind, readByte, "the terminal", secret);
    return caughtSignal;
}

void Ask(const SecretKind& kind, Wiped& secret)
{
    const FileDescriptor terminal(::open("/dev/tty", O_RDWR | O_CLOEXEC));
    if (!terminal.IsOpen()) {
        throw UsageError(MessageFormatter::ASPrint(
            "no terminal to ask for the %1: use %2", kind.name, kind.fileOption));
    }
    // A signal takes its usual course once the terminal echoes again; after a stop and a
    // continuation the question is asked anew.
    while (const int signal = AskOnce(kind, terminal.Get(), secret)) {
        secret.Clear();
        ::raise(signal);
    }
}

void ReadSecretFile(const SecretKind& kind, const std::string& file, Wiped& secret)
{
    FileDescriptor opened;
    if (file != "-") {
        opened = FileDescriptor(::open(file.c_str(), O_RDONLY | O_CLOEXEC));
        if (!opened.IsOpen()) {
            ThrowReadError(kind, "`" + file + "'");
        }
    }
    const int descriptor = opened.IsOpen() ? opened.Get() : STDIN_FILENO;
    const auto readByte = [descriptor](char& c) {
        return RetryInterrupted([&] { return ::read(descriptor, &c, 1); });
    };
    ReadLine(kind, readByte, file == "-" ? "standard input" : "`" + file + "'", secret);
}

} // namespace

void GetSecret(const SecretKind& kind, const std::string& file, Wiped& secret)
{
    if (file.empty()) {
        Ask(kind, secret);
    } else {
        ReadSecretFile(kind, file, secret);
    }
    if (secret.Get().empty()) {
        throw UsageError(MessageFormatter::ASPrint("the %1 is empty", kind.name));
    }
}

void GetPassword(const std::string& file, Wiped& password)
{
    GetSecret(Password, file, password);
    const std::string problem = CheckText(password.Get());
    if (!problem.empty()) {
        throw UsageError(MessageFormatter::ASPrint(
            "%1the %2 %3",
            file.empty() ? "" : Password.fileOption + std::string(": "),
            Password.name,
            problem));
    }
}
