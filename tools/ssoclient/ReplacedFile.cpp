#include "ReplacedFile.h"

#include "ExitCode.h"
#include "FileDescriptor.h"
#include "fileWriting.h"

#include "quillon/MessageFormatter.h"

#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <thread>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

namespace {

// For as long as another process may take to write the file.
constexpr int Attempts = 40;
constexpr std::chrono::milliseconds AttemptWait(25);

std::string GetDraftName(const std::string& path)
{
    const std::string folder = GetFolder(path);
    const std::size_t slash = path.rfind('/');
    const std::string name = slash == std::string::npos ? path : path.substr(slash + 1);
    return folder + "." + name + ".ssoclient";
}

/** Where files cannot be locked, there is nobody to keep out. */
bool Lock(const FileDescriptor& file)
{
    return ::flock(file.Get(), LOCK_EX | LOCK_NB) == 0 || errno != EWOULDBLOCK;
}

bool IsAt(const FileDescriptor& file, const std::string& name)
{
    struct stat own = {};
    struct stat there = {};
    return ::fstat(file.Get(), &own) == 0 && ::lstat(name.c_str(), &there) == 0
           && own.st_dev == there.st_dev && own.st_ino == there.st_ino;
}

/**
 * Takes away what a process has left that was killed. One that lives has a lock on its draft, and
 * will not need it for long.
 *
 * @return false if it is locked.
 */
bool RemoveLeftover(const std::string& name)
{
    const FileDescriptor leftover(
        ::open(name.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    if (!leftover.IsOpen()) {
        if (errno != ENOENT) {
            ThrowWriteError(name);
        }
        return true; // it has just become the file
    }
    if (!Lock(leftover)) {
        return false;
    }
    if (IsAt(leftover, name) && ::unlink(name.c_str()) != 0) {
        ThrowWriteError(name);
    }
    return true;
}

/**
 * The file beside the one that it is to become; it goes if it does not become that. Its name is
 * always the same, and whoever has the lock on what stands under that name may rename or remove it.
 */
class Draft
{
public:
    Draft(const std::string& path, mode_t mode)
        : _name(GetDraftName(path))
        , _file(Open(path, mode))
    {}
    Draft(const Draft&) = delete;
    Draft& operator=(const Draft&) = delete;
    ~Draft()
    {
        if (IsAt(_file, _name)) {
            ::unlink(_name.c_str());
        }
    }

    const std::string& GetName() const noexcept { return _name; }
    int GetDescriptor() const noexcept { return _file.Get(); }

private:
    FileDescriptor Open(const std::string& path, mode_t mode) const
    {
        for (int attempt = 0; attempt < Attempts; ++attempt) {
            FileDescriptor file(
                ::open(_name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, mode));
            if (file.IsOpen() && Lock(file) && IsAt(file, _name)) {
                return file;
            }
            if (!file.IsOpen() && errno != EEXIST) {
                ThrowWriteError(path);
            }
            if (!RemoveLeftover(_name)) {
                std::this_thread::sleep_for(AttemptWait);
            }
        }
        throw UsageError(
            Quillon::MessageFormatter::ASPrint("another process is writing `%1'", path));
    }

    std::string _name;
    FileDescriptor _file;
};

/** Has the renaming outlive a sudden end of the machine. Not every file system can do that. */
void SyncFolder(const std::string& path)
{
    const FileDescriptor folder(
        ::open(GetFolder(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder.IsOpen() || (::fsync(folder.Get()) != 0 && errno != EINVAL)) {
        ThrowWriteError(path);
    }
}

} // namespace

ReplacedFile::ReplacedFile(std::string path, mode_t mode)
    : _path(std::move(path))
    , _mode(mode)
{
    RequireRegularOrAbsent(_path);
    const Draft probe(_path, _mode);
}

void ReplacedFile::Write(const std::string& text) const
{
    RequireRegularOrAbsent(_path); // it may be another one by now
    const FileSizeSignalGuard guard;
    const Draft draft(_path, _mode);
    WriteAll(draft.GetDescriptor(), text, _path);
    if (::fsync(draft.GetDescriptor()) != 0
        || std::rename(draft.GetName().c_str(), _path.c_str()) != 0) {
        ThrowWriteError(_path);
    }
    SyncFolder(_path);
}
