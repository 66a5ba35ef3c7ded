#include "quillon/system/FileWatch.h"

#include "quillon/Exceptions.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <filesystem>
#include <limits>
#include <poll.h>
#include <string_view>
#include <sys/eventfd.h>
#include <sys/inotify.h>
#include <system_error>
#include <unistd.h>

namespace Quillon::System {

namespace {

constexpr std::uint32_t Changes = IN_CLOSE_WRITE | IN_CREATE | IN_DELETE | IN_MOVED_FROM
                                  | IN_MOVED_TO | IN_ATTRIB | IN_DELETE_SELF | IN_MOVE_SELF;

/** Whoever waits for longer asks again; clocks can be added to it. */
constexpr std::chrono::milliseconds LongestWait = std::chrono::hours(24);

/** As many events as are read at a time; each has a name of at most NAME_MAX octets. */
using EventBuffer = std::array<char, 16384>;

/** From the root, and without what may stand at the end of a folder's name. */
std::string Normalize(const std::string& path)
{
    const std::filesystem::path normal = std::filesystem::absolute(path).lexically_normal();
    return normal.has_filename() ? normal.string() : normal.parent_path().string();
}

int ToPollTimeout(std::chrono::milliseconds time) noexcept
{
    using Count = std::chrono::milliseconds::rep;
    return static_cast<int>(std::clamp<Count>(time.count(), 0, std::numeric_limits<int>::max()));
}

} // namespace

FileWatch::FileWatch(const std::string& path)
    : _path(Normalize(path))
    , _name(std::filesystem::path(_path).filename().string())
    , _folder(std::filesystem::path(_path).parent_path().string())
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
    TakeChanges();
    std::error_code none;
    _isFolder = std::filesystem::is_directory(_path, none);
    // Each time, for what has that name may be another file or folder by now. If there is none to
    // be watched, there still is the one around it, and the time that is waited at most.
    _around = inotify_add_watch(_changes, _folder.c_str(), Changes);
    inotify_add_watch(_changes, _path.c_str(), Changes);
}

/**
 * Whether there was a change that counts. Of what lies beside a folder only its own name does: it
 * may be a busy place. Beside a file there may be links that it is reached by.
 */
bool FileWatch::TakeChanges() noexcept
{
    alignas(inotify_event) EventBuffer buffer;
    bool haveChanged = false;
    ssize_t size = 0;
    while ((size = read(_changes, buffer.data(), buffer.size())) > 0) {
        for (const char* at = buffer.data(); at < buffer.data() + size;) {
            const auto* const event = reinterpret_cast<const inotify_event*>(at);
            const std::string_view name = event->len > 0 ? event->name : "";
            haveChanged = haveChanged || !_isFolder || event->wd != _around || name == _name;
            at += sizeof(inotify_event) + event->len;
        }
    }
    return haveChanged;
}

FileWatch::Outcome FileWatch::Wait(std::chrono::milliseconds atMost) noexcept
{
    using std::chrono::steady_clock;
    const auto end = steady_clock::now() + std::min(atMost, LongestWait);
    while (true) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - steady_clock::now());
        std::array<pollfd, 2> polled{{{_changes, POLLIN, 0}, {_stop, POLLIN, 0}}};
        poll(polled.data(), polled.size(), ToPollTimeout(left));
        if ((polled[1].revents & POLLIN) != 0) {
            return Outcome::STOPPED;
        }
        if (TakeChanges()) {
            return Outcome::CHANGED;
        }
        if (steady_clock::now() >= end) {
            return Outcome::TIME_IS_OVER;
        }
    }
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
