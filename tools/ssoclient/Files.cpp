#include "Files.h"

#include "ExitCode.h"
#include "FileDescriptor.h"

#include "quillon/MessageFormatter.h"

#include <sys/stat.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>

#include <fcntl.h>
#include <unistd.h>

using Quillon::MessageFormatter;

namespace {

// Far more than the library reads of a token, so that an oversized one is refused there; this only
// bounds what an endless input can take up.
constexpr std::size_t MaxFileBytes = std::size_t{64} * 1024 * 1024;

// Larger than a key file, which therefore is read in one piece and leaves no copies behind.
constexpr std::size_t FirstReadBytes = std::size_t{16} * 1024;

std::string ReadAll(int descriptor, const std::string& name)
{
    std::string text(FirstReadBytes, '\0');
    for (std::size_t used = 0;;) {
        if (used == text.size()) {
            text.resize(2 * used);
        }
        const ssize_t count = RetryInterrupted(
            [&] { return ::read(descriptor, text.data() + used, text.size() - used); });
        if (count < 0) {
            ThrowSystemError("cannot read " + name);
        }
        if (count == 0) {
            text.resize(used);
            return text;
        }
        used += static_cast<std::size_t>(count);
        if (used > MaxFileBytes) {
            throw UsageError(
                MessageFormatter::ASPrint("%1 is larger than %2 bytes", name, MaxFileBytes));
        }
    }
}

[[noreturn]] void ThrowWriteError(const std::string& path)
{
    ThrowSystemError("cannot write `" + path + "'");
}

/**
 * Renaming over a device or a pipe would replace it instead of writing to it. A link is refused
 * rather than followed: somebody else may have laid it where the file was expected.
 */
void RequireRegularOrAbsent(const std::string& path)
{
    struct stat status = {};
    if (::lstat(path.c_str(), &status) != 0) {
        if (errno != ENOENT) {
            ThrowWriteError(path);
        }
    } else if (S_ISLNK(status.st_mode)) {
        throw UsageError(MessageFormatter::ASPrint("`%1' is a link: name the file itself", path));
    } else if (!S_ISREG(status.st_mode)) {
        throw UsageError(MessageFormatter::ASPrint("`%1' is not a regular file", path));
    }
}

/** The folder of `path`, to put the name of a file behind. */
std::string GetFolder(const std::string& path)
{
    const std::size_t slash = path.rfind('/');
    return slash == std::string::npos ? "./" : path.substr(0, slash + 1);
}

void RequireWritableFolder(const std::string& path)
{
    if (::access(GetFolder(path).c_str(), W_OK | X_OK) != 0) {
        ThrowWriteError(path);
    }
}

void WriteAll(int descriptor, const std::string& text, const std::string& path)
{
    for (std::size_t at = 0; at < text.size();) {
        const ssize_t count = RetryInterrupted(
            [&] { return ::write(descriptor, text.data() + at, text.size() - at); });
        if (count < 0) {
            ThrowWriteError(path);
        }
        at += static_cast<std::size_t>(count);
    }
}

/**
 * For as long as it lives, a file beyond the limit of the process is an error of `write`, not a
 * signal that would leave the temporary file behind.
 */
class FileSizeSignalGuard
{
public:
    FileSizeSignalGuard()
        : _before(std::signal(SIGXFSZ, SIG_IGN))
    {}
    FileSizeSignalGuard(const FileSizeSignalGuard&) = delete;
    FileSizeSignalGuard& operator=(const FileSizeSignalGuard&) = delete;
    ~FileSizeSignalGuard() { std::signal(SIGXFSZ, _before); }

private:
    void (*_before)(int);
};

/** A file beside the one that it is to become; it goes if it does not become that. */
class TemporaryFile
{
public:
    // mkostemp makes the file with mode 0600, whatever the umask.
    explicit TemporaryFile(const std::string& path)
        : _name(GetFolder(path) + "ssoclient.XXXXXX")
        , _descriptor(::mkostemp(_name.data(), O_CLOEXEC))
    {
        if (!_descriptor.IsOpen()) {
            ThrowWriteError(path);
        }
    }
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;
    ~TemporaryFile() { ::unlink(_name.c_str()); } // nothing has the name after a renaming

    const std::string& GetName() const noexcept { return _name; }
    int GetDescriptor() const noexcept { return _descriptor.Get(); }

private:
    std::string _name;
    FileDescriptor _descriptor;
};

} // namespace

std::string ReadFile(const std::string& path)
{
    if (path == "-") {
        return ReadAll(STDIN_FILENO, "standard input");
    }
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!file.IsOpen()) {
        ThrowSystemError("cannot open `" + path + "'");
    }
    return ReadAll(file.Get(), "`" + path + "'");
}

OutputFile::OutputFile(std::string path)
    : _path(std::move(path))
{
    RequireRegularOrAbsent(_path);
    RequireWritableFolder(_path);
}

void OutputFile::Write(const std::string& text) const
{
    RequireRegularOrAbsent(_path); // it may be another one than when the token was asked for
    const FileSizeSignalGuard guard;
    const TemporaryFile file(_path);
    WriteAll(file.GetDescriptor(), text, _path);
    if (::fsync(file.GetDescriptor()) != 0
        || std::rename(file.GetName().c_str(), _path.c_str()) != 0) {
        ThrowWriteError(_path);
    }
}
