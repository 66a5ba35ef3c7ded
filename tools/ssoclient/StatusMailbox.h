#pragma once

#include "FileDescriptor.h"

#include "ssoClientRuntime/TokenSource.h"

#include <mutex>
#include <vector>

/**
 * Brings what the attempts of a token source came to from the threads that made them to a loop that
 * waits for its descriptor. Thread safety: any number of threads.
 */
class StatusMailbox
{
public:
    /** @throws UsageError  there is no descriptor to be had. */
    StatusMailbox();

    /** Readable while there is something to take. */
    int GetDescriptor() const noexcept { return _event.Get(); }

    void Put(const SsoClient::TokenSourceStatus& status);

    /** In the order in which they were put. */
    std::vector<SsoClient::TokenSourceStatus> Take();

private:
    FileDescriptor _event;
    std::mutex _mutex;
    std::vector<SsoClient::TokenSourceStatus> _statuses;
};
