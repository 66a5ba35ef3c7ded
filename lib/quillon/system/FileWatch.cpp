#include "quillon/system/FileWatch.h"

#include "quillon/Exceptions.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <filesystem>
#include <limits>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/inotify.h>
#include <unistd.h>

namespace Quillon::System {

namespace {

constexpr std::uint32_t Changes = IN_CLOSE_WRITE | IN_CREATE | IN_DELETE | IN_MOVED_FROM
                                  | IN_MOVED_TO | IN_ATTRIB | IN_DELETE_SELF | IN_MOVE_SELF;

/** Empties the queue: what is to be done is the same however many changes there are. */
void Drain(int descriptor) noexcept
{
    alignas(inotify_event) std::array<char, 16384> events;
    while (read(descriptor, events.data(), events.size()) > 0) {
    }
}

int ToPollTimeout(std::chrono::milliseconds time) noexcept
{
    using Count = std::chrono::milliseconds::rep;
    return static_cast<int>(std::clamp<Count>(time.count(), 0, std::numeric_limits<int>::max()));
}

} // namespace

FileWatch::FileWatch(const std::string& path)
    : _path(path)
    , _folder(std::filesystem::absolute(path).parent_path().string())
    , _changes(inotify_init1(IN_CLOEXEC | IN_NONBLOCK))
    , _stop(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK))
    , _pid(getpid())
{
    if (_changes < 0 || _stop < 0) {
        Close();
        throw InvalidStateException("There is no descriptor to follow changes of files with.");
    }
}

FileWatch::~FileWatch()
{
    Close();
}

void FileWatch::Close() noexcept
{
    for (const int descriptor : {_changes, _stop}) {
        if (descriptor >= 0) {
            close(descriptor);
        }
    }
}

void FileWatch::Begin() noexcept
{
    Drain(_changes);
    // Each time, for what has that name may be another file or folder by now. If there is none to
    // be watched, there still is the one around it, and the time that is waited at most.
    inotify_add_watch(_changes, _folder.c_str(), Changes);
    inotify_add_watch(_changes, _path.c_str(), Changes);
}

bool FileWatch::Wait(std::chrono::milliseconds atMost) noexcept
{
    std::array<pollfd, 2> polled{{{_changes, POLLIN, 0}, {_stop, POLLIN, 0}}};
    poll(polled.data(), polled.size(), ToPollTimeout(atMost));
    return (polled[1].revents & POLLIN) == 0;
}

void FileWatch::Stop() noexcept
{
    eventfd_write(_stop, 1);
}

bool FileWatch::IsOwn() const noexcept
{
    return _pid == getpid();
}

} // namespace Quillon::System
