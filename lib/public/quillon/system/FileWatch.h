#pragma once

#include "quillon/Export.h"

#include <chrono>
#include <string>

namespace Quillon::System {

/**
 * Waits for changes of a file or of what is in a folder, as far as the system tells of them: by
 * inotify on the folder, and on the one around it, since files and links are renamed into place.
 *
 * Thread safety: `Stop` and `IsOwn` may be called by any thread, the rest by one.
 */
class QUILLON_API FileWatch
{
public:
    /** @throws InvalidStateException  there is no descriptor to be had. */
    explicit FileWatch(const std::string& path);
    FileWatch(const FileWatch&) = delete;
    FileWatch& operator=(const FileWatch&) = delete;
    ~FileWatch();

    /** Looks from now on: what changes after this is told by `Wait`. */
    void Begin() noexcept;

    enum class Outcome
    {
        CHANGED,
        TIME_IS_OVER,
        STOPPED
    };

    /** Waits until something changes, the time or a day is over, or `Stop` is called. */
    Outcome Wait(std::chrono::milliseconds atMost) noexcept;

    /** Ends this wait and all further ones. */
    void Stop() noexcept;

    /** Whether it was made in this process, and not in the one that this one was forked from. */
    bool IsOwn() const noexcept;

private:
    void Close() noexcept;
    bool TakeChanges() noexcept;

    std::string _path;
    std::string _name;   // its last part
    std::string _folder; // around it
    int _around = -1;    // the watch of that folder
    bool _isFolder = false;
    int _changes = -1; // inotify
    int _stop = -1;    // eventfd
    int _pid = 0;      // of the process that made it
};

} // namespace Quillon::System
