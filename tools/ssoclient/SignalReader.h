#pragma once

#include "FileDescriptor.h"

#include <csignal>

/**
 * Reads SIGHUP, SIGINT, SIGTERM and SIGCHLD, which interrupt nothing any more: they are blocked for
 * the rest of the process's life, in this thread and in those that it starts.
 */
class SignalReader
{
public:
    /** @throws UsageError  there is no descriptor to read them from. */
    SignalReader();

    /** The signals that were blocked before. */
    const sigset_t& GetBefore() const noexcept { return _before; }
    int GetDescriptor() const noexcept { return _descriptor.Get(); }

    /** The next one; 0 if there is none. */
    int Read() const;

private:
    sigset_t _before = {};
    FileDescriptor _descriptor;
};
