#include "StatusMailbox.h"

#include "ExitCode.h"

#include <cstdint>
#include <utility>

#include <sys/eventfd.h>
#include <unistd.h>

using SsoClient::TokenSourceStatus;

StatusMailbox::StatusMailbox()
    : _event(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK))
{
    if (!_event.IsOpen()) {
        ThrowSystemError("cannot wait for tokens");
    }
}

void StatusMailbox::Put(const TokenSourceStatus& status)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    _statuses.push_back(status);
    const std::uint64_t one = 1;
    RetryInterrupted([&] { return ::write(_event.Get(), &one, sizeof one); });
}

std::vector<TokenSourceStatus> StatusMailbox::Take()
{
    const std::lock_guard<std::mutex> lock(_mutex);
    std::uint64_t count = 0;
    RetryInterrupted([&] { return ::read(_event.Get(), &count, sizeof count); });
    return std::exchange(_statuses, {});
}
