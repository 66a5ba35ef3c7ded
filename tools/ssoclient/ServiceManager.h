#pragma once

#include "FileDescriptor.h"

#include <sys/socket.h>
#include <sys/un.h>

#include <chrono>
#include <functional>
#include <optional>
#include <string>

/**
 * Who started the process and wants to know how it is: systemd, or what speaks its protocol
 * [sd_notify(3)], which is promised to stay. It is one datagram for each thing that is told.
 */
class ServiceManager
{
public:
    /**
     * Takes `NOTIFY_SOCKET`, `WATCHDOG_USEC` and `WATCHDOG_PID` out of the environment: they are
     * not for the programs that this one starts. Without the first there is nobody to tell.
     *
     * @param complain     is told, once, if nobody listens.
     * @throws UsageError  one of them has a value that cannot be used.
     */
    explicit ServiceManager(std::function<void(const std::string&)> complain);

    /** Ready, and what there is to say. */
    void TellReady(const std::string& status);
    void TellStatus(const std::string& status);
    void TellReloading();
    void TellStopping();
    void TellAlive();

    /** How often to tell that; nothing if nobody waits for it. */
    const std::optional<std::chrono::microseconds>& GetAlivePeriod() const noexcept
    {
        return _alivePeriod;
    }

private:
    void Connect(const std::string& address);
    void Tell(const std::string& state);

    std::function<void(const std::string&)> _complain; // empty once it was called
    FileDescriptor _socket;
    sockaddr_un _address = {};
    socklen_t _addressSize = 0;
    std::optional<std::chrono::microseconds> _alivePeriod;
};
