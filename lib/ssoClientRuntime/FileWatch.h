#pragma once

#include <chrono>
#include <string>

namespace SsoClient {

/**
 * Waits for changes of a file or of what is in a folder, as far as the system tells of them: by
 * inotify on the folder, and on the one around it, since files and links are renamed into place.
 *
 * Thread safety: `Stop` may be called by any thread, the rest by one.
 */
class FileWatch
{
public:
    /** @throws Quillon::InvalidStateException  there is no descriptor to be had. */
    explicit FileWatch(const std::string& path);
    FileWatch(const FileWatch&) = delete;
    FileWatch& operator=(const FileWatch&) = delete;
    ~FileWatch();

    /** Looks from now on: what changes after this is told by `Wait`. */
    void Begin() noexcept;

    /**
     * Waits until something changes, the time is over, or `Stop` is called.
     *
     * @return whether to go on; not after `Stop`.
     */
    bool Wait(std::chrono::milliseconds atMost) noexcept;

    /** Ends this wait and all further ones. */
    void Stop() noexcept;

private:
    void Close() noexcept;

    std::string _path;
    std::string _folder; // around it
    int _changes = -1;   // inotify
    int _stop = -1;      // eventfd
};

} // namespace SsoClient
